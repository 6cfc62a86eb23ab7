// LineState: made with the module, released with it.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/line_state.h"

#include <cstdlib>

#include "lines/logical_line.h"

LineState* NewLineState(PyObject* module, PyMethodDef* methods, PyGetSetDef* attributes) {
  auto* shared = static_cast<LineState*>(calloc(1, sizeof(LineState)));
  if (!shared) {
    PyErr_NoMemory();
    return nullptr;
  }
  shared->fLineType = NewLineType(module, methods, attributes);
  if (!shared->fLineType) {
    FreeLineState(shared);
    return nullptr;
  }
  return shared;
}

int VisitLineState(LineState* shared, visitproc visit, void* arg) {
  Py_VISIT(shared->fLineType);
  return 0;
}

void ClearLineState(LineState* shared) { Py_CLEAR(shared->fLineType); }

void FreeLineState(LineState* shared) {
  ClearLineState(shared);
  free(shared);
}
