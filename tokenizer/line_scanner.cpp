// The line scanner. One pass, no allocation: tokens are reported as offsets into the logical
// line text, which holds every physical line of the logical line in one buffer.
#include "tokenizer/line_scanner.h"

#include <cstring>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/token_text.h"

namespace {

// Counts the backslashes in the run that ends just before `before`, going back no further
// than `from`.
int BackslashRun(const char* from, const char* before) {
  int count = 0;
  while (before > from && before[-1] == '\\') {
    before--;
    count++;
  }
  return count;
}

// Steps over a name: its first character, then every character that may continue it. ASCII
// needs no decoding, and no bounds check: the text buffer's zero padding is no name character.
// Inlined into the scanner's loop, whatever else calls it.
[[gnu::always_inline]] inline const char* ScanName(const char* p, const char* end) {
  p += StepOverChar(p, end);
  for (;;) {
    while (HasClass(Byte(p), kNameChar)) p++;
    if (p >= end || Byte(p) < 0x80 || !IsIdentifierChar(p, end)) return p;
    p += StepOverChar(p, end);
  }
}

bool IsNumberSuffixLetter(unsigned b) {
  switch (b) {
    case 'J': case 'j': case 'L': case 'l': case 'O': case 'o': case 'X': case 'x':
      return true;
    default:
      return false;
  }
}

}  // namespace

const char* ScanNameEnd(const char* p, const char* end) { return ScanName(p, end); }

const char* ScanNumber(const char* p, const char* end) {
  p++;  // a digit, or a dot before a digit
  for (; p < end; p++) {
    const unsigned b = Byte(p);
    if (b == '.' || IsHexDigit(b) || IsNumberSuffixLetter(b)) continue;
    if (b == '+' || b == '-') {
      if (p[-1] == 'e' || p[-1] == 'E') continue;
      break;
    }
    if (b == '_') {
      const unsigned before = Byte(p - 1);
      if (p + 1 < end && (IsHexDigit(before) || before == 'o' || before == 'O' || before == 'x' ||
                          before == 'X') &&
          IsHexDigit(Byte(p + 1)))
        continue;
      break;
    }
    break;
  }
  return p;
}

const char* ScanStringBody(ScanState* state, const ScanCursor* cursor, const char* from) {
  const char quote = state->fQuote;
  const char* end = cursor->fLineEnd;
  // Only quote bytes matter here, and strings (docstrings above all) are long: jump to each.
  for (const char* p = from; p < end; p++) {
    p = static_cast<const char*>(memchr(p, quote, static_cast<size_t>(end - p)));
    if (!p) break;
    const char* k = p;
    if (state->fTriple) {
      if (p - from < 2 || p[-1] != quote || p[-2] != quote) continue;
      k = p - 2;
    }
    if (k > from && (BackslashRun(from, k) & 1)) continue;  // an escaped quote
    state->fComplete = 1;
    return p + 1;
  }
  // No closing quote on this line.
  if (state->fTriple || end <= from || !IsLineBreak(Byte(end - 1))) {
    state->fComplete = 0;
    return end;
  }
  const char* terminator = end - 1;
  if (end - from >= 2 && end[-1] == '\n' && end[-2] == '\r') terminator = end - 2;
  if (BackslashRun(from, terminator) & 1) {  // backslash-newline inside a single-quoted string
    state->fComplete = 0;
    return end;
  }
  state->fTokenId = ERROR_TOKEN;  // unterminated: the terminator comes next as a newline
  state->fComplete = 1;
  return terminator;
}

void ScanNextToken(const OperatorTable* table, ScanState* state, ScanCursor* cursor) {
  const char* pos = cursor->fPos;
  const char* end = cursor->fLineEnd;
  if (pos == end) {
    cursor->fAtEnd = 1;
    return;
  }
  if (state->fTokenId == STRING_TOKEN && state->fComplete == 0) {
    // The line begins inside an open string; fStart stays on the line where it began.
    pos = ScanStringBody(state, cursor, pos);
  } else {
    pos = SkipSpaces(pos);
    while (IsBlank(Byte(pos))) pos++;  // stops at the text buffer's zero padding at the latest
    if (pos == end) {
      cursor->fPos = end;
      cursor->fAtEnd = 1;
      return;
    }
    const OperatorEntry* row = nullptr;
    state->fTokenId = TokenIdForStart(table, pos, end, &row);
    state->fStart = OffsetOf(cursor, pos);
    state->fComplete = 1;
    switch (state->fTokenId) {
      case NAME_TOKEN:
        pos = ScanName(pos, end);
        break;
      case NUMBER_TOKEN:
        pos = ScanNumber(pos, end);
        break;
      case STRING_TOKEN: {
        // The classic reading's prefixes start strings here; one that a later reading drops
        // is a name there, which the string follows as a token of its own.
        const char* body = ScanStringStart(pos, end, state, cursor->fRules);
        if (body) {
          pos = ScanStringBody(state, cursor, body);
        } else {
          state->fTokenId = NAME_TOKEN;
          pos = ScanNameEnd(pos, end);
        }
        break;
      }
      case NEWLINE_TOKEN:
        // CR LF counts once: a lone CR also ends a line.
        pos += (*pos == '\r' && pos + 1 < end && pos[1] == '\n') ? 2 : 1;
        break;
      case ERROR_TOKEN:
        pos += StepOverChar(pos, end);
        break;
      case COMMENT_TOKEN:
        pos = end;  // the comment keeps its line terminator; no newline token follows
        break;
      default:  // an operator of 1 to 3 bytes: its row was found with its id
        pos += row->fSpelling[1] == '\0' ? 1 : row->fSpelling[2] == '\0' ? 2 : 3;
        break;
    }
  }
  cursor->fPos = pos;  // every step stops at the line's end at the latest
  if (state->fComplete == 1 || pos == end) state->fEnd = OffsetOf(cursor, pos);
}
