// Code units and character classes: how the tokenizer reads one UTF-8 character without
// decoding the text. ASCII takes a table; anything else asks the interpreter's Unicode database.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

inline unsigned Byte(const char* p) { return static_cast<unsigned char>(*p); }

// Returns the 16-bit code unit of the first character of [p, end), or 0 when it is malformed,
// truncated or the text is empty. Four-byte forms keep only the low 16 bits of the code point.
uint16_t FirstCodeUnit(const char* p, const char* end);

// Returns the step over a character from its first byte alone: 1, 2, 3 or 4.
int CharLength(unsigned char first);

// Returns the step over the character at p (p before end): CharLength for a well-formed
// sequence, but never past the end and never over a byte that is not a continuation byte, so a
// malformed sequence cannot swallow the ASCII bytes behind it.
int StepOverChar(const char* p, const char* end);

enum CharClass : uint8_t {
  kAsciiLetter = 1,
  kAsciiDigit = 2,
  kHexDigit = 4,
  kBlank = 8,       // tab, vertical tab, form feed, space
  kLineBreak = 16,  // LF, CR
  kQuote = 32,      // ' and "
  kNameChar = 64,   // ASCII letters, digits and '_'
};

// One row per byte value, built at compile time.
struct CharClassTable {
  uint8_t fRows[256];
  constexpr CharClassTable() : fRows() {
    for (unsigned b = 0; b < 256; b++) {
      uint8_t c = 0;
      if ((b >= 'a' && b <= 'z') || (b >= 'A' && b <= 'Z')) c |= kAsciiLetter;
      if (b >= '0' && b <= '9') c |= kAsciiDigit | kHexDigit;
      if ((b >= 'a' && b <= 'f') || (b >= 'A' && b <= 'F')) c |= kHexDigit;
      if (b == '\t' || b == '\v' || b == '\f' || b == ' ') c |= kBlank;
      if (b == '\n' || b == '\r') c |= kLineBreak;
      if (b == '\'' || b == '"') c |= kQuote;
      if ((c & (kAsciiLetter | kAsciiDigit)) || b == '_') c |= kNameChar;
      fRows[b] = c;
    }
  }
};

inline constexpr CharClassTable kCharClasses{};

constexpr bool HasClass(unsigned b, uint8_t c) { return (kCharClasses.fRows[b] & c) != 0; }
inline bool IsAsciiDigit(unsigned b) { return HasClass(b, kAsciiDigit); }
inline bool IsHexDigit(unsigned b) { return HasClass(b, kHexDigit); }
inline bool IsBlank(unsigned b) { return HasClass(b, kBlank); }
inline bool IsLineBreak(unsigned b) { return HasClass(b, kLineBreak); }
inline bool IsQuote(unsigned b) { return HasClass(b, kQuote); }
inline unsigned AsciiLower(unsigned b) { return (b >= 'A' && b <= 'Z') ? b + 32 : b; }

// True when the first character of [p, end) may begin a name (p before end).
bool IsIdentifierStart(const char* p, const char* end);

// True when the first character of [p, end) may continue a name (p before end).
bool IsIdentifierChar(const char* p, const char* end);
