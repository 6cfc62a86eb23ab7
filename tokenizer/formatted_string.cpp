// The formatted string scanner. A string's literal parts and its fields alternate; each step
// below scans one of them until the mode changes, so that nesting, however deep, takes no C
// stack: the strings open inside one another are rows of a fixed array.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/formatted_string.h"

#include <cstring>
#include <string_view>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/token_text.h"

namespace {

// What a step of the scan found.
enum class Outcome : uint8_t {
  kGoOn,    // the mode changed; the next step goes on from the position
  kClosed,  // the innermost string's closing quote ends at the position
  kRunsOn,  // the line ended with the token still open
  kEnded,   // the token ends at the position as an error token
};

struct Step {
  const char* fPos;
  Outcome fOutcome;
};

FormattedLevel* Innermost(FormattedStrings* strings) {
  return &strings->fLevels[strings->fDepth - 1];
}

// Where the line's terminator begins (CR LF counts once), or its end when it has none.
const char* TerminatorOf(const char* lineStart, const char* end) {
  if (end > lineStart && end[-1] == '\n')
    return end - lineStart >= 2 && end[-2] == '\r' ? end - 2 : end - 1;
  return end > lineStart && end[-1] == '\r' ? end - 1 : end;
}

// True when b may begin the prefix of a formatted string that the rules read.
bool MayOpenFormatted(unsigned b, StringRules rules) {
  return kFormattedFirstLetters[static_cast<int>(rules)].Has(b);
}

uint8_t WordOf(const char* p, const char* q) {
  const std::string_view word(p, static_cast<size_t>(q - p));
  return word == "if" ? kIfWord : word == "for" ? kForWord : word == "else" ? kElseWord : 0;
}

// Notes a token of a field from p to q, and its word, for the statement rules of the line.
void NoteFieldToken(FormattedStrings* strings, const ScanCursor* cursor, const char* p,
                    const char* q, uint8_t word) {
  if (strings->fLineBeganInField) {
    if (strings->fFirstStart < 0) {
      strings->fFirstStart = OffsetOf(cursor, p);
      strings->fFirstEnd = OffsetOf(cursor, q);
      strings->fWordsBeforeFirst = strings->fWords;
    } else {
      if (!strings->fSecondNoted) {
        const std::string_view second(p, static_cast<size_t>(q - p));
        strings->fImportAfterFirst = second == "import" || second == "from";
        strings->fSecondNoted = 1;
      }
      if (word == kElseWord) strings->fElseAfterFirst = 1;
    }
  }
  strings->fWords |= word;
}

// Opens the string whose quote the prefix scan found: a formatted one becomes the innermost
// level, a plain one is scanned as plain strings are until it closes.
Step OpenString(FormattedStrings* strings, StringStart string, const char* end,
                const char* terminator) {
  const char quote = *string.fQuote;
  // Three quotes count as triple only when all three lie on the line.
  const bool triple = end - string.fQuote >= 3 && string.fQuote[1] == quote &&
                      string.fQuote[2] == quote;
  const char* body = string.fQuote + (triple ? 3 : 1);
  if (!(string.fFlags & kFormattedPrefix)) {
    strings->fPlainQuote = quote;
    strings->fPlainTriple = triple;
    return {body, Outcome::kGoOn};
  }
  if (strings->fDepth == kFormattedDepthLimit) return {terminator, Outcome::kEnded};
  strings->fLevels[strings->fDepth++] = FormattedLevel{
      .fQuote = quote,
      .fTriple = triple,
      .fRaw = (string.fFlags & kRawPrefix) != 0,
      .fInField = 0,
      .fInSpec = 0,
      .fNamedEscape = 0,
      .fBrackets = 0,
      .fFieldDepth = -1,
  };
  return {body, Outcome::kGoOn};
}

// Steps over a backslash in a literal part and what it escapes; returns the last byte taken.
const char* StepOverEscape(FormattedLevel* level, const char* p, const char* end) {
  const char* next = p + 1;
  if (next < end && *next == '\r') next++;
  if (next >= end) return end - 1;
  if (*next == '{' || *next == '}') return next - 1;  // the brace still opens or closes a field
  if (!level->fRaw && *next == 'N' && next + 1 < end && next[1] == '{') {
    level->fNamedEscape = 1;  // "\N{NAME}" names a character: its "}" closes no field
    return next + 1;
  }
  return next;  // a quote, a line break or any other byte, taken as it is
}

// A literal part or a format spec of the innermost string, from p to its closing quote, the
// brace of a field, or the line's end.
Step ScanLiteral(FormattedLevel* level, const char* p, const char* end, const char* terminator) {
  const char quote = level->fQuote;
  for (; p < end; p++) {
    const char c = *p;
    if (c == quote) {
      if (!level->fTriple) return {p + 1, Outcome::kClosed};
      if (end - p >= 3 && p[1] == quote && p[2] == quote) return {p + 3, Outcome::kClosed};
      continue;
    }
    // In a format spec every brace belongs to a field, doubled or not.
    const bool inSpec = level->fInSpec && level->fFieldDepth >= 0;
    switch (c) {
      case '{':
        level->fNamedEscape = 0;
        if (!inSpec && p + 1 < end && p[1] == '{') {
          p++;  // "{{" is a brace of the text
          continue;
        }
        level->fFieldDepth++;  // the field scan counts the brace itself
        level->fInField = 1;
        level->fInSpec = 0;
        return {p, Outcome::kGoOn};
      case '}':
        if (level->fNamedEscape) {
          level->fNamedEscape = 0;
          continue;
        }
        if (level->fBrackets == 0) {
          if (!inSpec && p + 1 < end && p[1] == '}') p++;  // "}}" is a brace of the text
          continue;  // a lone one closes nothing: the interpreter refuses it
        }
        level->fInField = 1;  // it closes the field the format spec belongs to
        level->fInSpec = 0;
        return {p, Outcome::kGoOn};
      case '\\':
        p = StepOverEscape(level, p, end);
        continue;
      case '\n':
      case '\r':
        if (p < terminator) continue;  // a lone CR within the line
        if (!level->fTriple) return {p, Outcome::kEnded};  // unterminated, as a plain string
        if (inSpec) {  // a line break ends a format spec: the field's expression goes on
          level->fInField = 1;
          level->fInSpec = 0;
          return {p, Outcome::kGoOn};
        }
        continue;
      default:
        continue;
    }
  }
  return {end, Outcome::kRunsOn};
}

// Steps over the operator or stray character at p in a field, keeping the field's brackets;
// returns the step that a brace closing the field or a format spec's colon makes.
Step ScanFieldOperator(FormattedLevel* level, const char* p, const char* end) {
  switch (*p) {
    case '(':
    case '[':
    case '{':
      level->fBrackets++;
      return {p + 1, Outcome::kGoOn};
    case ')':
    case ']':
      level->fBrackets--;
      return {p + 1, Outcome::kGoOn};
    case '}':
      if (--level->fBrackets == level->fFieldDepth) {
        level->fFieldDepth--;
        level->fInField = 0;
        level->fInSpec = 0;
      }
      return {p + 1, Outcome::kGoOn};
    case ':':
      // Only at the field's own depth: a slice, a dict or a lambda in brackets keeps its colon.
      // ":=" there is a format spec that begins with "=", as the interpreter reads it.
      if (level->fBrackets - 1 == level->fFieldDepth) {
        level->fInField = 0;
        level->fInSpec = 1;
      }
      return {p + 1, Outcome::kGoOn};
    default:
      return {p + StepOverChar(p, end), Outcome::kGoOn};
  }
}

// A field's expression in the innermost string, from p: tokens until the field closes, its
// format spec begins, a string opens, or the line ends. Comments and line breaks are allowed.
Step ScanField(FormattedStrings* strings, const ScanCursor* cursor, const char* p,
               const char* terminator) {
  FormattedLevel* level = Innermost(strings);
  const char* end = cursor->fLineEnd;
  for (;;) {
    p = SkipSpaces(p);
    while (IsBlank(Byte(p))) p++;  // stops at the zero byte after the text at the latest
    if (p >= end) return {end, Outcome::kRunsOn};
    const unsigned b = Byte(p);
    if (IsLineBreak(b)) {
      p++;
      continue;
    }
    if (b == '#') return {end, Outcome::kRunsOn};  // the comment takes the rest of the line
    if (IsQuote(b) || kPrefixFirstLetters.Has(b)) {
      const StringStart string = FindStringStart(p, end, strings->fRules);
      if (string.fQuote) {
        NoteFieldToken(strings, cursor, p, string.fQuote + 1, 0);
        return OpenString(strings, string, end, terminator);
      }
    }
    const char* q = nullptr;
    if (HasClass(b, kAsciiLetter) || b == '_' || (b >= 0x80 && IsIdentifierStart(p, end))) {
      q = ScanNameEnd(p, end);
      NoteFieldToken(strings, cursor, p, q, WordOf(p, q));
    } else if (IsAsciiDigit(b) || (b == '.' && p + 1 < end && IsAsciiDigit(Byte(p + 1)))) {
      q = ScanNumber(p, end);
      NoteFieldToken(strings, cursor, p, q, 0);
    } else {
      const Step step = ScanFieldOperator(level, p, end);
      NoteFieldToken(strings, cursor, p, step.fPos, 0);
      if (!level->fInField) return step;
      q = step.fPos;
    }
    p = q;
  }
}

// A plain string opened in a field, from p: scanned as every plain string is.
Step ScanPlainString(FormattedStrings* strings, const ScanCursor* cursor, const char* p) {
  ScanState plain = kFreshScan;
  plain.fTokenId = STRING_TOKEN;
  plain.fQuote = strings->fPlainQuote;
  plain.fTriple = strings->fPlainTriple;
  p = ScanStringBody(&plain, cursor, p);
  if (plain.fTokenId == ERROR_TOKEN) return {p, Outcome::kEnded};  // unterminated at the line end
  if (!plain.fComplete) return {cursor->fLineEnd, Outcome::kRunsOn};
  strings->fPlainQuote = 0;
  return {p, Outcome::kGoOn};
}

// Scans the open formatted string from p to its closing quote or the end of the line; returns
// where the token ends on this line, with fComplete set, or fTokenId ERROR_TOKEN for a token
// that ends unterminated: a single-quoted literal or plain string that meets the line's end,
// or a string nested deeper than the limit.
const char* ScanFormattedBody(FormattedStrings* strings, ScanState* state,
                              const ScanCursor* cursor, const char* p) {
  const char* end = cursor->fLineEnd;
  const char* terminator = TerminatorOf(cursor->fLineStart, end);
  for (;;) {
    const Step step = strings->fPlainQuote           ? ScanPlainString(strings, cursor, p)
                      : Innermost(strings)->fInField ? ScanField(strings, cursor, p, terminator)
                                                     : ScanLiteral(Innermost(strings), p, end,
                                                                   terminator);
    p = step.fPos;
    switch (step.fOutcome) {
      case Outcome::kGoOn:
        continue;
      case Outcome::kClosed:
        if (--strings->fDepth > 0) continue;  // back in the field of the string around it
        state->fComplete = 1;
        return p;
      case Outcome::kRunsOn:
        state->fComplete = 0;
        return end;
      case Outcome::kEnded:
        state->fTokenId = ERROR_TOKEN;
        state->fComplete = 1;
        strings->fDepth = 0;
        strings->fPlainQuote = 0;
        return p;
    }
  }
}

// Reports the token's end on the line as ScanNextToken does; returns it.
const char* FinishToken(ScanState* state, const ScanCursor* cursor, const char* pos) {
  if (state->fComplete == 1 || pos == cursor->fLineEnd) state->fEnd = OffsetOf(cursor, pos);
  return pos;
}

}  // namespace

