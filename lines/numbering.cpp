// Numbering a list's lines in order, and the record of the list that was numbered.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/numbering.h"

namespace {

const void* const* ItemsOf(PyObject* list) {
  return reinterpret_cast<const void* const*>(PySequence_Fast_ITEMS(list));
}

}  // namespace

int NumberLine(ShiftTable* table, LogicalLine* line, size_t index) {
  if (index % kGroupLines == 0) {
    if (ReserveGroups(table, 1) != 0) {
      PyErr_NoMemory();
      return -1;
    }
    InsertGroup(table, table->fCount);
  }
  DetachLine(line);
  AttachLine(line, table, table->fOrder[table->fCount - 1]);
  return 0;
}

PyObject* TextToKeep(PyObject* owner, const char* data, const char* end) {
  const Py_ssize_t length = end - data;
  if (owner && PyBytes_CheckExact(owner) && PyBytes_AS_STRING(owner) == data &&
      PyBytes_GET_SIZE(owner) == length)
    return Py_NewRef(owner);
  return PyBytes_FromStringAndSize(data, length);
}

int SealNumbering(ShiftTable* table, PyObject* list, PyObject* text, const ReadOptions& options) {
  const auto count = static_cast<size_t>(PyList_GET_SIZE(list));
  if (ReserveItems(table, count) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  RecordItems(table, list, 0, table->fItemCount, ItemsOf(list), count);
  RecordText(table, text, options);
  return 0;
}

void SealReplacedLines(ShiftTable* table, PyObject* list, size_t index, size_t removed,
                       size_t added, PyObject* text, const ReadOptions& options) {
  RecordItems(table, list, index, removed, ItemsOf(list) + index, added);
  RecordText(table, text, options);
}

bool ListIsAsNumbered(const ShiftTable* table, PyObject* list) {
  return ItemsAreRecorded(table, list, ItemsOf(list), static_cast<size_t>(PyList_GET_SIZE(list)));
}
