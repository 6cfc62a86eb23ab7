// Annotation lists store no capacity: storage for 2 entries at the first append, then
// count + 2 whenever an append finds the count even, so the capacity is always the count
// rounded up to an even number. Every writer goes through GrowForAppend.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "analysis/editing.h"

#include <cstdlib>

#include "module/line_types.h"

namespace {

// Makes room for one more entry of `width` references. Returns 0, or -1 with MemoryError.
int GrowForAppend(PyObject*** items, Py_ssize_t count, size_t width) {
  if (*items && count % 2 == 1) return 0;  // the spare entry
  const size_t entries = *items ? static_cast<size_t>(count) + 2 : 2;
  if (entries > PY_SSIZE_T_MAX / (width * sizeof(PyObject*))) {
    PyErr_NoMemory();
    return -1;
  }
  auto* grown = static_cast<PyObject**>(realloc(*items, entries * width * sizeof(PyObject*)));
  if (!grown) {
    PyErr_NoMemory();
    return -1;
  }
  *items = grown;
  return 0;
}

int Refuse(const char* message) {
  PyErr_SetString(PyExc_ValueError, message);
  return -1;
}

bool IsScopeStart(const LogicalLine* line) {
  return line->fType == kClassDef || line->fType == kFunctionDef;
}

LogicalLine* AsLine(PyObject* self) { return reinterpret_cast<LogicalLine*>(self); }

PyObject* NoneOr(int status) {
  if (status != 0) return nullptr;
  Py_RETURN_NONE;
}

PyObject* AppendOne(PyObject* self, PyObject* args, const char* format,
                    int (*append)(LogicalLine*, PyObject*)) {
  PyObject* object = nullptr;
  if (!PyArg_ParseTuple(args, format, &object)) return nullptr;
  return NoneOr(append(AsLine(self), object));
}

PyObject* AppendTwo(PyObject* self, PyObject* args, const char* format,
                    int (*append)(LogicalLine*, PyObject*, PyObject*)) {
  PyObject* a = nullptr;
  PyObject* b = nullptr;
  if (!PyArg_ParseTuple(args, format, &a, &b)) return nullptr;
  return NoneOr(append(AsLine(self), a, b));
}

}  // namespace

int AppendToNameList(LogicalLine* line, PyObject* object) {
  if (GrowForAppend(&line->fNames, line->fNameCount, 1) != 0) return -1;
  Py_INCREF(object);
  line->fNames[line->fNameCount++] = object;
  return 0;
}

int AppendPair(PyObject*** pairs, Py_ssize_t* count, PyObject* a, PyObject* b) {
  if (GrowForAppend(pairs, *count, 2) != 0) return -1;
  Py_INCREF(a);
  Py_INCREF(b);
  (*pairs)[2 * *count] = a;
  (*pairs)[2 * *count + 1] = b;
  ++*count;
  return 0;
}

int AppendAttribChecked(LogicalLine* line, PyObject* object) {
  if (IsScopeStart(line)) return Refuse("Cannot append attrib name type to a class or function def line");
  return AppendToNameList(line, object);
}

int AppendArgNameChecked(LogicalLine* line, PyObject* object) {
  if (line->fType != kFunctionDef) return Refuse("Cannot append arg name to a non-function def line");
  return AppendToNameList(line, object);
}

int AppendBaseClassNameChecked(LogicalLine* line, PyObject* object) {
  if (line->fType != kClassDef) return Refuse("Cannot append base class name to a non-class def line");
  return AppendToNameList(line, object);
}

int AppendTypeEquivChecked(LogicalLine* line, PyObject* a, PyObject* b) {
  return AppendPair(&line->fTypeEquivs, &line->fTypeEquivCount, a, b);
}

int AppendArgTypeEquivChecked(LogicalLine* line, PyObject* a, PyObject* b) {
  if (line->fType != kFunctionDef)
    return Refuse("Cannot append arg name type equiv to a non-function def line");
  return AppendPair(&line->fArgTypeEquivs, &line->fArgTypeEquivCount, a, b);
}

PyObject* AppendAttribMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendAttrib", AppendAttribChecked);
}

PyObject* AppendArgNameMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendArgName", AppendArgNameChecked);
}

PyObject* AppendBaseClassNameMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendBaseClassName", AppendBaseClassNameChecked);
}

PyObject* AppendTypeEquivMethod(PyObject* self, PyObject* args) {
  return AppendTwo(self, args, "OO:AppendTypeEquiv", AppendTypeEquivChecked);
}

PyObject* AppendArgTypeEquivMethod(PyObject* self, PyObject* args) {
  return AppendTwo(self, args, "OO:AppendArgTypeEquiv", AppendArgTypeEquivChecked);
}

PyObject* SetLineRangeMethod(PyObject* self, PyObject* args) {
  int first = 0;
  int count = 0;
  if (!PyArg_ParseTuple(args, "ii", &first, &count)) return nullptr;
  AsLine(self)->fFirstLine = first;
  AsLine(self)->fLineCount = static_cast<int16_t>(count);  // keeps the low 16 bits
  Py_RETURN_NONE;
}

PyObject* SetParsedMethod(PyObject* self, PyObject* args) {
  PyObject* flag = nullptr;
  if (!PyArg_ParseTuple(args, "O", &flag)) return nullptr;
  const int truth = PyObject_IsTrue(flag);
  if (truth < 0) return nullptr;  // a failing truth test leaves the flag as it was
  LogicalLine* line = AsLine(self);
  line->fFlags = truth ? (line->fFlags | kParsedFlag) : (line->fFlags & ~kParsedFlag);
  Py_RETURN_NONE;
}

PyObject* SetScopeNameMethod(PyObject* self, PyObject* object) {
  Py_INCREF(object);
  Py_XSETREF(AsLine(self)->fScopeName, object);
  Py_RETURN_NONE;
}
