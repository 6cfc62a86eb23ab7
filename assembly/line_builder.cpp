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

TokenText TextOf(const LineTokens& tokens, int i) { return TokenText(tokens.fTokenArray[i]); }

bool IsStatementKeyword(const TokenText& text) {
  for (std::string_view word : kStatementKeywords) {
    if (text.Is(word)) return true;
  }
  return false;
}

bool IsImportWord(const TokenText& text) { return text.Is("import") || text.Is("from"); }

bool LastTokenIsTrailingBackslash(const ReadingState* state) {
  const LineTokens& tokens = state->fTokens;
  const int last = tokens.fTokenCount - 1;
  return TextOf(tokens, last).At(0) == '\\' &&
         tokens.fTokenPositions[last].fLine == state->fLineIndex;
}

bool AnyTokenIs(const LineTokens& tokens, int from, int to, std::string_view word) {
  for (int i = from; i < to; i++) {
    if (TextOf(tokens, i).Is(word)) return true;
  }
  return false;
}

bool StringRunsOn(const LineTokens& tokens) {
  return tokens.fScan.fComplete == 0 && tokens.fScan.fTokenId == STRING_TOKEN;
}

bool IsLineOpen(const ReadingState* state) {
  // Only an open string counts here: a first line of blanks without a line break scans
  // nothing and must stay a blank line rather than swallow the next one.
  if (StringRunsOn(state->fTokens)) return true;
  if (state->fTokens.fTokenCount == 0) return false;
  if (LastTokenIsTrailingBackslash(state)) return true;
  return state->fTokens.fNesting > 0;
}

bool StartsNewStatement(const ReadingState* state, int k, int depthBefore) {
  const LineTokens& tokens = state->fTokens;
  const TokenText first = TextOf(tokens, k);
  if (first.At(0) == '@') return true;
  if (depthBefore <= 0) {
    if (k > 0 && TextOf(tokens, k - 1).At(0) == '\\') return false;
    if (first.Is("for")) return true;
  }
  if (first.Is("if")) {
    if (tokens.fTokenCount >= kIfContinuesFromTokens) return false;
    if (LastTokenIsTrailingBackslash(state)) return false;
    if (tokens.fNesting > 0) return false;
    if (AnyTokenIs(tokens, k + 1, tokens.fTokenCount, "else")) return false;  // a conditional
    if (AnyTokenIs(tokens, 0, k, "for")) return false;                        // a comprehension
    return true;
  }
  if (first.Is("else")) {
    if (k >= kElseContinuesAfterTokens) return false;
    if (k == 0) return true;
    return !AnyTokenIs(tokens, 0, k, "if");  // a conditional expression
  }
  if (state->fOptions.fLazyImports && first.Is("lazy"))  // "lazy import", "lazy from"
    return k + 1 < tokens.fTokenCount && IsImportWord(TextOf(tokens, k + 1));
  return IsStatementKeyword(first);
}

// The first token inside a field of a formatted string that runs on from the line before, tested
// as the first token of a line inside brackets is. The string's fields count as tokens of the
// line: the "if" of a conditional expression may stand in one, and its "else" in another.
bool FieldLineStartsStatement(const ReadingState* state, int k) {
  const LineTokens& tokens = state->fTokens;
  const FormattedStrings& strings = tokens.fStrings;
  if (strings.fFirstStart < 0) return false;  // blank, or only a comment
  const TokenText first(state->fSource.fText.fData + strings.fFirstStart,
                        strings.fFirstEnd - strings.fFirstStart);
  if (first.At(0) == '@') return true;
  if (first.Is("if")) {
    if (tokens.fTokenCount >= kIfContinuesFromTokens) return false;
    if (StringRunsOn(tokens) || tokens.fNesting > 0) return false;
    if (strings.fElseAfterFirst || AnyTokenIs(tokens, k, tokens.fTokenCount, "else")) return false;
    return !(strings.fWordsBeforeFirst & kForWord) && !AnyTokenIs(tokens, 0, k, "for");
  }
  if (first.Is("else")) {
    if (k >= kElseContinuesAfterTokens) return false;
    return !(strings.fWordsBeforeFirst & kIfWord) && !AnyTokenIs(tokens, 0, k, "if");
  }
  if (state->fOptions.fLazyImports && first.Is("lazy")) return strings.fImportAfterFirst;
  return IsStatementKeyword(first);
}

