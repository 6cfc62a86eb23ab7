// Editing a LogicalLine: the host's annotations, from Python methods and from the direct table.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/logical_line.h"

// Appends one object to fNames. Returns 0, or -1 with MemoryError set (nothing changed).
int AppendToNameList(LogicalLine* line, PyObject* object);

// Appends the pair (a, b) to a pair list. Returns 0, or -1 with MemoryError set.
int AppendPair(PyObject*** pairs, Py_ssize_t* count, PyObject* a, PyObject* b);

// Checked appends shared by the methods and the direct table: each refuses the line types
// that cannot hold its list with ValueError. Return 0 or -1.
int AppendAttribChecked(LogicalLine* line, PyObject* object);
int AppendArgNameChecked(LogicalLine* line, PyObject* object);
int AppendBaseClassNameChecked(LogicalLine* line, PyObject* object);
int AppendTypeEquivChecked(LogicalLine* line, PyObject* a, PyObject* b);
int AppendArgTypeEquivChecked(LogicalLine* line, PyObject* a, PyObject* b);

PyObject* AppendAttribMethod(PyObject* self, PyObject* args);
PyObject* AppendArgNameMethod(PyObject* self, PyObject* args);
PyObject* AppendBaseClassNameMethod(PyObject* self, PyObject* args);
PyObject* AppendTypeEquivMethod(PyObject* self, PyObject* args);
PyObject* AppendArgTypeEquivMethod(PyObject* self, PyObject* args);
PyObject* SetLineRangeMethod(PyObject* self, PyObject* args);
PyObject* SetParsedMethod(PyObject* self, PyObject* args);
PyObject* SetScopeNameMethod(PyObject* self, PyObject* object);
