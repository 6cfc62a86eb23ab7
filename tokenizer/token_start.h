// Token starts: which kind of token begins at a position, and the string start recogniser
// that this rule and the line scanner share.
#pragma once

#include <cstdint>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/string_prefixes.h"

// The scanner's result and carry-over record.
struct ScanState {
  int fTokenId;   // id of the current token; 0 before the first
  int fStart;     // offset of its first byte in the logical line text; -1 before the first
  int fEnd;       // offset one past its last byte
  int fComplete;  // 0 while a string literal runs on into the next physical line
  char fQuote;    // quote character of the current string token
  int fTriple;    // 1 when the current string token is triple-quoted
};

// The state before a logical line's first token.
constexpr ScanState kFreshScan = {
    .fTokenId = 0, .fStart = -1, .fEnd = -1, .fComplete = 0, .fQuote = 0, .fTriple = 0};

// Returns the position just after the opening quote(s) when an optional prefix that the rules
// accept and a quote start at p, writing STRING_TOKEN, the quote and the triple flag;
// otherwise writes ERROR_TOKEN and returns nullptr.
const char* ScanStringStart(const char* p, const char* end, ScanState* state, StringRules rules);

// What a first byte can begin. The rule tries, in order, a string, a name, a line break, a
// number, a comment and an operator; the class of the byte says which of them can hold.
enum class Start : uint8_t {
  kName,          // a letter that no string prefix begins with, or "_"
  kNameOrString,  // a letter that begins a classic prefix: a string when a quote follows it
  kString,        // a quote
  kNumber,        // an ASCII digit
  kDot,           // a number when a digit follows, else an operator
  kComment,       // "#"
  kLineBreak,     // LF, CR
  kNonAscii,      // a name when the character is a letter, else an error
  kOther,         // an operator, or an error when no operator begins here
};

constexpr Start StartOf(unsigned b) {
  if (b >= 0x80) return Start::kNonAscii;
  if (HasClass(b, kQuote)) return Start::kString;
  if (kClassicFirstLetters.Has(b)) return Start::kNameOrString;
  if (HasClass(b, kAsciiLetter) || b == '_') return Start::kName;
  if (HasClass(b, kAsciiDigit)) return Start::kNumber;
  if (HasClass(b, kLineBreak)) return Start::kLineBreak;
  if (b == '.') return Start::kDot;
  if (b == '#') return Start::kComment;
  return Start::kOther;
}

struct StartTable {
  Start fRows[256];
  constexpr StartTable() : fRows() {
    for (unsigned b = 0; b < 256; b++) fRows[b] = StartOf(b);
  }
};
inline constexpr StartTable kStarts;

// Returns the id of the token that begins at p in [p, end), with the string prefixes of the
// classic reading. Never fails. For an operator, the row found is stored in *row when row is
// given. Inline: the scanner asks it of every token.
inline int TokenIdForStart(const OperatorTable* table, const char* p, const char* end,
                           const OperatorEntry** row = nullptr) {
  if (p >= end) return ERROR_TOKEN;
  switch (kStarts.fRows[Byte(p)]) {
    case Start::kName:
      return NAME_TOKEN;
    case Start::kNameOrString: {
      if (!MayOpenPrefixedString(p, end)) return NAME_TOKEN;
      ScanState scratch = kFreshScan;
      return ScanStringStart(p, end, &scratch, StringRules::kClassic) ? STRING_TOKEN : NAME_TOKEN;
    }
    case Start::kString:
      return STRING_TOKEN;
    case Start::kNumber:
      return NUMBER_TOKEN;
    case Start::kComment:
      return COMMENT_TOKEN;
    case Start::kLineBreak:
      return NEWLINE_TOKEN;
    case Start::kNonAscii:
      return IsIdentifierStart(p, end) ? NAME_TOKEN : ERROR_TOKEN;
    case Start::kDot:
      if (p + 1 < end && IsAsciiDigit(Byte(p + 1))) return NUMBER_TOKEN;
      break;
    case Start::kOther:
      break;
  }
  const OperatorEntry* found = FindOperator(table, p, end);
  if (row) *row = found;
  return found ? found->fId : ERROR_TOKEN;
}
