// Numbering the lines of a list in order, in groups of neighbours that share one table: as a
// full read builds the list, or when an update regroups a list whose groups edits have split.
// The table also records the list's items, so that an update can tell whether the host changed
// the list since.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

#include "lines/logical_line.h"
#include "lines/shift_table.h"

constexpr size_t kGroupLines = 32;

// Has `line`, item `index` of the list that `table` numbers, join the table, kGroupLines lines
// to a group; items join in order from 0. The line keeps its numbers, and leaves any other
// table it shared. Returns 0, or -1 with MemoryError set and the line unchanged.
int NumberLine(ShiftTable* table, LogicalLine* line, size_t index);

// Records the list that `table` numbers, as it stands now, and the text (taken over, leaving
// *text empty on success) and options it was read with; `unprovenLines` as RecordText takes
// it. Returns 0, or -1 with MemoryError set.
int SealNumbering(ShiftTable* table, PyObject* list, KeptText* text, const ReadOptions& options,
                  int64_t unprovenLines);

// Records that the list's slice from `index` on, `removed` lines, became the `added` lines that
// the list now holds there, and that the list now stands for `text` (taken over), read with
// `options`. Room for the list's new length must have been reserved.
void SealReplacedLines(ShiftTable* table, PyObject* list, size_t index, size_t removed,
                       size_t added, KeptText* text, const ReadOptions& options);

// True when the list is the one the table recorded and holds exactly the lines recorded for it,
// in that order, and none of them has left the numbering since.
bool ListIsAsNumbered(const ShiftTable* table, PyObject* list);
