// Doubling keeps appends linear in the final size, whatever the pattern of growth.
#include "core/growth.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

int GrowItems(void** items, size_t* capacity, size_t needed, size_t size, size_t minimum,
              const void* inlineItems) {
  size_t grown = *capacity > SIZE_MAX / 2 ? SIZE_MAX : *capacity * 2;
  if (grown < minimum) grown = minimum;
  if (grown < needed) grown = needed;
  if (grown > SIZE_MAX / size) return -1;
  void* block;
  if (*items == inlineItems && inlineItems) {
    block = malloc(grown * size);
    if (block) memcpy(block, inlineItems, *capacity * size);
  } else {
    block = realloc(*items, grown * size);
  }
  if (!block) return -1;
  *items = block;
  *capacity = grown;
  return 0;
}
