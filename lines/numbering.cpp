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
  if (line->fShiftTable) DetachLine(line);  // a line a full read just built shares none
  AttachLine(line, table, table->fOrder[table->fCount - 1]);
  return 0;
}

int SealNumbering(ShiftTable* table, PyObject* list, KeptText* text, const ReadOptions& options,
                  int64_t unprovenLines) {
  const auto count = static_cast<size_t>(PyList_GET_SIZE(list));
  if (ReserveItems(table, count) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  RecordItems(table, list, 0, table->fItemCount, ItemsOf(list), count);
  RecordText(table, text, options, unprovenLines);
  return 0;
}

void SealReplacedLines(ShiftTable* table, PyObject* list, size_t index, size_t removed,
                       size_t added, KeptText* text, const ReadOptions& options) {
  RecordItems(table, list, index, removed, ItemsOf(list) + index, added);
  RecordText(table, text, options, -1);
}

bool ListIsAsNumbered(const ShiftTable* table, PyObject* list) {
  return ItemsAreRecorded(table, list, ItemsOf(list), static_cast<size_t>(PyList_GET_SIZE(list)));
}
