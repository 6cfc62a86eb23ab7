// Numbering a list's lines in order.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/numbering.h"

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

void SealNumbering(ShiftTable* table, const void* list, size_t length) {
  table->fList = list;
  table->fListLength = length;
}
