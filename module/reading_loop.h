// GetLogicalLineList: the parser's reading loop.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Method GetLogicalLineList(readline, first_line=0, line_count=-1).
PyObject* GetLogicalLineList(PyObject* self, PyObject* args);

extern const char kGetLogicalLineListDoc[];
