// The string prefix table of every reading.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/string_prefixes.h"

#include "tokenizer/code_units.h"

namespace {

struct PrefixRow {
  const char* fLetters;  // lower case; matched after lower-casing ASCII letters
  uint8_t fFlags;
  StringRules fSince;    // the first reading that accepts the prefix
};

// Every other combination of letters before a quote is a name followed by a string. The
// classic reading's rows are those it has always accepted, "ur" and "ru" included.
constexpr PrefixRow kPrefixes[] = {
    {"r", kRawPrefix, StringRules::kClassic},
    {"b", 0, StringRules::kClassic},
    {"u", 0, StringRules::kClassic},
    {"f", kFormattedPrefix, StringRules::kClassic},
    {"rb", kRawPrefix, StringRules::kClassic},
    {"br", kRawPrefix, StringRules::kClassic},
    {"ru", kRawPrefix, StringRules::kClassic},
    {"ur", kRawPrefix, StringRules::kClassic},
    {"rf", kRawPrefix | kFormattedPrefix, StringRules::kClassic},
    {"fr", kRawPrefix | kFormattedPrefix, StringRules::kClassic},
    {"t", kFormattedPrefix, StringRules::kTemplates},
    {"rt", kRawPrefix | kFormattedPrefix, StringRules::kTemplates},
    {"tr", kRawPrefix | kFormattedPrefix, StringRules::kTemplates},
};

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
      if (row && row->fSince <= rules) return {p + n, row->fFlags};
      break;
    }
    if (!HasClass(Byte(p + n), kAsciiLetter)) break;
  }
  return {nullptr, 0};
}

bool StartsTemplateString(const char* p, const char* end) {
  const StringStart start = FindStringStart(p, end, StringRules::kTemplates);
  if (!start.fQuote) return false;
  for (const char* letter = p; letter < start.fQuote; letter++) {
    if (AsciiLower(Byte(letter)) == 't') return true;
  }
  return false;
}
