// String prefixes under the interpreter versions a parser may read as: which prefixes start a
// string, and what each makes of it. The one table here says it all: every set of prefix
// letters that the tokenizer and the classifier test is derived from it at compile time.
#pragma once

#include <cstdint>

#include "tokenizer/code_units.h"

// How strings are read, oldest first.
enum class StringRules : uint8_t {
  kClassic,    // as 3.10 and 3.11 read: an f-string ends at its first unescaped quote
  kFormatted,  // as 3.12 and 3.13 read: an f-string's fields hold any expression, nested strings
  kTemplates,  // as 3.14 reads: t-strings too, with the grammar of f-strings
};
constexpr StringRules kNewestRules = StringRules::kTemplates;
constexpr int kReadingCount = static_cast<int>(kNewestRules) + 1;

enum PrefixFlag : uint8_t {
  kRawPrefix = 1,        // backslashes escape nothing but a quote, and "\N{" names nothing
  kFormattedPrefix = 2,  // braces open fields
  kBytesPrefix = 4,      // a bytes literal
  kTemplatePrefix = 8,   // a t-string: formatted, and made into a template rather than a str
};

struct PrefixRow {
  char fLetters[3];    // one letter or two, lower case; matched after lower-casing ASCII letters
  uint8_t fFlags;      // PrefixFlag bits
  StringRules fFirst;  // the first reading that accepts the prefix
  StringRules fLast;   // the last one
};

// Every other combination of letters before a quote is a name followed by a string.
inline constexpr PrefixRow kPrefixes[] = {
    {"r", kRawPrefix, StringRules::kClassic, kNewestRules},
    {"b", kBytesPrefix, StringRules::kClassic, kNewestRules},
    {"u", 0, StringRules::kClassic, kNewestRules},
    {"f", kFormattedPrefix, StringRules::kClassic, kNewestRules},
    {"rb", kRawPrefix | kBytesPrefix, StringRules::kClassic, kNewestRules},
    {"br", kRawPrefix | kBytesPrefix, StringRules::kClassic, kNewestRules},
    // Gone since Python 3.0: the interpreters read a name, then a string. The classic reading
    // has always taken them for one string, and keeps doing so.
    {"ru", kRawPrefix, StringRules::kClassic, StringRules::kClassic},
    {"ur", kRawPrefix, StringRules::kClassic, StringRules::kClassic},
    {"rf", kRawPrefix | kFormattedPrefix, StringRules::kClassic, kNewestRules},
    {"fr", kRawPrefix | kFormattedPrefix, StringRules::kClassic, kNewestRules},
    {"t", kFormattedPrefix | kTemplatePrefix, StringRules::kTemplates, kNewestRules},
    {"rt", kRawPrefix | kFormattedPrefix | kTemplatePrefix, StringRules::kTemplates, kNewestRules},
    {"tr", kRawPrefix | kFormattedPrefix | kTemplatePrefix, StringRules::kTemplates, kNewestRules},
};

constexpr bool Accepts(const PrefixRow& row, StringRules rules) {
  return row.fFirst <= rules && rules <= row.fLast;
}

constexpr int LengthOf(const PrefixRow& row) { return row.fLetters[1] == '\0' ? 1 : 2; }

// The quick tests below look at no more than two letters before the quote.
constexpr bool RowsAreWellFormed() {
  for (const PrefixRow& row : kPrefixes) {
    for (int i = 0; i < LengthOf(row); i++) {
      if (row.fLetters[i] < 'a' || row.fLetters[i] > 'z') return false;
    }
    if (row.fLetters[2] != '\0' || row.fFirst > row.fLast) return false;
    if ((row.fFlags & kTemplatePrefix) && !(row.fFlags & kFormattedPrefix)) return false;
    for (const PrefixRow& other : kPrefixes) {
      if (&other != &row && other.fLetters[0] == row.fLetters[0] &&
          other.fLetters[1] == row.fLetters[1])
        return false;
    }
  }
  return true;
}
static_assert(RowsAreWellFormed(), "one row per prefix of one or two lower-case letters");

