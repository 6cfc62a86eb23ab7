// The direct function table: the line operations for native callers, without Python calls.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Module function GetDirectLogicalLineFunctionTable(): a new capsule holding the table.
PyObject* GetDirectLogicalLineFunctionTable(PyObject* self, PyObject* args);
