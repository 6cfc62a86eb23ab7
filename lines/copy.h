// Copying a LogicalLine.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/logical_line.h"

// Returns an independent copy of the line: own storage, the same held objects. Always a native
// LogicalLine, whatever create hook is installed.
PyObject* CopyLogicalLine(LogicalLine* source);
