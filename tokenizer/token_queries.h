// Token queries: the kind and the shown text of a token, derived again from its text.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Returns the id of the token that begins a token text of a line. A line lists a token that
// starts with a t prefix and a quote only when it was read with t-strings, and a string it is
// then; every other text gets the id that TokenIdForStart gives it.
int LineTokenIdForStart(const char* p, const char* end);

// Returns the token id of a bytes or str token text; with skip set, an error token is read
// through its prefix. With lineToken set the text is a token of a line, read as
// LineTokenIdForStart reads it; a bare text is read as TokenIdForStart reads it. Returns -1
// with an exception set on failure.
int TokenTypeOfText(PyObject* text, int skip, bool lineToken = true);

// Returns the str shown for a bytes token: its bytes decoded, U+FFFD for malformed sequences.
// With skip set, an error token is shown without its prefix.
PyObject* TokenStr(PyObject* token, int skip = 0);
