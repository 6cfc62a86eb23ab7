// The token list. Token texts: source bytes for names, numbers, comments and strings; the
// canonical text for operators (so "<>" is listed as "!="); a marked copy for error tokens.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_list.h"

#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "module/errors.h"
#include "module/py_ref.h"
#include "tokenizer/line_scanner.h"
#include "tokenizer/token_ids.h"

namespace {

struct StandardTokenText {
  unsigned fId;
  const char* fText;
};

// Texts for ids that have no operator row.
constexpr StandardTokenText kStandardTokenTexts[] = {
    {1, "<name>"}, {2, "<token>"}, {3, "'<string>'"}, {4, "\n"}, {5, "<indent>"},
    {6, "<dedent>"}, {54, "<op>"}, {201, "<errortoken>"}, {202, "#<comment>"},
};

const char* StandardText(int id) {
  for (const StandardTokenText& row : kStandardTokenTexts) {
    if (row.fId == static_cast<unsigned>(id)) return row.fText;
  }
  return nullptr;
}

const char* FixedText(const LineReadState* state, int id) {
  const char* text = OperatorText(state->fParser->fOperatorTable, id);
  return text ? text : StandardText(id);
}

void AdjustNesting(int* counter, unsigned first, int delta) {
  if (first == '(' || first == '[' || first == '{') *counter += delta;
  if (first == ')' || first == ']' || first == '}') *counter -= delta;
}

unsigned FirstByte(PyObject* token) {
  return PyBytes_GET_SIZE(token) ? static_cast<unsigned char>(PyBytes_AS_STRING(token)[0]) : 0;
}

bool IsSignificant(unsigned first) { return first != '#' && first != '\n'; }

bool KeepToken(const LineReadState* state) {
  const int id = state->fScan.fTokenId;
  if (id == NEWLINE_TOKEN) return false;
  if (id == COMMENT_TOKEN) return !state->fParser->fRemoveComments;
  return true;
}

// Measures the indentation: tabs advance to the next tab stop, blanks count one, form feeds
// and vertical tabs count nothing. Counted modulo 2**31, so that an absurdly wide indentation
// keeps its low 16 bits and never turns negative.
void MeasureIndent(LineReadState* state, const char* p, const char* tokenStart, int* slot) {
  uint32_t column = 0;
  const uint32_t tabWidth = static_cast<uint32_t>(state->fTabWidth);
  state->fTabsInIndent = 0;
  state->fSpacesInIndent = 0;
  for (; p < tokenStart; p++) {
    if (*p == '\t') {
      column += tabWidth - column % tabWidth;
      state->fTabsInIndent = 1;
    } else if (*p == ' ') {
      column++;
      state->fSpacesInIndent = 1;
    }
  }
  *slot = static_cast<int>(column & INT_MAX);
}

int Grow(LineReadState* state) {
  const long long needed = static_cast<long long>(state->fTokenCount) + 1;
  long long capacity = needed < 16 ? 16 : needed * 2;
  if (capacity > INT_MAX) capacity = INT_MAX;
  if (needed >= capacity) {
    PyErr_SetString(PyExc_ValueError, "Too many tokens in line");
    return -1;
  }
  auto* tokens = static_cast<PyObject**>(
      realloc(state->fTokenArray, static_cast<size_t>(capacity) * sizeof(PyObject*)));
  if (!tokens) {
    PyErr_NoMemory();
    return -1;
  }
  state->fTokenArray = tokens;
  auto* positions = static_cast<TokenPosition*>(
      realloc(state->fTokenPositions, static_cast<size_t>(capacity) * sizeof(TokenPosition)));
  if (!positions) {
    PyErr_NoMemory();
    return -1;
  }
  state->fTokenPositions = positions;
  state->fTokenCapacity = static_cast<int>(capacity);
  return 0;
}

// Returns the token object of an id whose text is fixed: an operator's canonical text, or a
// standard token text such as the string placeholder. Made once per reading call.
PyObject* FixedToken(LineReadState* state, int id) {
  if (PyObject* known = CachedFixedText(state->fCache, id)) return known;
  const char* fixed = FixedText(state, id);
  if (!fixed) {
    RaiseBadInternalCall(kTokenTextCheckLine);
    return nullptr;
  }
  return StoreFixedText(state->fCache, id, fixed);
}

// Builds the object for the token the scanner just completed, and its position.
PyObject* MakeToken(LineReadState* state, int lineStart, int* lineIndex, int* column) {
  const ScanState& scan = state->fScan;
  const char* text = state->fText.fData;
  const int id = scan.fTokenId;
  *lineIndex = state->fLineIndex;
  *column = scan.fStart - lineStart;
  switch (id) {
    case NAME_TOKEN:
    case NUMBER_TOKEN:
      return CachedBytes(state->fCache, text + scan.fStart, scan.fEnd - scan.fStart);
    case COMMENT_TOKEN:  // rarely repeated: not worth a cache slot
      return PyBytes_FromStringAndSize(text + scan.fStart, scan.fEnd - scan.fStart);
    case STRING_TOKEN:
      if (scan.fStart < lineStart) {  // began on an earlier physical line
        *lineIndex = LineIndexOfOffset(state, scan.fStart);
        *column = scan.fStart - state->fLineStarts[*lineIndex];
      }
      if (!state->fCopyStrings) return FixedToken(state, STRING_TOKEN);
      return PyBytes_FromStringAndSize(text + scan.fStart, scan.fEnd - scan.fStart);
    case ERROR_TOKEN:
      return MakeErrorToken(state, lineIndex, column);
    default:
      return FixedToken(state, id);
  }
}

}  // namespace

