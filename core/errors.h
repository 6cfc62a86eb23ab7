// Internal-call errors, reported against this module's source and a fixed line, so that a host
// can tell which contract broke.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// A line whose range or indentation cannot be a logical line's (a copy after SetLineRange).
constexpr int kConstructionCheckLine = 323;

// Raises SystemError "logicallinemodule:<line>: bad argument to internal function".
inline void RaiseBadInternalCall(int line) {
  PyErr_Format(PyExc_SystemError, "%s:%d: bad argument to internal function",
               "logicallinemodule", line);
}
