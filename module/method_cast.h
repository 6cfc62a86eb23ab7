// Method tables store every function as a PyCFunction; keyword-taking functions are cast
// where they enter the table.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

inline PyCFunction AsMethod(PyObject* (*function)(PyObject*, PyObject*, PyObject*)) {
  return reinterpret_cast<PyCFunction>(reinterpret_cast<void (*)()>(function));
}
