// The one growth rule for every array the module keeps: token arrays, line starts, text
// buffers and annotation lists.
#pragma once

#include <cstddef>

// Makes room for `needed` items of `size` bytes in a malloc'd block. The capacity at least
// doubles and never drops below `minimum`; a block that is still the owner's inline storage
// (`inlineItems`) moves to the heap with its contents. Returns 0, or -1 when the memory cannot
// be had, with nothing changed and no exception set.
int GrowItems(void** items, size_t* capacity, size_t needed, size_t size, size_t minimum,
              const void* inlineItems);

template <typename T>
int Grow(T** items, size_t* capacity, size_t needed, size_t minimum,
         const T* inlineItems = nullptr) {
  if (needed <= *capacity) return 0;
  void* block = *items;
  if (GrowItems(&block, capacity, needed, sizeof(T), minimum, inlineItems) != 0) return -1;
  *items = static_cast<T*>(block);
  return 0;
}
