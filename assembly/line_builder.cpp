// The logical line builder. Brackets, trailing backslashes and open strings keep a logical
// line open; a physical line that looks like the start of a new statement ends it early, so
// that half-typed code does not swallow the rest of the file.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_builder.h"

#include <climits>
#include <cstring>
#include <string_view>

#include "analysis/token_text.h"
#include "assembly/line_read_state.h"
#include "assembly/source_reader.h"
#include "assembly/token_list.h"
#include "module/construction.h"
#include "module/errors.h"
#include "module/py_ref.h"
#include "tokenizer/token_ids.h"

namespace {

// Words that always start a new statement; searched word by word for an exact match.
constexpr std::string_view kStatementKeywords[] = {
    "assert", "break", "class", "continue", "def", "del", "elif", "except", "exec",
    "finally", "from", "global", "import", "pass", "raise", "return", "try", "while",
};

// Beyond this many tokens a line starting with "if" or "else" is taken as a continuation.
constexpr int kLongLineTokens = 50;

TokenText TextOf(const LineReadState* state, int i) { return TokenText(state->fTokenArray[i]); }

bool IsStatementKeyword(const TokenText& text) {
  for (std::string_view word : kStatementKeywords) {
    if (text.Is(word)) return true;
  }
  return false;
}

bool LastTokenIsTrailingBackslash(const LineReadState* state) {
  const int last = state->fTokenCount - 1;
  return TextOf(state, last).At(0) == '\\' && state->fTokenPositions[last].fLine ==
                                                  static_cast<uint16_t>(state->fLineIndex);
}

bool AnyTokenIs(const LineReadState* state, int from, int to, std::string_view word) {
  for (int i = from; i < to; i++) {
    if (TextOf(state, i).Is(word)) return true;
  }
  return false;
}

bool IsLineOpen(const LineReadState* state) {
  // Only an open string counts here: a first line of blanks without a line break scans
  // nothing and must stay a blank line rather than swallow the next one.
  if (state->fScan.fComplete == 0 && state->fScan.fTokenId == STRING_TOKEN) return true;
  if (state->fTokenCount == 0) return false;
  if (LastTokenIsTrailingBackslash(state)) return true;
  return state->fNesting > 0;
}

bool StartsNewStatement(const LineReadState* state, int k, int depthBefore) {
  const TokenText first = TextOf(state, k);
  if (first.At(0) == '@') return true;
  if (depthBefore <= 0) {
    if (k > 0 && TextOf(state, k - 1).At(0) == '\\') return false;
    if (first.Is("for")) return true;
  }
  if (first.Is("if")) {
    if (state->fTokenCount >= kLongLineTokens) return false;
    if (LastTokenIsTrailingBackslash(state)) return false;
    if (state->fNesting > 0) return false;
    if (AnyTokenIs(state, k + 1, state->fTokenCount, "else")) return false;  // a conditional
    if (AnyTokenIs(state, 0, k, "for")) return false;                        // a comprehension
    return true;
  }
  if (first.Is("else")) {
    if (k >= kLongLineTokens) return false;
    if (k == 0) return true;
    return !AnyTokenIs(state, 0, k, "if");  // a conditional expression
  }
  return IsStatementKeyword(first);
}

// Moves the physical line at lineStart back into the pending line.
int HandBack(LineReadState* state, TextBuffer* pending, int lineStart, int k) {
  TruncateTokens(state, k);
  if (pending->fLength != 0 || lineStart < 0 || lineStart > state->fTextLength) {
    RaiseBadInternalCall(kHandBackCheckLine);
    return -1;
  }
  if (AppendBytes(pending, state->fText.fData + lineStart,
                  static_cast<size_t>(state->fTextLength - lineStart)) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  TruncateText(&state->fText, static_cast<size_t>(lineStart));
  state->fTextLength = lineStart;
  state->fScan.fComplete = 1;  // a string opened by the handed-back line is not ours
  return 0;
}

// Lists the error token of a string that the input ended inside.
int AppendUnfinishedString(LineReadState* state) {
  int lineIndex = 0;
  int column = 0;
  PyRef token = PyRef::Steal(MakeErrorToken(state, &lineIndex, &column));
  if (!token) return -1;
  return AppendToken(state, token.Get(), lineIndex, column);
}

// Reads the logical line's physical lines. Returns 0 with *open set, or -1.
int ReadLogicalLine(LineReadState* state, PyObject* readline, TextBuffer* pending,
                    int64_t* lineNumber, int* atEnd, int* indent, int* open) {
  if (ReadSourceLine(state, readline, pending, atEnd, *lineNumber) != 0) return -1;
  if (TokenizePhysicalLine(state, 0, indent) != 0) return -1;
  ++*lineNumber;
  *open = IsLineOpen(state);
  while (!*atEnd && *open) {
    const int lineStart = state->fTextLength;
    const int depthBefore = state->fNesting;
    const int k = state->fTokenCount;
    if (ReadSourceLine(state, readline, pending, atEnd, *lineNumber) != 0) return -1;
    if (*atEnd) break;  // this read is not counted
    state->fLineIndex++;
    if (TokenizePhysicalLine(state, lineStart, nullptr) != 0) return -1;
    if (state->fTokenCount > k && StartsNewStatement(state, k, depthBefore))
      return HandBack(state, pending, lineStart, k);  // stays open: the line is incomplete
    ++*lineNumber;
    *open = IsLineOpen(state);
  }
  return 0;
}

PyObject* FinishLogicalLine(LineReadState* state, int64_t firstLine, int64_t lineNumber,
                            int indent, int open) {
  if (state->fTokenCount == 0 ||
      (state->fParser->fSkipWhitespaceLines && state->fSignificantCount == 0))
    Py_RETURN_NONE;
  const int64_t lineCount = lineNumber - firstLine;
  if (firstLine > INT_MAX || lineCount > INT_MAX) {
    PyErr_SetString(PyExc_OverflowError, "Line number does not fit in 32 bits");
    return nullptr;
  }
  const bool withText = state->fParser->fIncludeLineText;
  LineParts parts{indent,
                  static_cast<int>(firstLine),
                  static_cast<int>(lineCount),
                  state->fTokenArray,
                  state->fTokenPositions,
                  state->fTokenCount,
                  state->fSpacesInIndent,
                  state->fTabsInIndent,
                  open,
                  withText ? state->fText.fData : nullptr,
                  withText ? state->fText.fLength : 0};
  return CreateLogicalLine(parts);
}

}  // namespace

PyObject* BuildLogicalLine(LogicalLineParser* parser, PyObject* readline, TextBuffer* pending,
                           int64_t* lineNumber, int* atEnd, TokenCache* cache,
                           TokenStorage* storage) {
  LineReadState state;
  InitLineReadState(&state, parser, cache, storage);
  const int64_t firstLine = *lineNumber;
  int indent = -1;
  int open = 0;
  PyObject* result = nullptr;
  if (ReadLogicalLine(&state, readline, pending, lineNumber, atEnd, &indent, &open) == 0) {
    bool failed = false;
    if (state.fScan.fStart != -1 && state.fScan.fComplete == 0) {  // input ended inside a string
      failed = AppendUnfinishedString(&state) != 0;
      open = 1;
    }
    if (!failed) result = FinishLogicalLine(&state, firstLine, *lineNumber, indent, open);
  }
  ReleaseLineReadState(&state);
  return result;
}
