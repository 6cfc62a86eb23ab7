// The token list. Token texts: source bytes for names, numbers, comments and strings; the
// canonical text for operators (so "<>" is listed as "!="); a marked copy for error tokens.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_list.h"

#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "assembly/token_cache.h"
#include "core/growth.h"
#include "core/token_ids.h"
#include "tokenizer/formatted_string.h"
#include "tokenizer/line_scanner.h"
#include "tokenizer/token_text.h"

namespace {

constexpr int kTabWidth = 8;

// Records where physical line fLineIndex starts. Returns 0, or -1 with MemoryError set.
int NoteLineStart(ReadingState* state, int offset) {
  LineTokens* tokens = &state->fTokens;
  const auto index = static_cast<size_t>(state->fLineIndex);
  if (Grow(&tokens->fLineStarts, &tokens->fLineStartCapacity, index + 1, kInlineLineStarts,
           tokens->fInlineLineStarts) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  tokens->fLineStarts[index] = offset;
  return 0;
}

// Returns the index of the physical line that holds text offset `offset`.
int LineIndexOfOffset(const ReadingState* state, int offset) {
  const int* starts = state->fTokens.fLineStarts;
  int low = 0;
  int high = state->fLineIndex;  // the answer lies in [low, high]
  while (low < high) {
    const int middle = low + (high - low + 1) / 2;
    if (starts[middle] <= offset) {
      low = middle;
    } else {
      high = middle - 1;
    }
  }
  return low;
}
constexpr char kStringPlaceholder[] = "'<string>'";

// Every listed token but a comment: line breaks are never listed.
bool IsSignificant(unsigned first) { return first != '#'; }

bool KeepToken(const ReadingState* state) {
  const int id = state->fTokens.fScan.fTokenId;
  if (id == NEWLINE_TOKEN) return false;
  if (id == COMMENT_TOKEN) return !state->fOptions.fRemoveComments;
  return true;
}

// Measures the indentation: tabs advance to the next tab stop, blanks count one, form feeds
// and vertical tabs count nothing. Returns 0, or -1 with OverflowError set for an indentation
// wider than an int holds, which only tabs can reach: the text itself is shorter than that.
int MeasureIndent(LineTokens* tokens, const char* p, const char* tokenStart) {
  if (SkipSpaces(p) == tokenStart) {
    tokens->fSpacesInIndent = tokenStart > p;  // spaces alone, the usual indentation
    tokens->fIndent = static_cast<int>(tokenStart - p);
    return 0;
  }
  uint64_t column = 0;
  for (; p < tokenStart; p++) {
    if (*p == '\t') {
      column += kTabWidth - column % kTabWidth;
      tokens->fTabsInIndent = 1;
    } else if (*p == ' ') {
      column++;
      tokens->fSpacesInIndent = 1;
    }
  }
  if (column > INT_MAX) {
    PyErr_SetString(PyExc_OverflowError, "Indentation does not fit in 32 bits");
    return -1;
  }
  tokens->fIndent = static_cast<int>(column);
  return 0;
}

// Makes room for one token more than the list holds, when it has none: the references and the
// positions share one block, fTokenCapacity references and then as many positions, so a single
// capacity holds for both. Kept apart from the append, which runs for every token, so that the
// append stays small enough to inline. Returns 0, or -1 with an exception set and the list as
// it was.
[[gnu::noinline]] int GrowTokens(LineTokens* tokens) {
  if (tokens->fTokenCount == INT_MAX) {
    PyErr_SetString(PyExc_ValueError, "Too many tokens in line");
    return -1;
  }
  constexpr size_t kEntry = sizeof(PyObject*) + sizeof(TokenPosition);
  const size_t capacity = tokens->fTokenCapacity;
  const size_t grown = capacity < 8 ? 16 : 2 * capacity;  // far below SIZE_MAX / kEntry
  char* block = static_cast<char*>(realloc(tokens->fTokenArray, grown * kEntry));
  if (!block) {
    PyErr_NoMemory();
    return -1;
  }
  // The positions move up behind the longer array of references.
  auto* positions = reinterpret_cast<TokenPosition*>(block + grown * sizeof(PyObject*));
  memmove(positions, block + capacity * sizeof(PyObject*),
          static_cast<size_t>(tokens->fTokenCount) * sizeof(TokenPosition));
  tokens->fTokenArray = reinterpret_cast<PyObject**>(block);
  tokens->fTokenPositions = positions;
  tokens->fTokenCapacity = grown;
  return 0;
}

// Lists a token at a position, taking over the reference passed (released on failure). Returns
// 0, or -1 with an exception set.
[[gnu::always_inline]] inline int AppendToken(LineTokens* tokens, PyObject* token, int lineIndex,
                                              int column) {
  if (static_cast<size_t>(tokens->fTokenCount) >= tokens->fTokenCapacity &&
      GrowTokens(tokens) != 0) {
    Py_DECREF(token);
    return -1;
  }
  tokens->fTokenArray[tokens->fTokenCount] = token;
  tokens->fTokenPositions[tokens->fTokenCount] =
      TokenPosition{.fLine = lineIndex, .fColumn = column};
  tokens->fTokenCount++;
  const unsigned first = TokenText(token).At(0);
  if (IsSignificant(first)) tokens->fSignificantCount++;
  tokens->fNesting += BracketStep(first);
  return 0;
}

// Makes and stores the token object of an id whose text is fixed, at its first sighting.
[[gnu::noinline]] PyObject* NewFixedToken(ReadingState* state, int id) {
  const char* text = id == STRING_TOKEN ? kStringPlaceholder
                                        : OperatorText(state->fOptions.fOperatorTable, id);
  return StoreFixedText(state->fOptions.fTokenTexts, id, text);
}

// Returns the token object of an id whose text is fixed: an operator's canonical text, or the
// string placeholder. Made once for the interpreter.
PyObject* FixedToken(ReadingState* state, int id) {
  if (PyObject* known = CachedFixedText(state->fOptions.fTokenTexts, id)) return known;
  return NewFixedToken(state, id);
}

// Places a token that may have begun on an earlier physical line: on the line, as read, that
// holds its first byte.
void PlaceToken(const ReadingState* state, int start, int* lineIndex, int* column) {
  *lineIndex = LineIndexOfOffset(state, start);
  *column = start - state->fTokens.fLineStarts[*lineIndex];
}

// Returns the error token for the scanner's current token and stores its position.
PyObject* MakeErrorToken(ReadingState* state, int* lineIndex, int* column) {
  const ScanState& scan = state->fTokens.fScan;
  const int start = scan.fStart;
  const int end = scan.fEnd > start ? scan.fEnd : TextLength(state);
  PlaceToken(state, start, lineIndex, column);
  const Py_ssize_t n = end > start ? end - start : 0;
  PyObject* token = PyBytes_FromStringAndSize(nullptr, kErrorPrefixLength + n);
  if (!token) return nullptr;
  char* out = PyBytes_AS_STRING(token);
  memcpy(out, kErrorPrefix, kErrorPrefixLength);
  const char* text = state->fSource.fText.fData;
  if (n) memcpy(out + kErrorPrefixLength, text + start, static_cast<size_t>(n));
  return token;
}

// Builds the object for the token the scanner just completed, and its position.
PyObject* MakeToken(ReadingState* state, int lineStart, int* lineIndex, int* column) {
  const ScanState& scan = state->fTokens.fScan;
  const char* text = state->fSource.fText.fData;
  *lineIndex = state->fLineIndex;
  *column = scan.fStart - lineStart;
  switch (scan.fTokenId) {
    case NAME_TOKEN:
      return CachedBytes(state->fOptions.fTokenTexts, text + scan.fStart, scan.fEnd - scan.fStart);
    case NUMBER_TOKEN:   // rarely repeated, and a long literal holds little else: they would
    case COMMENT_TOKEN:  // only push the names out of the cache
      return PyBytes_FromStringAndSize(text + scan.fStart, scan.fEnd - scan.fStart);
    case STRING_TOKEN:
      if (scan.fStart < lineStart) PlaceToken(state, scan.fStart, lineIndex, column);
      if (!state->fOptions.fCopyStrings) return FixedToken(state, STRING_TOKEN);
      return PyBytes_FromStringAndSize(text + scan.fStart, scan.fEnd - scan.fStart);
    case ERROR_TOKEN:
      return MakeErrorToken(state, lineIndex, column);
    default:
      return FixedToken(state, scan.fTokenId);
  }
}

}  // namespace

int AppendUnfinishedString(ReadingState* state) {
  int lineIndex = 0;
  int column = 0;
  PyObject* token = MakeErrorToken(state, &lineIndex, &column);
  if (!token) return -1;
  return AppendToken(&state->fTokens, token, lineIndex, column);
}

void ForgetPhysicalLine(LineTokens* tokens, int k, const ScanState& before) {
  for (int i = k; i < tokens->fTokenCount; i++) {
    PyObject* token = tokens->fTokenArray[i];
    const unsigned first = TokenText(token).At(0);
    if (IsSignificant(first)) tokens->fSignificantCount--;
    tokens->fNesting -= BracketStep(first);
    Py_DECREF(token);  // the line is read again, and its tokens made again
  }
  if (k < tokens->fTokenCount) tokens->fTokenCount = k;
  if (tokens->fStrings.fLineBeganInField) {
    tokens->fScan = before;  // the string ends before the line, as an error token
  } else {
    tokens->fScan.fComplete = 1;  // a string opened by the handed-back line is not ours
  }
}

void InitLineTokens(LineTokens* tokens, StringRules rules) {
  tokens->fTokenArray = nullptr;
  tokens->fTokenPositions = nullptr;
  tokens->fTokenCount = 0;
  tokens->fTokenCapacity = 0;
  tokens->fLineStarts = tokens->fInlineLineStarts;
  tokens->fLineStartCapacity = kInlineLineStarts;
  tokens->fStrings.fRules = rules;
  StartLineTokens(tokens);
}

void StartLineTokens(LineTokens* tokens) {
  for (int i = 0; i < tokens->fTokenCount; i++) Py_DECREF(tokens->fTokenArray[i]);
  tokens->fTokenCount = 0;
  tokens->fScan = kFreshScan;
  ResetFormattedStrings(&tokens->fStrings, tokens->fStrings.fRules);
  tokens->fIndent = -1;
  tokens->fTabsInIndent = 0;
  tokens->fSpacesInIndent = 0;
  tokens->fNesting = 0;
  tokens->fSignificantCount = 0;
}

void ReleaseLineTokens(LineTokens* tokens) {
  StartLineTokens(tokens);
  free(tokens->fTokenArray);  // the positions share its block
  if (tokens->fLineStarts != tokens->fInlineLineStarts) free(tokens->fLineStarts);
}

int TokenizePhysicalLine(ReadingState* state, int lineStart) {
  if (NoteLineStart(state, lineStart) != 0) return -1;
  LineTokens* tokens = &state->fTokens;
  ScanState* scan = &tokens->fScan;
  const char* text = state->fSource.fText.fData;
  ScanCursor cursor{.fBase = lineStart,
                    .fLineStart = text + lineStart,
                    .fLineEnd = text + TextLength(state),
                    .fPos = text + lineStart,
                    .fAtEnd = 0,
                    .fRules = state->fOptions.fStringRules};
  const OperatorTable* table = state->fOptions.fOperatorTable;
  // Only the readings whose formatted strings nest take the longer way round each token.
  FormattedStrings* strings = nullptr;
  if (state->fOptions.fStringRules != StringRules::kClassic) {
    strings = &tokens->fStrings;
    BeginFormattedLine(strings, scan);
  }
  bool measure = state->fLineIndex == 0;
  for (;;) {
    // The cursor goes by value, so that the classic loop keeps it in registers.
    const char* formattedEnd = nullptr;
    if (strings && MayScanFormatted(scan, cursor.fPos)) [[unlikely]]
      formattedEnd = ScanFormattedToken(scan, cursor, strings);
    if (formattedEnd) [[unlikely]] {
      cursor.fPos = formattedEnd;
    } else {
      ScanNextToken(table, scan, &cursor);
      if (cursor.fAtEnd) return 0;
    }
    if (measure) {  // at the first token, whatever it is, even one that is not listed
      if (MeasureIndent(tokens, text + lineStart, text + scan->fStart) != 0) return -1;
      measure = false;
    }
    if (!scan->fComplete || !KeepToken(state)) continue;
    int lineIndex = 0;
    int column = 0;
    PyObject* token = MakeToken(state, lineStart, &lineIndex, &column);
    if (!token || AppendToken(tokens, token, lineIndex, column) != 0) return -1;
  }
}
