// The logical line builder. Brackets, trailing backslashes and open strings keep a logical
// line open; a physical line that looks like the start of a new statement ends it early, so
// that half-typed code does not swallow the rest of the file.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_builder.h"

#include <climits>
#include <cstdint>
#include <string_view>

#include "assembly/source_reader.h"
#include "assembly/token_list.h"
#include "core/token_ids.h"
#include "tokenizer/token_text.h"

namespace {

// Words that always start a new statement; searched word by word for an exact match.
constexpr std::string_view kStatementKeywords[] = {
    "assert", "break", "class", "continue", "def", "del", "elif", "except", "exec",
    "finally", "from", "global", "import", "pass", "raise", "return", "try", "while",
};

// A line starting with "if" continues a logical line that holds this many tokens with its own
// included; one starting with "else" continues a logical line that holds this many before it.
constexpr int kIfContinuesFromTokens = 50;
constexpr int kElseContinuesAfterTokens = 50;

TokenText TextOf(const ReadingState* state, int i) { return TokenText(state->fTokenArray[i]); }

bool IsStatementKeyword(const TokenText& text) {
  for (std::string_view word : kStatementKeywords) {
    if (text.Is(word)) return true;
  }
  return false;
}

bool LastTokenIsTrailingBackslash(const ReadingState* state) {
  const int last = state->fTokenCount - 1;
  return TextOf(state, last).At(0) == '\\' &&
         state->fTokenPositions[last].fLine == state->fLineIndex;
}

bool AnyTokenIs(const ReadingState* state, int from, int to, std::string_view word) {
  for (int i = from; i < to; i++) {
    if (TextOf(state, i).Is(word)) return true;
  }
  return false;
}

bool IsLineOpen(const ReadingState* state) {
  // Only an open string counts here: a first line of blanks without a line break scans
  // nothing and must stay a blank line rather than swallow the next one.
  if (state->fScan.fComplete == 0 && state->fScan.fTokenId == STRING_TOKEN) return true;
  if (state->fTokenCount == 0) return false;
  if (LastTokenIsTrailingBackslash(state)) return true;
  return state->fNesting > 0;
}

bool StartsNewStatement(const ReadingState* state, int k, int depthBefore) {
  const TokenText first = TextOf(state, k);
  if (first.At(0) == '@') return true;
  if (depthBefore <= 0) {
    if (k > 0 && TextOf(state, k - 1).At(0) == '\\') return false;
    if (first.Is("for")) return true;
  }
  if (first.Is("if")) {
    if (state->fTokenCount >= kIfContinuesFromTokens) return false;
    if (LastTokenIsTrailingBackslash(state)) return false;
    if (state->fNesting > 0) return false;
    if (AnyTokenIs(state, k + 1, state->fTokenCount, "else")) return false;  // a conditional
    if (AnyTokenIs(state, 0, k, "for")) return false;                        // a comprehension
    return true;
  }
  if (first.Is("else")) {
    if (k >= kElseContinuesAfterTokens) return false;
    if (k == 0) return true;
    return !AnyTokenIs(state, 0, k, "if");  // a conditional expression
  }
  return IsStatementKeyword(first);
}

// The first token inside a field of a formatted string that runs on from the line before, tested
// as the first token of a line inside brackets is. The string's fields count as tokens of the
// line: the "if" of a conditional expression may stand in one, and its "else" in another.
bool FieldLineStartsStatement(const ReadingState* state, int k) {
  const FormattedStrings& strings = state->fStrings;
  if (strings.fFirstStart < 0) return false;  // blank, or only a comment
  const TokenText first(state->fText.fData + strings.fFirstStart,
                        strings.fFirstEnd - strings.fFirstStart);
  if (first.At(0) == '@') return true;
  if (first.Is("if")) {
    if (state->fTokenCount >= kIfContinuesFromTokens) return false;
    const bool stillOpen = state->fScan.fComplete == 0 && state->fScan.fTokenId == STRING_TOKEN;
    if (stillOpen || state->fNesting > 0) return false;
    if (strings.fElseAfterFirst || AnyTokenIs(state, k, state->fTokenCount, "else")) return false;
    return !(strings.fWordsBeforeFirst & kForWord) && !AnyTokenIs(state, 0, k, "for");
  }
  if (first.Is("else")) {
    if (k >= kElseContinuesAfterTokens) return false;
    return !(strings.fWordsBeforeFirst & kIfWord) && !AnyTokenIs(state, 0, k, "if");
  }
  return IsStatementKeyword(first);
}

// Whether the physical line just tokenized, whose first token is at index k, begins a new
// logical line.
bool LineStartsStatement(const ReadingState* state, int k, int depthBefore) {
  if (state->fStrings.fLineBeganInField) return FieldLineStartsStatement(state, k);
  return state->fTokenCount > k && StartsNewStatement(state, k, depthBefore);
}

// Moves the physical line at lineStart back into the pending line, which is always empty
// here: the reader has just taken from it. `before` is the scanner's state before the line.
int HandBack(ReadingState* state, int lineStart, int k, const ScanState& before) {
  TruncateTokens(state, k);
  if (AppendBytes(&state->fPending, state->fText.fData + lineStart,
                  state->fText.fLength - static_cast<size_t>(lineStart)) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  TruncateText(&state->fText, static_cast<size_t>(lineStart));
  state->fPendingOffset = state->fLineOffset;
  if (state->fStrings.fLineBeganInField) {
    state->fScan = before;  // the string ends before the line, as an error token
  } else {
    state->fScan.fComplete = 1;  // a string opened by the handed-back line is not ours
  }
  return 0;
}

// Reads the logical line's physical lines. Returns 0 with *open set, or -1.
int ReadPhysicalLines(ReadingState* state, int* open, int64_t* offset) {
  if (ReadSourceLine(state) != 0 || TokenizePhysicalLine(state, 0) != 0) return -1;
  *offset = state->fLineOffset;
  state->fLineNumber++;
  *open = IsLineOpen(state);
  while (!state->fAtEnd && *open) {
    const int lineStart = TextLength(state);
    const int depthBefore = state->fNesting;
    const int k = state->fTokenCount;
    const ScanState before = state->fScan;
    if (ReadSourceLine(state) != 0) return -1;
    if (state->fAtEnd) break;  // this read is not counted
    state->fLineIndex++;
    if (TokenizePhysicalLine(state, lineStart) != 0) return -1;
    if (LineStartsStatement(state, k, depthBefore))
      return HandBack(state, lineStart, k, before);  // stays open: the line is incomplete
    state->fLineNumber++;
    *open = IsLineOpen(state);
  }
  return 0;
}

}  // namespace

int BuildLogicalLine(ReadingState* state, LineParts* parts) {
  StartLogicalLine(state);
  const int64_t firstLine = state->fLineNumber;
  int open = 0;
  int64_t offset = 0;
  if (ReadPhysicalLines(state, &open, &offset) != 0) return -1;
  if (state->fScan.fStart != -1 && state->fScan.fComplete == 0) {  // input ended inside a string
    if (AppendUnfinishedString(state) != 0) return -1;
    open = 1;
  }
  if (state->fTokenCount == 0 ||
      (state->fOptions.fSkipWhitespaceLines && state->fSignificantCount == 0))
    return 0;
  const int64_t lineCount = state->fLineNumber - firstLine;
  if (firstLine > INT_MAX || lineCount > INT_MAX) {
    PyErr_SetString(PyExc_OverflowError, "Line number does not fit in 32 bits");
    return -1;
  }
  const bool withText = state->fOptions.fIncludeLineText;
  *parts = LineParts{.fIndentLevel = state->fIndent,
                     .fFirstLine = static_cast<int>(firstLine),
                     .fLineCount = static_cast<int>(lineCount),
                     .fTokens = state->fTokenArray,
                     .fPositions = state->fTokenPositions,
                     .fTokenCount = state->fTokenCount,
                     .fSpacesInIndent = state->fSpacesInIndent,
                     .fTabsInIndent = state->fTabsInIndent,
                     .fIncomplete = open,
                     .fLineText = withText ? state->fText.fData : nullptr,
                     .fLineTextLength = withText ? state->fText.fLength : 0,
                     .fOffset = offset};
  return 1;
}
