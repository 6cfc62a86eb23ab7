// Token starts and string prefixes.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/token_start.h"

#include <cstddef>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"

namespace {

// Matched after lower-casing ASCII letters; every other combination starts a name instead.
constexpr const char kOneLetterPrefixes[] = "rbuf";
constexpr const char* kTwoLetterPrefixes[] = {"rb", "ru", "rf", "br", "ur", "fr"};

bool IsOneLetterPrefix(unsigned l) {
  for (const char* c = kOneLetterPrefixes; *c; c++) {
    if (l == static_cast<unsigned char>(*c)) return true;
  }
  return false;
}

bool IsTwoLetterPrefix(unsigned l1, unsigned l2) {
  for (const char* pair : kTwoLetterPrefixes) {
    if (l1 == static_cast<unsigned char>(pair[0]) && l2 == static_cast<unsigned char>(pair[1]))
      return true;
  }
  return false;
}

// Lower-cased byte i places after p, or 0 at or past end.
unsigned LowerAt(const char* p, const char* end, ptrdiff_t i) {
  return i < end - p ? AsciiLower(Byte(p + i)) : 0;
}

const char* OpenQuote(const char* p, const char* end, ScanState* state) {
  const char quote = *p;
  state->fTokenId = STRING_TOKEN;
  state->fQuote = quote;
  // Three quotes count as triple only when all three lie on the line.
  if (p + 2 < end && p[1] == quote && p[2] == quote) {
    state->fTriple = 1;
    return p + 3;
  }
  state->fTriple = 0;
  return p + 1;
}


}  // namespace

const char* ScanStringStart(const char* p, const char* end, ScanState* state) {
  if (p < end) {
    if (IsQuote(Byte(p))) return OpenQuote(p, end, state);
    const unsigned l1 = LowerAt(p, end, 0);
    const unsigned l2 = LowerAt(p, end, 1);
    const unsigned l3 = LowerAt(p, end, 2);
    if (IsOneLetterPrefix(l1) && IsQuote(l2)) return OpenQuote(p + 1, end, state);
    if (IsQuote(l3) && IsTwoLetterPrefix(l1, l2)) return OpenQuote(p + 2, end, state);
  }
  state->fTokenId = ERROR_TOKEN;
  state->fQuote = 0;
  state->fTriple = 0;
  return nullptr;
}
