// The line classifier: the line type of a logical line from its token texts alone, and the
// name that a class or function definition defines.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/line_type.h"

// Stores the line type of the tokens in *type; with lazyImports, "lazy" before "import" or
// "from" begins an import. On a class or function definition with a name, stores the name (a
// new str) in *localScopeName, releasing what was there. Returns 0, or -1 with an exception
// set when the name cannot be made; the slot is then null.
int ClassifyLogicalLine(PyObject* const* tokens, int count, bool lazyImports, LineType* type,
                        PyObject** localScopeName);