void ResetFormattedStrings(FormattedStrings* strings, StringRules rules) {
  strings->fRules = rules;
  strings->fDepth = 0;
  strings->fPlainQuote = 0;
  strings->fLineBeganInField = 0;
  strings->fFirstStart = -1;
}

void BeginFormattedLine(FormattedStrings* strings, const ScanState* state) {
  strings->fLineBeganInField = state->fTokenId == STRING_TOKEN && state->fComplete == 0 &&
                               strings->fDepth > 0 && !strings->fPlainQuote &&
                               Innermost(strings)->fInField;
  strings->fFirstStart = -1;
  strings->fFirstEnd = -1;
  strings->fElseAfterFirst = 0;
  strings->fSecondNoted = 0;
  strings->fImportAfterFirst = 0;
}

// Kept out of the classic reading's loop, which only tests for a stack to call it with.
[[gnu::noinline]] const char* ScanFormattedToken(ScanState* state, ScanCursor cursor,
                                                 FormattedStrings* strings) {
  const char* pos = cursor.fPos;
  const char* end = cursor.fLineEnd;
  if (state->fTokenId == STRING_TOKEN && state->fComplete == 0) {
    // The line begins inside an open string; fStart stays on the line where it began.
    if (strings->fDepth == 0 || pos == end) return nullptr;
    return FinishToken(state, &cursor, ScanFormattedBody(strings, state, &cursor, pos));
  }
  const char* start = SkipSpaces(pos);
  while (IsBlank(Byte(start))) start++;
  if (start < end && MayOpenFormatted(Byte(start), strings->fRules)) {
    const StringStart string = FindStringStart(start, end, strings->fRules);
    if (string.fQuote && (string.fFlags & kFormattedPrefix)) {
      state->fTokenId = STRING_TOKEN;
      state->fStart = OffsetOf(&cursor, start);
      state->fComplete = 1;
      strings->fDepth = 0;
      strings->fPlainQuote = 0;
      strings->fWords = 0;
      const Step opened = OpenString(strings, string, end, end);  // the first is never too deep
      return FinishToken(state, &cursor, ScanFormattedBody(strings, state, &cursor, opened.fPos));
    }
  }
  return nullptr;
}
