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

// What a first byte can begin. The rule tries, in order, a string, a name, a line break, a
// number, a comment and an operator; the class of the byte says which of them can hold.
enum class Start : uint8_t {
  kName,          // a letter that no string prefix begins with, or "_"
  kNameOrString,  // r, b, u, f in either case: a string when a quote follows the prefix
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
  if (HasClass(b, kPrefixLetter)) return Start::kNameOrString;
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
constexpr StartTable kStarts;

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

int TokenIdForStart(const OperatorTable* table, const char* p, const char* end,
                    const OperatorEntry** row) {
  if (p >= end) return ERROR_TOKEN;
  switch (kStarts.fRows[Byte(p)]) {
    case Start::kName:
      return NAME_TOKEN;
    case Start::kNameOrString: {
      ScanState scratch = kFreshScan;
      return ScanStringStart(p, end, &scratch) ? STRING_TOKEN : NAME_TOKEN;
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
