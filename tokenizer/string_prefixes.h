// String prefixes under the interpreter versions a parser may read as: which prefixes start a
// string, and which of them make it raw or formatted (its fields nest since 3.12).
#pragma once

#include <cstdint>

// How strings are read. Each reading accepts what the ones before it do.
enum class StringRules : uint8_t {
  kClassic,    // as 3.10 and 3.11 read: an f-string ends at its first unescaped quote
  kFormatted,  // as 3.12 and 3.13 read: an f-string's fields hold any expression, nested strings
  kTemplates,  // as 3.14 reads: t-strings too, with the grammar of f-strings
};

enum PrefixFlag : uint8_t {
  kRawPrefix = 1,        // backslashes escape nothing but a quote, and "\N{" names nothing
  kFormattedPrefix = 2,  // braces open fields
};

struct StringStart {
  const char* fQuote;  // the opening quote, or nullptr when no string starts
  uint8_t fFlags;      // PrefixFlag bits of the prefix
};

// Returns where the opening quote lies when an optional prefix that the rules accept, then a
// quote, start at p, with the prefix's flags; otherwise fQuote is nullptr.
StringStart FindStringStart(const char* p, const char* end, StringRules rules);

// True when a string whose prefix holds a letter t starts at p: under the rules that know
// t-strings, such a text is a string rather than a name.
bool StartsTemplateString(const char* p, const char* end);
