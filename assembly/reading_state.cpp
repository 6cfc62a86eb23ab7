// ReadingState set-up and release, and the map from text offsets to physical lines.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/reading_state.h"

#include <cstdlib>
#include <cstring>

#include "core/growth.h"

namespace {

void InitReadingState(ReadingState* state, const ReadOptions& options, PyObject* readline,
                      const char* data, const char* dataEnd, int64_t firstLine) {
  state->fOptions = options;
  state->fReadline = readline;
  state->fData = data;
  state->fDataEnd = dataEnd;
  InitTextBuffer(&state->fPending);
  state->fLineNumber = firstLine;
  state->fAtEnd = 0;
  state->fAtStart = 1;
  state->fMayHoldNul = 1;
  state->fSourceOffset = 0;
  state->fPendingOffset = 0;
  state->fLineOffset = 0;
  InitTextBuffer(&state->fText);
  state->fTokenArray = nullptr;
  state->fTokenPositions = nullptr;
  state->fTokenCount = 0;
  state->fTokenCapacity = 0;
  state->fLineStarts = state->fInlineLineStarts;
  state->fLineStartCapacity = kInlineLineStarts;
  StartLogicalLine(state);
}

}  // namespace

void InitReadlineReading(ReadingState* state, const ReadOptions& options, PyObject* readline,
                         int64_t firstLine) {
  InitReadingState(state, options, readline, nullptr, nullptr, firstLine);
}

void InitBufferReading(ReadingState* state, const ReadOptions& options, const char* data,
                       const char* from, const char* dataEnd, int64_t firstLine, bool whole) {
  InitReadingState(state, options, nullptr, from, dataEnd, firstLine);
  state->fAtStart = from == data;
  state->fSourceOffset = from - data;
  // A whole buffer without a NUL byte, the usual case, needs no search of every line for one;
  // a read that may stop early searches line by line, never past where it stops.
  if (whole) state->fMayHoldNul = memchr(from, '\0', static_cast<size_t>(dataEnd - from)) != nullptr;
}

void StartLogicalLine(ReadingState* state) {
  for (int i = 0; i < state->fTokenCount; i++) Py_DECREF(state->fTokenArray[i]);
  state->fTokenCount = 0;
  TruncateText(&state->fText, 0);
  state->fScan = kFreshScan;
  ResetFormattedStrings(&state->fStrings, state->fOptions.fStringRules);
  state->fIndent = -1;
  state->fTabsInIndent = 0;
  state->fSpacesInIndent = 0;
  state->fLineIndex = 0;
  state->fNesting = 0;
  state->fSignificantCount = 0;
}

void ReleaseReadingState(ReadingState* state) {
  StartLogicalLine(state);
  free(state->fTokenArray);  // the positions share its block
  if (state->fLineStarts != state->fInlineLineStarts) free(state->fLineStarts);
  ResetTextBuffer(&state->fText);
  ResetTextBuffer(&state->fPending);
}

int NoteLineStart(ReadingState* state, int offset) {
  const size_t index = static_cast<size_t>(state->fLineIndex);
  if (Grow(&state->fLineStarts, &state->fLineStartCapacity, index + 1, kInlineLineStarts,
           state->fInlineLineStarts) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  state->fLineStarts[index] = offset;
  return 0;
}

int LineIndexOfOffset(const ReadingState* state, int offset) {
  int low = 0;
  int high = state->fLineIndex;  // the answer lies in [low, high]
  while (low < high) {
    const int middle = low + (high - low + 1) / 2;
    if (state->fLineStarts[middle] <= offset) {
      low = middle;
    } else {
      high = middle - 1;
    }
  }
  return low;
}
