// Code units and character classes of UTF-8 text. Malformed bytes are classified, never
// rejected: they are no letter and no digit.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/code_units.h"

namespace {

constexpr bool IsContinuation(unsigned b) { return (b & 0xC0) == 0x80; }

}  // namespace

uint16_t FirstCodeUnit(const char* p, const char* end) {
  if (p >= end) return 0;
  const auto n = end - p;
  const unsigned b0 = Byte(p);
  if (b0 < 0x80) return static_cast<uint16_t>(b0);
  if (b0 < 0xC0) return 0;
  if (b0 < 0xE0) {
    if (n < 2 || !IsContinuation(Byte(p + 1))) return 0;
    return static_cast<uint16_t>(((b0 & 0x1F) << 6) | (Byte(p + 1) & 0x3F));
  }
  if (b0 < 0xF0) {
    if (n < 3 || !IsContinuation(Byte(p + 1)) || !IsContinuation(Byte(p + 2))) return 0;
    return static_cast<uint16_t>(((b0 & 0x0F) << 12) | ((Byte(p + 1) & 0x3F) << 6) |
                                 (Byte(p + 2) & 0x3F));
  }
  if (b0 < 0xF8) {
    if (n < 4 || !IsContinuation(Byte(p + 1)) || !IsContinuation(Byte(p + 2)) ||
        !IsContinuation(Byte(p + 3)))
      return 0;
    // The lead byte's payload and the top bits of the second byte fall outside 16 bits.
    return static_cast<uint16_t>(((Byte(p + 1) & 0x0F) << 12) | ((Byte(p + 2) & 0x3F) << 6) |
                                 (Byte(p + 3) & 0x3F));
  }
  return 0;
}

int CharLength(unsigned char first) {
  if (first < 0x80) return 1;
  if (first < 0xE0) return 2;  // continuation bytes included
  if (first < 0xF0) return 3;
  if (first < 0xF8) return 4;
  return 3;
}

int StepOverChar(const char* p, const char* end) {
  const int length = CharLength(static_cast<unsigned char>(*p));
  int step = 1;
  while (step < length && p + step < end && IsContinuation(Byte(p + step))) step++;
  return step;
}

bool IsIdentifierStart(const char* p, const char* end) {
  const unsigned b = Byte(p);
  if (b == '_') return true;
  if (b < 0x80) return HasClass(b, kAsciiLetter);
  return Py_UNICODE_ISALPHA(FirstCodeUnit(p, end));
}

bool IsIdentifierChar(const char* p, const char* end) {
  const unsigned b = Byte(p);
  if (b < 0x80) return HasClass(b, kNameChar);
  const Py_UCS4 unit = FirstCodeUnit(p, end);
  return Py_UNICODE_ISALPHA(unit) || Py_UNICODE_ISNUMERIC(unit);
}
