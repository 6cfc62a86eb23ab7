// The numbering of a list of lines that updates keep current. An edit moves every line after
// it. Rather than touch each of those lines, the lines of an updated list sit in groups of
// neighbours, all sharing one table: a line stores its first line and offset as they were when
// it joined its group, and the table stores how far each group has moved since. Moving the
// lines after an edit is then one pass over the groups that follow it, in one small array.
// The table is also the record of the list it numbers: its items, its text and its options.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>
#include <cstdint>

#include "assembly/line_parts.h"
#include "lines/kept_text.h"

struct ShiftGroup {
  int64_t fLineShift;  // added to the first line that each member stores
  int64_t fByteShift;  // added to the offset that each member stores
  uint32_t fMembers;   // lines attached to the group; it stays in the order when empty
  uint32_t fPosition;  // where the group stands in fOrder
};

struct ShiftTable {
  size_t fRefs;         // attached lines, plus holds by an update under way
  ShiftGroup* fGroups;  // by group id
  uint32_t* fOrder;     // group ids, in the order of their lines in the list
  size_t fCount;        // groups made; ids run from 0 to fCount - 1
  size_t fGroupCapacity;
  size_t fOrderCapacity;
  // The list it numbers and that list's items, as the last read or update left them, and
  // whether a line has left the numbering since (released, numbered for another list, given
  // another range). While no line has left, every recorded line is alive, so a list whose items
  // are these pointers holds these very lines, numbered as the table says. The list is told by
  // its address: a list that now has that address and these items is as good as the one read,
  // its copy. Both are compared only.
  const void* fList;
  const void** fItems;
  size_t fItemCount;
  size_t fItemCapacity;
  bool fStale;
  // What the list was read from, so that an update can prove the host's description of an
  // edit and read the new text as the list was read: the whole text, empty until the list is
  // recorded, and the reading options.
  KeptText fText;
  ReadOptions fOptions;
  // For a text that readline handed out piece by piece, each piece ending at a line feed but
  // the last: how many pieces there were. The lines are numbered as a buffer's only when no
  // piece holds another line feed, that is when the text has as many lines. The first update
  // counts them, once; -1 when there is nothing left to prove.
  int64_t fUnprovenLines;
};

// A new empty table with one hold, or nullptr when memory is short (no exception set).
ShiftTable* NewShiftTable();

void HoldShiftTable(ShiftTable* table);

// Drops a hold, freeing the table, and releasing its text, with the last.
void DropShiftTable(ShiftTable* table);

// Makes room for `more` groups, so that InsertGroup cannot fail. Returns 0, or -1 when memory
// is short (no exception set).
int ReserveGroups(ShiftTable* table, size_t more);

// Makes a group with no shift, placed at `position` in the order, and returns its id. Room
// must have been reserved.
uint32_t InsertGroup(ShiftTable* table, size_t position);

// Moves every group from `position` in the order on.
void ShiftGroupsFrom(ShiftTable* table, size_t position, int64_t lines, int64_t bytes);

// Makes room to record `count` items, so that RecordItems cannot fail. Returns 0, or -1 when
// memory is short (no exception set).
int ReserveItems(ShiftTable* table, size_t count);

// Records that the items of `list` from `index` on, `removed` of those recorded, are now the
// `added` items at `items`, and trusts the record again: the whole list when index is 0 and
// removed all. Room must have been reserved.
void RecordItems(ShiftTable* table, const void* list, size_t index, size_t removed,
                 const void* const* items, size_t added);

// Records the text the list now stands for, which the table takes over (leaving *text empty),
// the options it was read with, and the pieces still to prove it cut into (-1: none).
void RecordText(ShiftTable* table, KeptText* text, const ReadOptions& options,
                int64_t unprovenLines);

// True when the list and its items are those recorded and no line has left the numbering since.
bool ItemsAreRecorded(const ShiftTable* table, const void* list, const void* const* items,
                      size_t count);
