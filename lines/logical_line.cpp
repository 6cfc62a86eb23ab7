// The LogicalLine record: creation in the fresh state, the collector's view of it, and release.
// A line takes part in the cyclic collector only once the host stores an object in it: what
// parsing puts there (bytes, str, tuples of those) cannot form a cycle, so the millions of
// lines that are never annotated cost a collection nothing.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/logical_line.h"

#include <cstdlib>

#include "core/module_type.h"
#include "lines/line_type.h"

namespace {

// Every object the line holds; the host's annotations are the ones that can close a cycle.
int LineTraverse(PyObject* self, visitproc visit, void* arg) {
  LogicalLine* line = AsLine(self);
  Py_VISIT(Py_TYPE(self));  // a heap type, which the line holds
  for (int i = 0; i < line->fTokenCount; i++) Py_VISIT(line->fTokenArray[i]);
  Py_VISIT(line->fScopeName);
  Py_VISIT(line->fTokensTuple);
  Py_VISIT(line->fLocalScopeName);
  if (int found = VisitObjectList(&line->fNames, visit, arg)) return found;
  if (int found = VisitObjectList(&line->fTypeEquivs, visit, arg)) return found;
  return VisitObjectList(&line->fArgTypeEquivs, visit, arg);
}

// Breaks a cycle by dropping what the host stored; the tokens and the texts made from them
// refer to nothing and stay, so the line still reads as a line.
int LineClear(PyObject* self) {
  ClearAppended(AsLine(self));
  Py_CLEAR(AsLine(self)->fScopeName);
  return 0;
}

void LineDealloc(PyObject* self) {
  PyTypeObject* type = Py_TYPE(self);
  PyObject_GC_UnTrack(self);
  LogicalLine* line = AsLine(self);
  // The positions and the line text are in the record's storage, freed with it.
  for (int i = 0; i < line->fTokenCount; i++) Py_DECREF(line->fTokenArray[i]);
  DetachLine(line);
  ClearAppended(line);
  Py_XDECREF(line->fScopeName);
  Py_XDECREF(line->fTokensTuple);
  Py_XDECREF(line->fLocalScopeName);
  type->tp_free(self);
  Py_DECREF(type);
}

}  // namespace

PyTypeObject* NewLineType(PyObject* module, PyMethodDef* methods, PyGetSetDef* attributes) {
  PyType_Slot slots[] = {
      {Py_tp_dealloc, reinterpret_cast<void*>(LineDealloc)},
      {Py_tp_traverse, reinterpret_cast<void*>(LineTraverse)},
      {Py_tp_clear, reinterpret_cast<void*>(LineClear)},
      {Py_tp_methods, methods},
      {Py_tp_getset, attributes},
      {0, nullptr},
  };
  // No subclassing, no constructor, no attribute of its own set from Python.
  PyType_Spec spec = {
      .name = "logicalline.LogicalLine",
      .basicsize = sizeof(LogicalLine),
      .itemsize = 1,
      .flags = Py_TPFLAGS_DEFAULT | Py_TPFLAGS_HAVE_GC | Py_TPFLAGS_DISALLOW_INSTANTIATION |
               Py_TPFLAGS_IMMUTABLETYPE,
      .slots = slots,
  };
  return NewModuleType(module, &spec);
}

bool IsLogicalLine(PyObject* object) { return Py_TYPE(object)->tp_dealloc == LineDealloc; }

LogicalLine* NewLogicalLine(PyTypeObject* type, size_t storage) {
  static_assert(sizeof(LogicalLine) % alignof(PyObject*) == 0, "the storage starts aligned");
  if (storage > static_cast<size_t>(PY_SSIZE_T_MAX) - sizeof(LogicalLine)) {
    PyErr_NoMemory();
    return nullptr;
  }
  LogicalLine* line = PyObject_GC_NewVar(LogicalLine, type,  // untracked
                                         static_cast<Py_ssize_t>(storage));
  if (!line) return nullptr;
  const ObjectList empty = {.fItems = nullptr, .fCount = 0, .fCapacity = 0};
  line->fTokenArray = nullptr;
  line->fTokenPositions = nullptr;
  line->fTokenCount = 0;
  line->fIndentLevel = 0;
  line->fLineCount = 0;
  line->fType = kUnknown;
  line->fFlags = 0;
  line->fScopeName = nullptr;
  line->fNames = empty;
  line->fTypeEquivs = empty;
  line->fArgTypeEquivs = empty;
  line->fLineText = nullptr;
  line->fTokensTuple = nullptr;
  line->fStoredFirstLine = 0;
  line->fStoredOffset = 0;
  line->fShiftTable = nullptr;
  line->fGroup = 0;
  Py_INCREF(Py_None);
  line->fLocalScopeName = Py_None;
  return line;
}

void TrackLine(LogicalLine* line) {
  PyObject* self = reinterpret_cast<PyObject*>(line);
  if (!PyObject_GC_IsTracked(self)) PyObject_GC_Track(self);
}

void ClearAppended(LogicalLine* line) {
  ClearObjectList(&line->fNames);
  ClearObjectList(&line->fTypeEquivs);
  ClearObjectList(&line->fArgTypeEquivs);
}

PyObject* TokenAt(LogicalLine* line, int index) {
  if (index < 0 || index >= line->fTokenCount) {
    PyErr_SetString(PyExc_IndexError, "Invalid token index");
    return nullptr;
  }
  return line->fTokenArray[index];
}

void SetFirstLine(LogicalLine* line, int64_t first) {
  line->fStoredFirstLine += first - FirstLineOf(line);
}

void MoveLine(LogicalLine* line, int64_t lines, int64_t bytes) {
  line->fStoredFirstLine += lines;
  line->fStoredOffset += bytes;
}

void AttachLine(LogicalLine* line, ShiftTable* table, uint32_t group) {
  ShiftGroup& joined = table->fGroups[group];
  HoldShiftTable(table);
  joined.fMembers++;
  line->fShiftTable = table;
  line->fGroup = group;
  MoveLine(line, -joined.fLineShift, -joined.fByteShift);
}

void DetachLine(LogicalLine* line) {
  ShiftTable* table = line->fShiftTable;
  if (!table) return;
  ShiftGroup& left = table->fGroups[line->fGroup];
  MoveLine(line, left.fLineShift, left.fByteShift);
  left.fMembers--;
  table->fStale = true;  // the list it numbers no longer holds what the table says
  line->fShiftTable = nullptr;
  DropShiftTable(table);
}
