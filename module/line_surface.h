// The LogicalLine type's Python surface: its attribute and method tables.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/logical_line.h"

extern PyGetSetDef kLineAttributes[];
extern PyMethodDef kLineMethods[];

// Returns the value of fNamesDefined, which the direct table hands out too.
PyObject* NamesDefined(LogicalLine* line);
