// Internal-call errors, reported against this module's source and a fixed line, so that a host
// can tell which contract broke.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

constexpr int kConstructionCheckLine = 323;
constexpr int kHandBackCheckLine = 1966;
constexpr int kTokenTextCheckLine = 2293;
constexpr int kConstantsCheckLine = 2484;

// Raises SystemError "logicallinemodule:<line>: bad argument to internal function".
inline void RaiseBadInternalCall(int line) {
  PyErr_Format(PyExc_SystemError, "%s:%d: bad argument to internal function",
               "logicallinemodule", line);
}
