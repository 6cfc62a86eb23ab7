// Annotating lines. What a line accepts follows its type: a class definition holds base class
// names, a function definition argument names, every other line attributes.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/editing.h"

#include "lines/line_type.h"

namespace {

int Refuse(const char* message) {
  PyErr_SetString(PyExc_ValueError, message);
  return -1;
}

bool IsScopeStart(const LogicalLine* line) {
  return line->fType == kClassDef || line->fType == kFunctionDef;
}

// Every object the host stores goes through here, so that the line is watched for cycles.
int Store(LogicalLine* line, ObjectList* list, PyObject* const* objects, Py_ssize_t n) {
  if (AppendObjects(list, objects, n) != 0) return -1;
  TrackLine(line);
  return 0;
}

int AppendPair(LogicalLine* line, ObjectList* pairs, PyObject* a, PyObject* b) {
  PyObject* const pair[] = {a, b};
  return Store(line, pairs, pair, 2);
}

}  // namespace

int AppendAttrib(LogicalLine* line, PyObject* object) {
  if (IsScopeStart(line)) return Refuse("Cannot append attrib name type to a class or function def line");
  return Store(line, &line->fNames, &object, 1);
}

int AppendArgName(LogicalLine* line, PyObject* object) {
  if (line->fType != kFunctionDef) return Refuse("Cannot append arg name to a non-function def line");
  return Store(line, &line->fNames, &object, 1);
}

int AppendBaseClassName(LogicalLine* line, PyObject* object) {
  if (line->fType != kClassDef) return Refuse("Cannot append base class name to a non-class def line");
  return Store(line, &line->fNames, &object, 1);
}

int AppendTypeEquiv(LogicalLine* line, PyObject* a, PyObject* b) {
  return AppendPair(line, &line->fTypeEquivs, a, b);
}

int AppendArgTypeEquiv(LogicalLine* line, PyObject* a, PyObject* b) {
  if (line->fType != kFunctionDef)
    return Refuse("Cannot append arg name type equiv to a non-function def line");
  return AppendPair(line, &line->fArgTypeEquivs, a, b);
}

void SetScopeName(LogicalLine* line, PyObject* name) {
  Py_INCREF(name);
  Py_XSETREF(line->fScopeName, name);
  TrackLine(line);
}
