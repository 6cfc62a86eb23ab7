// The shared numbering table of an updated list, and its record of the list.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/shift_table.h"

#include <cstdlib>
#include <cstring>

#include "core/growth.h"

ShiftTable* NewShiftTable() {
  auto* table = static_cast<ShiftTable*>(malloc(sizeof(ShiftTable)));
  if (!table) return nullptr;
  *table = ShiftTable{.fRefs = 1, .fGroups = nullptr, .fOrder = nullptr, .fCount = 0,
                      .fGroupCapacity = 0, .fOrderCapacity = 0, .fList = nullptr,
                      .fItems = nullptr, .fItemCount = 0, .fItemCapacity = 0, .fStale = false,
                      .fText = {}, .fOptions = {},
                      .fUnprovenLines = -1};
  return table;
}

void HoldShiftTable(ShiftTable* table) { table->fRefs++; }

void DropShiftTable(ShiftTable* table) {
  if (--table->fRefs > 0) return;
  free(table->fGroups);
  free(table->fOrder);
  free(table->fItems);
  ReleaseKeptText(&table->fText);
  free(table);
}

int ReserveGroups(ShiftTable* table, size_t more) {
  const size_t needed = table->fCount + more;
  if (needed > UINT32_MAX) return -1;
  if (Grow(&table->fOrder, &table->fOrderCapacity, needed, 16) != 0) return -1;
  return Grow(&table->fGroups, &table->fGroupCapacity, needed, 16);
}

uint32_t InsertGroup(ShiftTable* table, size_t position) {
  const auto id = static_cast<uint32_t>(table->fCount);
  uint32_t* order = table->fOrder;
  memmove(order + position + 1, order + position, (table->fCount - position) * sizeof(*order));
  order[position] = id;
  table->fCount++;
  table->fGroups[id] = ShiftGroup{.fLineShift = 0, .fByteShift = 0, .fMembers = 0,
                                  .fPosition = static_cast<uint32_t>(position)};
  for (size_t i = position + 1; i < table->fCount; i++)
    table->fGroups[order[i]].fPosition = static_cast<uint32_t>(i);
  return id;
}

void ShiftGroupsFrom(ShiftTable* table, size_t position, int64_t lines, int64_t bytes) {
  for (size_t i = position; i < table->fCount; i++) {
    ShiftGroup& group = table->fGroups[table->fOrder[i]];
    group.fLineShift += lines;
    group.fByteShift += bytes;
  }
}

int ReserveItems(ShiftTable* table, size_t count) {
  return Grow(&table->fItems, &table->fItemCapacity, count, 16);
}

void RecordItems(ShiftTable* table, const void* list, size_t index, size_t removed,
                 const void* const* items, size_t added) {
  table->fList = list;
  const void** at = table->fItems + index;
  const size_t after = table->fItemCount - index - removed;
  if (added != removed) memmove(at + added, at + removed, after * sizeof(*at));
  if (added) memcpy(at, items, added * sizeof(*at));
  table->fItemCount += added - removed;
  table->fStale = false;
}

void RecordText(ShiftTable* table, KeptText* text, const ReadOptions& options,
                int64_t unprovenLines) {
  ReleaseKeptText(&table->fText);
  table->fText = *text;
  *text = KeptText{};
  table->fOptions = options;
  table->fUnprovenLines = unprovenLines;
}

bool ItemsAreRecorded(const ShiftTable* table, const void* list, const void* const* items,
                      size_t count) {
  return !table->fStale && list == table->fList && count == table->fItemCount &&
         (count == 0 || memcmp(items, table->fItems, count * sizeof(*items)) == 0);
}
