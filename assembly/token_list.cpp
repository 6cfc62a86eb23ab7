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
#include "core/token_ids.h"
#include "tokenizer/formatted_string.h"
#include "tokenizer/line_scanner.h"
#include "tokenizer/token_text.h"

namespace {

constexpr int kTabWidth = 8;
constexpr char kStringPlaceholder[] = "'<string>'";

// Every listed token but a comment: line breaks are never listed.
bool IsSignificant(unsigned first) { return first != '#'; }

bool KeepToken(const ReadingState* state) {
  const int id = state->fScan.fTokenId;
  if (id == NEWLINE_TOKEN) return false;
  if (id == COMMENT_TOKEN) return !state->fOptions.fRemoveComments;
  return true;
}

// Measures the indentation: tabs advance to the next tab stop, blanks count one, form feeds
// and vertical tabs count nothing. Returns 0, or -1 with OverflowError set for an indentation
// wider than an int holds, which only tabs can reach: the text itself is shorter than that.
int MeasureIndent(ReadingState* state, const char* p, const char* tokenStart) {
  if (SkipSpaces(p) == tokenStart) {
    state->fSpacesInIndent = tokenStart > p;  // spaces alone, the usual indentation
    state->fIndent = static_cast<int>(tokenStart - p);
    return 0;
  }
  uint64_t column = 0;
  for (; p < tokenStart; p++) {
    if (*p == '\t') {
      column += kTabWidth - column % kTabWidth;
      state->fTabsInIndent = 1;
    } else if (*p == ' ') {
      column++;
      state->fSpacesInIndent = 1;
    }
  }
  if (column > INT_MAX) {
    PyErr_SetString(PyExc_OverflowError, "Indentation does not fit in 32 bits");
    return -1;
  }
  state->fIndent = static_cast<int>(column);
  return 0;
}

// Makes room for one token more than the list holds, when it has none: the references and the
// positions share one block, fTokenCapacity references and then as many positions, so a single
// capacity holds for both. Kept apart from the append, which runs for every token, so that the
// append stays small enough to inline. Returns 0, or -1 with an exception set and the list as
// it was.
[[gnu::noinline]] int GrowTokens(ReadingState* state) {
  if (state->fTokenCount == INT_MAX) {
    PyErr_SetString(PyExc_ValueError, "Too many tokens in line");
    return -1;
  }
  constexpr size_t kEntry = sizeof(PyObject*) + sizeof(TokenPosition);
  const size_t capacity = state->fTokenCapacity;
  const size_t grown = capacity < 8 ? 16 : 2 * capacity;  // far below SIZE_MAX / kEntry
  char* block = static_cast<char*>(realloc(state->fTokenArray, grown * kEntry));
  if (!block) {
    PyErr_NoMemory();
    return -1;
  }
  // The positions move up behind the longer array of references.
  auto* positions = reinterpret_cast<TokenPosition*>(block + grown * sizeof(PyObject*));
  memmove(positions, block + capacity * sizeof(PyObject*),
          static_cast<size_t>(state->fTokenCount) * sizeof(TokenPosition));
  state->fTokenArray = reinterpret_cast<PyObject**>(block);
  state->fTokenPositions = positions;
  state->fTokenCapacity = grown;
  return 0;
}

// Lists a token at a position, taking over the reference passed (released on failure). Returns
// 0, or -1 with an exception set.
[[gnu::always_inline]] inline int AppendToken(ReadingState* state, PyObject* token, int lineIndex,
                                              int column) {
  if (static_cast<size_t>(state->fTokenCount) >= state->fTokenCapacity &&
      GrowTokens(state) != 0) {
    Py_DECREF(token);
    return -1;
  }
  state->fTokenArray[state->fTokenCount] = token;
  state->fTokenPositions[state->fTokenCount] =
      TokenPosition{.fLine = lineIndex, .fColumn = column};
  state->fTokenCount++;
  const unsigned first = TokenText(token).At(0);
  if (IsSignificant(first)) state->fSignificantCount++;
  state->fNesting += BracketStep(first);
  return 0;
}

// Returns the token object of an id whose text is fixed: an operator's canonical text, or the
// string placeholder. Made once for the process.
PyObject* FixedToken(ReadingState* state, int id) {
  if (PyObject* known = CachedFixedText(id)) return known;
  const char* text = id == STRING_TOKEN ? kStringPlaceholder
                                        : OperatorText(state->fOptions.fOperatorTable, id);
  return StoreFixedText(id, text);
}

// Places a token that may have begun on an earlier physical line: on the line, as read, that
// holds its first byte.
void PlaceToken(const ReadingState* state, int start, int* lineIndex, int* column) {
  *lineIndex = LineIndexOfOffset(state, start);
  *column = start - state->fLineStarts[*lineIndex];
}

// Returns the error token for the scanner's current token and stores its position.
PyObject* MakeErrorToken(ReadingState* state, int* lineIndex, int* column) {
  const int start = state->fScan.fStart;
  const int end = state->fScan.fEnd > start ? state->fScan.fEnd : TextLength(state);
  PlaceToken(state, start, lineIndex, column);
  const Py_ssize_t n = end > start ? end - start : 0;
  PyObject* token = PyBytes_FromStringAndSize(nullptr, kErrorPrefixLength + n);
  if (!token) return nullptr;
  char* out = PyBytes_AS_STRING(token);
  memcpy(out, kErrorPrefix, kErrorPrefixLength);
  if (n) memcpy(out + kErrorPrefixLength, state->fText.fData + start, static_cast<size_t>(n));
  return token;
}

// Builds the object for the token the scanner just completed, and its position.
PyObject* MakeToken(ReadingState* state, int lineStart, int* lineIndex, int* column) {
  const ScanState& scan = state->fScan;
  const char* text = state->fText.fData;
  *lineIndex = state->fLineIndex;
  *column = scan.fStart - lineStart;
  switch (scan.fTokenId) {
    case NAME_TOKEN:
      return CachedBytes(text + scan.fStart, scan.fEnd - scan.fStart);
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
  return AppendToken(state, token, lineIndex, column);
}

void TruncateTokens(ReadingState* state, int index) {
  for (int i = index; i < state->fTokenCount; i++) {
    PyObject* token = state->fTokenArray[i];
    const unsigned first = TokenText(token).At(0);
    if (IsSignificant(first)) state->fSignificantCount--;
    state->fNesting -= BracketStep(first);
    Py_DECREF(token);  // the line is read again, and its tokens made again
  }
  if (index < state->fTokenCount) state->fTokenCount = index;
}

int TokenizePhysicalLine(ReadingState* state, int lineStart) {
  if (NoteLineStart(state, lineStart) != 0) return -1;
  const char* text = state->fText.fData;
  ScanCursor cursor{.fBase = lineStart,
                    .fLineStart = text + lineStart,
                    .fLineEnd = text + TextLength(state),
                    .fPos = text + lineStart,
                    .fAtEnd = 0};
  const OperatorTable* table = state->fOptions.fOperatorTable;
  // Only the readings whose formatted strings nest take the longer way round each token.
  FormattedStrings* strings = nullptr;
  if (state->fOptions.fStringRules != StringRules::kClassic) {
    strings = &state->fStrings;
    BeginFormattedLine(strings, &state->fScan);
  }
  bool measure = state->fLineIndex == 0;
  for (;;) {
    // The cursor goes by value, so that the classic loop keeps it in registers.
    const char* formattedEnd = nullptr;
    if (strings && MayScanFormatted(&state->fScan, cursor.fPos)) [[unlikely]]
      formattedEnd = ScanFormattedToken(&state->fScan, cursor, strings);
    if (formattedEnd) [[unlikely]] {
      cursor.fPos = formattedEnd;
    } else {
      ScanNextToken(table, &state->fScan, &cursor);
      if (cursor.fAtEnd) return 0;
    }
    if (measure) {  // at the first token, whatever it is, even one that is not listed
      if (MeasureIndent(state, text + lineStart, text + state->fScan.fStart) != 0) return -1;
      measure = false;
    }
    if (!state->fScan.fComplete || !KeepToken(state)) continue;
    int lineIndex = 0;
    int column = 0;
    PyObject* token = MakeToken(state, lineStart, &lineIndex, &column);
    if (!token || AppendToken(state, token, lineIndex, column) != 0) return -1;
  }
}
