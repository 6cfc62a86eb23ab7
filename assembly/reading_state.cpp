// ReadingState set-up and release, and the map from text offsets to physical lines.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/reading_state.h"

#include <cstdlib>

#include "core/growth.h"

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
  free(state->fTokenArray);
  free(state->fTokenPositions);
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
