// LineState: made with the module, released with it.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/line_state.h"

#include <cstdlib>

#include "assembly/token_cache.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "lines/tokens_tuple.h"

LineState* NewLineState(PyObject* module, PyMethodDef* methods, PyGetSetDef* attributes) {
  auto* shared = static_cast<LineState*>(calloc(1, sizeof(LineState)));
  if (!shared) {
    PyErr_NoMemory();
    return nullptr;
  }
  shared->fTokenTexts = NewTokenTexts();
  shared->fEntries = shared->fTokenTexts ? NewEntryTables() : nullptr;
  shared->fLineType = shared->fEntries ? NewLineType(module, methods, attributes) : nullptr;
  if (!shared->fLineType) {
    FreeLineState(shared);
    return nullptr;
  }
  return shared;
}

int VisitLineState(LineState* shared, visitproc visit, void* arg) {
  Py_VISIT(shared->fLineType);
  Py_VISIT(shared->fCreateHook);  // may well hold the module, through a host's globals
  return 0;
}

// The hook goes first: releasing it may run host code, which may still read.
void ClearLineState(LineState* shared) {
  DropCreateHook(shared);
  ReleaseSharedTables(shared);
  Py_CLEAR(shared->fLineType);
}

void ReleaseSharedTables(LineState* shared) {
  if (shared->fEntries) ReleaseEntryTables(shared->fEntries);
  if (shared->fTokenTexts) ReleaseTokenTexts(shared->fTokenTexts);
}

void FreeLineState(LineState* shared) {
  ClearLineState(shared);
  FreeEntryTables(shared->fEntries);
  FreeTokenTexts(shared->fTokenTexts);
  free(shared);
}