// Whether the physical line just tokenized, whose first token is at index k, begins a new
// logical line.
bool LineStartsStatement(const ReadingState* state, int k, int depthBefore) {
  if (state->fTokens.fStrings.fLineBeganInField) return FieldLineStartsStatement(state, k);
  return state->fTokens.fTokenCount > k && StartsNewStatement(state, k, depthBefore);
}

// Reads the logical line's physical lines. Returns 0 with *open set, or -1.
int ReadPhysicalLines(ReadingState* state, int* open, int64_t* offset) {
  SourceLines* source = &state->fSource;
  if (ReadSourceLine(source, state->fLineNumber) != 0 || TokenizePhysicalLine(state, 0) != 0)
    return -1;
  *offset = source->fLineOffset;
  state->fLineNumber++;
  *open = IsLineOpen(state);
  while (!source->fAtEnd && *open) {
    const int lineStart = TextLength(state);
    const int depthBefore = state->fTokens.fNesting;
    const int k = state->fTokens.fTokenCount;
    const ScanState before = state->fTokens.fScan;
    if (ReadSourceLine(source, state->fLineNumber) != 0) return -1;
    if (source->fAtEnd) break;  // this read is not counted
    state->fLineIndex++;
    if (TokenizePhysicalLine(state, lineStart) != 0) return -1;
    if (LineStartsStatement(state, k, depthBefore)) {
      // The line goes back to be read as the next logical line's first, and this one stays
      // open: it is incomplete.
      ForgetPhysicalLine(&state->fTokens, k, before);
      return HandBackLine(source, lineStart);
    }
    state->fLineNumber++;
    *open = IsLineOpen(state);
  }
  return 0;
}

}  // namespace

int BuildLogicalLine(ReadingState* state, LineParts* parts) {
  StartLineTokens(&state->fTokens);
  StartText(&state->fSource);
  state->fLineIndex = 0;
  const int64_t firstLine = state->fLineNumber;
  int open = 0;
  int64_t offset = 0;
  if (ReadPhysicalLines(state, &open, &offset) != 0) return -1;
  const LineTokens& tokens = state->fTokens;
  if (tokens.fScan.fStart != -1 && tokens.fScan.fComplete == 0) {  // input ended in a string
    if (AppendUnfinishedString(state) != 0) return -1;
    open = 1;
  }
  if (tokens.fTokenCount == 0 ||
      (state->fOptions.fSkipWhitespaceLines && tokens.fSignificantCount == 0))
    return 0;
  const int64_t lineCount = state->fLineNumber - firstLine;
  if (firstLine > INT_MAX || lineCount > INT_MAX) {
    PyErr_SetString(PyExc_OverflowError, "Line number does not fit in 32 bits");
    return -1;
  }
  const TextBuffer& text = state->fSource.fText;
  const bool withText = state->fOptions.fIncludeLineText;
  *parts = LineParts{.fIndentLevel = tokens.fIndent,
                     .fFirstLine = static_cast<int>(firstLine),
                     .fLineCount = static_cast<int>(lineCount),
                     .fTokens = tokens.fTokenArray,
                     .fPositions = tokens.fTokenPositions,
                     .fTokenCount = tokens.fTokenCount,
                     .fSpacesInIndent = tokens.fSpacesInIndent,
                     .fTabsInIndent = tokens.fTabsInIndent,
                     .fIncomplete = open,
                     .fLineText = withText ? text.fData : nullptr,
                     .fLineTextLength = withText ? text.fLength : 0,
                     .fOffset = offset,
                     .fLazyImports = state->fOptions.fLazyImports};
  return 1;
}
