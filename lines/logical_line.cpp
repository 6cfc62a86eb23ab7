// The LogicalLine record: creation in the fresh state, and release.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/logical_line.h"

#include <cstdlib>

#include "lines/line_type.h"

namespace {

void LineDealloc(PyObject* self) {
  LogicalLine* line = AsLine(self);
  // The positions and the line text live in the token array's block.
  for (int i = 0; i < line->fTokenCount; i++) Py_DECREF(line->fTokenArray[i]);
  free(line->fTokenArray);
  ClearAppended(line);
  Py_XDECREF(line->fScopeName);
  Py_XDECREF(line->fTokensTuple);
  Py_XDECREF(line->fLocalScopeName);
  Py_TYPE(self)->tp_free(self);
}

}  // namespace

// Slots left out stay empty; the interpreter fills them in when the type is readied.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmissing-field-initializers"
PyTypeObject LogicalLineType = {
    .ob_base = PyVarObject_HEAD_INIT(nullptr, 0)
    .tp_name = "LogicalLine",
    .tp_basicsize = sizeof(LogicalLine),
    .tp_dealloc = LineDealloc,
    .tp_flags = Py_TPFLAGS_DEFAULT,  // no subclassing, no collector, no constructor
};
#pragma GCC diagnostic pop

LogicalLine* NewLogicalLine() {
  LogicalLine* line = PyObject_New(LogicalLine, &LogicalLineType);
  if (!line) return nullptr;
  const ObjectList empty = {.fItems = nullptr, .fCount = 0, .fCapacity = 0};
  line->fTokenArray = nullptr;
  line->fTokenPositions = nullptr;
  line->fFirstLine = 0;
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
  Py_INCREF(Py_None);
  line->fLocalScopeName = Py_None;
  return line;
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