// A set of bytes: letters of prefixes, in either case.
struct LetterSet {
  bool fRows[256];
  constexpr bool Has(unsigned b) const { return fRows[b & 0xFF]; }
};

// The letters at positions `from` to `to` (0 is the first) of the rows that `keep` selects,
// in either case.
template <typename Keep>
constexpr LetterSet PrefixLetters(Keep keep, int from, int to) {
  LetterSet set{};
  for (const PrefixRow& row : kPrefixes) {
    if (!keep(row)) continue;
    for (int at = from; at <= to && at < LengthOf(row); at++) {
      const auto letter = static_cast<unsigned char>(row.fLetters[at]);
      set.fRows[letter] = true;
      set.fRows[letter - 'a' + 'A'] = true;
    }
  }
  return set;
}

constexpr bool AnyRow(const PrefixRow&) { return true; }
constexpr bool IsFormattedRow(const PrefixRow& row) { return (row.fFlags & kFormattedPrefix) != 0; }

// Letters that begin a prefix of some reading, and the second letters of two-letter ones.
inline constexpr LetterSet kPrefixFirstLetters = PrefixLetters(AnyRow, 0, 0);
inline constexpr LetterSet kPrefixSecondLetters = PrefixLetters(AnyRow, 1, 1);

// Letters that begin a prefix of the classic reading.
inline constexpr LetterSet kClassicFirstLetters = PrefixLetters(
    [](const PrefixRow& row) { return Accepts(row, StringRules::kClassic); }, 0, 0);

// Letters of the prefixes of formatted strings, of any reading.
inline constexpr LetterSet kFormattedLetters = PrefixLetters(IsFormattedRow, 0, 1);

// Letters that begin the prefix of a formatted string, by reading, oldest first.
template <StringRules rules>
constexpr LetterSet FormattedFirstLetters() {
  return PrefixLetters(
      [](const PrefixRow& row) { return IsFormattedRow(row) && Accepts(row, rules); }, 0, 0);
}
inline constexpr LetterSet kFormattedFirstLetters[] = {
    FormattedFirstLetters<StringRules::kClassic>(),
    FormattedFirstLetters<StringRules::kFormatted>(),
    FormattedFirstLetters<StringRules::kTemplates>(),
};
static_assert(sizeof(kFormattedFirstLetters) / sizeof(kFormattedFirstLetters[0]) == kReadingCount,
              "a row per reading");

// The one-letter prefixes of plain str literals that the classic reading knows: no bytes, no
// fields. Only these make a string expression of a line in the line classifier.
inline constexpr LetterSet kPlainStringLetters = PrefixLetters(
    [](const PrefixRow& row) {
      return LengthOf(row) == 1 && !(row.fFlags & (kBytesPrefix | kFormattedPrefix)) &&
             Accepts(row, StringRules::kClassic);
    },
    0, 0);

// False when no prefix of any reading and then a quote start at p, which holds a letter that
// begins prefixes: most names show it by their second or third byte. A cheap test before
// FindStringStart.
inline bool MayOpenPrefixedString(const char* p, const char* end) {
  if (end - p < 2) return false;
  if (IsQuote(Byte(p + 1))) return true;
  return end - p >= 3 && kPrefixSecondLetters.Has(Byte(p + 1)) && IsQuote(Byte(p + 2));
}

struct StringStart {
  const char* fQuote;  // the opening quote, or nullptr when no string starts
  uint8_t fFlags;      // PrefixFlag bits of the prefix
};

// Returns where the opening quote lies when an optional prefix that the rules accept, then a
// quote, start at p, with the prefix's flags; otherwise fQuote is nullptr.
StringStart FindStringStart(const char* p, const char* end, StringRules rules);

// True when a t-string starts at p, as the newest reading reads: there such a text is a string
// rather than a name.
bool StartsTemplateString(const char* p, const char* end);
