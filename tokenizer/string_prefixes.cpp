// Finding a string's opening quote through the prefix table.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/string_prefixes.h"

#include "tokenizer/code_units.h"

namespace {

// Returns the row of the n letters at p (n is 1 or 2), or nullptr.
const PrefixRow* FindPrefix(const char* p, int n) {
  for (const PrefixRow& row : kPrefixes) {
    int i = 0;
    while (i < n && row.fLetters[i] != '\0' &&
           AsciiLower(Byte(p + i)) == static_cast<unsigned char>(row.fLetters[i]))
      i++;
    if (i == n && row.fLetters[n] == '\0') return &row;
  }
  return nullptr;
}

}  // namespace

StringStart FindStringStart(const char* p, const char* end, StringRules rules) {
  for (int n = 0; n <= 2 && p + n < end; n++) {
    if (IsQuote(Byte(p + n))) {
      if (n == 0) return {p, 0};
      const PrefixRow* row = FindPrefix(p, n);
      if (row && Accepts(*row, rules)) return {p + n, row->fFlags};
      break;
    }
    if (!HasClass(Byte(p + n), kAsciiLetter)) break;
  }
  return {nullptr, 0};
}

bool StartsTemplateString(const char* p, const char* end) {
  const StringStart start = FindStringStart(p, end, kNewestRules);
  return start.fQuote && (start.fFlags & kTemplatePrefix);
}
