// Where a token starts: the physical line within its logical line and the byte column within
// that physical line. A logical line's text is addressed by 32-bit offsets and every physical
// line holds at least one byte, so both always fit, at their true values.
#pragma once

#include <cstdint>

struct TokenPosition {
  int32_t fLine;    // >= 0
  int32_t fColumn;  // >= 0
};
