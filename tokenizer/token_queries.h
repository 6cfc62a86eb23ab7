// Token queries: the kind and the shown text of a token, derived again from its text.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Returns the token id of a bytes or str token text; with skip set, an error token is read
// through its prefix. Returns -1 with an exception set on failure.
int TokenTypeOfText(PyObject* text, int skip);

// Returns the str shown for a bytes token: its bytes decoded, U+FFFD for malformed sequences.
// With skip set, an error token is shown without its prefix.
PyObject* TokenStr(PyObject* token, int skip = 0);
