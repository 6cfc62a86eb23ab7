// Numbering the lines of a list in order, in groups of neighbours that share one table: as a
// full read builds the list, or when an update finds a list that is not numbered yet.
#pragma once

#include <cstddef>

#include "lines/logical_line.h"
#include "lines/shift_table.h"

constexpr size_t kGroupLines = 32;

// Has `line`, item `index` of the list that `table` numbers, join the table, kGroupLines lines
// to a group; items join in order from 0. The line keeps its numbers, and leaves any other
// table it shared. Returns 0, or -1 with MemoryError set and the line unchanged.
int NumberLine(ShiftTable* table, LogicalLine* line, size_t index);

// Records the list that `table` numbers, as it stands now.
void SealNumbering(ShiftTable* table, const void* list, size_t length);
