// Where a token starts: the physical line within its logical line and the byte column within
// that physical line, each kept modulo 65536.
#pragma once

#include <cstdint>

struct TokenPosition {
  uint16_t fLine;
  uint16_t fColumn;
};
