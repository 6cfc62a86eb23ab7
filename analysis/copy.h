// Copy and __deepcopy__ of a LogicalLine.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Returns an independent copy of the line: own storage, the same held objects.
PyObject* CopyLogicalLine(PyObject* self, PyObject* args);
