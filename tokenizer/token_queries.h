// Token queries: the kind and text of a stored token, derived again from its text.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Returns the token id of a bytes or str token text; with skip set, an error token is read
// through its prefix. Returns -1 with an exception set on failure.
int TokenTypeOfText(PyObject* text, int skip);

// Returns a str for a token: str and None as they are, bytes decoded with replacement.
PyObject* TokenTextToStr(PyObject* token);

// LogicalLine methods GetTokenType(i, skip_error_prefix=0) and GetTokenString(i, ...).
PyObject* GetTokenTypeMethod(PyObject* self, PyObject* args, PyObject* kwargs);
PyObject* GetTokenStringMethod(PyObject* self, PyObject* args, PyObject* kwargs);

// Direct table entries 12 and 13.
int GetTokenTypeDirect(PyObject* line, int index, int skip);
int GetStringTokenTypeDirect(PyObject* text, int skip);

extern const char kGetTokenTypeDoc[];
extern const char kGetTokenStringDoc[];
