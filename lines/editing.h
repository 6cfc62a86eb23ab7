// Editing a LogicalLine: the host's annotations, shared by the Python methods and the direct
// table. Each append refuses, with ValueError, the line types that cannot hold its list.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/logical_line.h"

// Each returns 0, or -1 with an exception set and the line unchanged.
int AppendAttrib(LogicalLine* line, PyObject* object);
int AppendArgName(LogicalLine* line, PyObject* object);
int AppendBaseClassName(LogicalLine* line, PyObject* object);
int AppendTypeEquiv(LogicalLine* line, PyObject* a, PyObject* b);
int AppendArgTypeEquiv(LogicalLine* line, PyObject* a, PyObject* b);

// Replaces fScopeName with a new reference to the object.
void SetScopeName(LogicalLine* line, PyObject* name);
