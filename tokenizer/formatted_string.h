// Formatted strings (f-strings, and t-strings where the reading knows them) as read since their
// fields nest: one token from the prefix to the closing quote, whose fields hold any expression,
// strings of the string's own quote, comments and line breaks included. The strings open inside
// one another, from the token's outermost, are a bounded stack that runs on from one physical
// line to the next, as an open string does in the ScanState.
#pragma once

#include <cstdint>
#include <initializer_list>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/line_scanner.h"
#include "tokenizer/string_prefixes.h"

// The interpreter reads no more formatted strings than this inside one another; a deeper one
// ends the token as an error token.
constexpr int kFormattedDepthLimit = 149;

// One formatted string of those open inside one another.
struct FormattedLevel {
  char fQuote;
  uint8_t fTriple;
  uint8_t fRaw;
  uint8_t fInField;      // 1 in a field's expression; 0 in a literal part or a format spec
  uint8_t fInSpec;       // 1 from a field's ":" until that field, or one nested in it, closes
  uint8_t fNamedEscape;  // 1 after "\N{" in a literal part: the next "}" ends the name
  int fBrackets;         // brackets open in the fields, the fields' own braces included
  int fFieldDepth;       // fBrackets outside the innermost open field's brace; -1 outside fields
};

// Words of a field that the statement rules of a line look for.
enum FieldWord : uint8_t { kIfWord = 1, kForWord = 2, kElseWord = 4 };

struct FormattedStrings {
  StringRules fRules;
  int fDepth;                 // strings open inside one another; 0 when none is
  char fPlainQuote;           // a plain string open in the innermost field, or 0
  uint8_t fPlainTriple;
  // What the statement rules need of a physical line that begins inside a field.
  uint8_t fLineBeganInField;  // 1 when the line began inside a field of a string running on
  uint8_t fWords;             // FieldWord bits of the outermost string's fields so far
  uint8_t fWordsBeforeFirst;  // fWords before the line's first field token
  uint8_t fElseAfterFirst;    // 1 when an "else" follows that token on the line
  uint8_t fSecondNoted;       // 1 once a second field token was noted on the line
  uint8_t fImportAfterFirst;  // 1 when that second token is "import" or "from"
  int fFirstStart;            // offsets of the line's first field token; -1 while none
  int fFirstEnd;
  FormattedLevel fLevels[kFormattedDepthLimit];
};

// Empties the stack for a logical line read under the rules.
void ResetFormattedStrings(FormattedStrings* strings, StringRules rules);

// Notes, before a physical line is scanned, whether it begins inside a field.
void BeginFormattedLine(FormattedStrings* strings, const ScanState* state);

// False when no formatted string can begin at p, after a blank, nor run on: a quick test that
// spares most tokens the call of ScanFormattedToken. The zero byte after the text ends it, so
// that a letter is never its last byte.
inline bool MayScanFormatted(const ScanState* state, const char* p) {
  if (state->fComplete == 0) return true;  // a string runs on, or no token was scanned yet
  if (*p == ' ') p++;
  if (IsBlank(Byte(p))) return true;  // more blanks: the call skips them
  if (!kFormattedLetters.Has(Byte(p))) return false;
  return IsQuote(Byte(p + 1)) || (kFormattedLetters.Has(Byte(p + 1)) && IsQuote(Byte(p + 2)));
}

// Scans the next token as ScanNextToken does when it is a formatted string, or one that runs
// on from the line before, and returns where the cursor goes on; returns nullptr, with nothing
// changed, for every other token, which ScanNextToken scans as the classic reading does.
const char* ScanFormattedToken(ScanState* state, ScanCursor cursor, FormattedStrings* strings);