PyObject* MakeErrorToken(LineReadState* state, int* lineSlot, int* columnSlot) {
  const int start = state->fScan.fStart;
  const int end = state->fScan.fEnd > start ? state->fScan.fEnd : state->fTextLength;
  *lineSlot = LineIndexOfOffset(state, start);
  *columnSlot = start - state->fLineStarts[*lineSlot];
  const Py_ssize_t n = end > start ? end - start : 0;
  PyObject* token = PyBytes_FromStringAndSize(nullptr, kErrorPrefixLength + n);
  if (!token) return nullptr;
  char* out = PyBytes_AS_STRING(token);
  memcpy(out, kErrorPrefix, kErrorPrefixLength);
  if (n) memcpy(out + kErrorPrefixLength, state->fText.fData + start, static_cast<size_t>(n));
  return token;
}

int AppendToken(LineReadState* state, PyObject* token, int lineIndex, int column) {
  if (state->fTokenCount + 1 >= state->fTokenCapacity && Grow(state) != 0) return -1;
  Py_INCREF(token);
  state->fTokenArray[state->fTokenCount] = token;
  state->fTokenPositions[state->fTokenCount] =
      TokenPosition{static_cast<uint16_t>(lineIndex), static_cast<uint16_t>(column)};
  state->fTokenCount++;
  const unsigned first = FirstByte(token);
  if (IsSignificant(first)) state->fSignificantCount++;
  AdjustNesting(&state->fNesting, first, +1);
  return 0;
}

void TruncateTokens(LineReadState* state, int index) {
  for (int i = index; i < state->fTokenCount; i++) {
    PyObject* token = state->fTokenArray[i];
    const unsigned first = FirstByte(token);
    if (IsSignificant(first)) state->fSignificantCount--;
    AdjustNesting(&state->fNesting, first, -1);
    Py_DECREF(token);
  }
  if (index < state->fTokenCount) state->fTokenCount = index;
}

int TokenizePhysicalLine(LineReadState* state, int lineStart, int* indentSlot) {
  const char* text = state->fText.fData;
  if (lineStart < state->fTextLength && text[lineStart] == '\0') {
    PyErr_Format(PyExc_ValueError, "Binary data encountered at position %d while tokenizing",
                 lineStart);
    return -1;
  }
  if (NoteLineStart(state, lineStart) != 0) return -1;
  ScanCursor cursor{lineStart, text + lineStart, text + state->fTextLength, text + lineStart, 0};
  const OperatorTable* table = state->fParser->fOperatorTable;
  for (;;) {
    ScanNextToken(table, &state->fScan, &cursor);
    if (cursor.fAtEnd) return 0;
    if (indentSlot) {
      MeasureIndent(state, text + lineStart, text + state->fScan.fStart, indentSlot);
      indentSlot = nullptr;
    }
    if (!state->fScan.fComplete || !KeepToken(state)) continue;
    int lineIndex = 0;
    int column = 0;
    PyRef token = PyRef::Steal(MakeToken(state, lineStart, &lineIndex, &column));
    if (!token || AppendToken(state, token.Get(), lineIndex, column) != 0) return -1;
  }
}
