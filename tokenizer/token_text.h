// Reading a stored token's text without copying it, and the facts about a text that more than
// one layer needs: its bracket step and its error prefix.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <bit>
#include <cstdint>
#include <cstring>
#include <string_view>

#include "core/text_buffer.h"
#include "core/token_ids.h"

struct TokenText {
  const char* fBytes;
  Py_ssize_t fLength;

  // Every token the module lists is a bytes object.
  explicit TokenText(PyObject* token)
      : fBytes(PyBytes_AS_STRING(token)), fLength(PyBytes_GET_SIZE(token)) {}
  TokenText(const char* bytes, Py_ssize_t length) : fBytes(bytes), fLength(length) {}

  unsigned At(Py_ssize_t i) const {
    return i < fLength ? static_cast<unsigned char>(fBytes[i]) : 0;
  }
  bool Is(std::string_view word) const {
    return static_cast<size_t>(fLength) == word.size() &&
           memcmp(fBytes, word.data(), word.size()) == 0;
  }
  bool HasErrorPrefix() const {
    return fLength >= kErrorPrefixLength && memcmp(fBytes, kErrorPrefix, kErrorPrefixLength) == 0;
  }
};

// How a token with each first byte changes the bracket depth: +1 opens, -1 closes.
struct BracketSteps {
  signed char fRows[256];
  constexpr BracketSteps() : fRows() {
    for (unsigned char open : {'(', '[', '{'}) fRows[open] = 1;
    for (unsigned char close : {')', ']', '}'}) fRows[close] = -1;
  }
};
inline constexpr BracketSteps kBracketSteps;

// The bracket step of a token whose text begins with `first` (a byte, or 0 for no text).
inline int BracketStep(unsigned first) { return kBracketSteps.fRows[first & 0xFF]; }

static_assert(std::endian::native == std::endian::little, "words are read little-endian");

// The n bytes at p (at most 8) as a word, the first in the low byte, zero above them. Eight
// bytes must be readable at p.
inline uint64_t WordAt(const char* p, Py_ssize_t n) {
  uint64_t word = 0;
  memcpy(&word, p, sizeof(word));
  return n >= 8 ? word : word & ((uint64_t{1} << (8 * n)) - 1);
}

// The first eight bytes of the n at p, or all of them when fewer, as WordAt gives them; read
// a byte at a time when fewer, for a text with nothing readable after it.
inline uint64_t HeadWord(const char* p, Py_ssize_t n) {
  if (n >= 8) return WordAt(p, 8);
  uint64_t word = 0;
  for (Py_ssize_t i = n - 1; i >= 0; i--) word = word << 8 | static_cast<unsigned char>(p[i]);
  return word;
}

// The last eight of the n bytes at p as a word, or 0 for a text of eight bytes or fewer.
inline uint64_t TailWord(const char* p, Py_ssize_t n) { return n > 8 ? WordAt(p + n - 8, 8) : 0; }

// Mixes the first and last eight bytes (words as WordAt gives them; the last is 0 for a text of
// eight bytes or fewer) and the length: enough to spread token texts over the slots of a cache,
// at a fixed cost whatever the length.
inline uint32_t HashWords(uint64_t head, uint64_t tail, Py_ssize_t n) {
  const uint64_t mixed = (head ^ (tail * 0x9E3779B97F4A7C15ull) ^ static_cast<uint64_t>(n)) *
                         0xFF51AFD7ED558CCDull;
  return static_cast<uint32_t>(mixed >> 32);
}

inline uint32_t HashText(const char* p, Py_ssize_t n) {
  return HashWords(HeadWord(p, n), TailWord(p, n), n);
}

// Returns the first byte at or after p that is no space, read a word at a time: indentation is
// most of the blanks in source. p lies in a TextBuffer's text, whose padding ends every run of
// spaces and lets a word be read at each step up to it.
static_assert(kTextPadding >= sizeof(uint64_t), "a word read at the text's last byte stays in it");
inline const char* SkipSpaces(const char* p) {
  for (;; p += 8) {
    const uint64_t others = WordAt(p, 8) ^ 0x2020202020202020ull;  // zero bytes were spaces
    if (others) return p + std::countr_zero(others) / 8;
  }
}
