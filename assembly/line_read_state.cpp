// LineReadState set-up, release, and the map from text offsets to physical lines.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_read_state.h"

#include <climits>
#include <cstdlib>
#include <cstring>

void InitTokenStorage(TokenStorage* storage) {
  storage->fTokenArray = nullptr;
  storage->fTokenPositions = nullptr;
  storage->fTokenCapacity = 0;
}

void ReleaseTokenStorage(TokenStorage* storage) {
  free(storage->fTokenArray);
  free(storage->fTokenPositions);
  InitTokenStorage(storage);
}

void InitLineReadState(LineReadState* state, LogicalLineParser* parser, TokenCache* cache,
                       TokenStorage* storage) {
  state->fParser = parser;
  InitTextBuffer(&state->fText);
  state->fTextLength = 0;
  state->fScan = ScanState{0, -1, -1, 0, 0, 0};
  state->fTokenArray = storage->fTokenArray;
  state->fTokenPositions = storage->fTokenPositions;
  state->fTokenCount = 0;
  state->fTokenCapacity = storage->fTokenCapacity;
  state->fCopyStrings = parser->fCopyStrings;
  state->fTabsInIndent = 0;
  state->fSpacesInIndent = 0;
  state->fTabWidth = 8;
  state->fLineIndex = 0;
  state->fNesting = 0;
  state->fSignificantCount = 0;
  state->fLineStarts = state->fInlineLineStarts;
  state->fLineStartCapacity = kInlineLineStarts;
  state->fCache = cache;
  state->fStorage = storage;
}

void ReleaseLineReadState(LineReadState* state) {
  for (int i = 0; i < state->fTokenCount; i++) Py_DECREF(state->fTokenArray[i]);
  state->fStorage->fTokenArray = state->fTokenArray;
  state->fStorage->fTokenPositions = state->fTokenPositions;
  state->fStorage->fTokenCapacity = state->fTokenCapacity;
  state->fTokenArray = nullptr;
  state->fTokenPositions = nullptr;
  state->fTokenCount = 0;
  state->fTokenCapacity = 0;
  ResetTextBuffer(&state->fText);
  if (state->fLineStarts != state->fInlineLineStarts) free(state->fLineStarts);
  state->fLineStarts = state->fInlineLineStarts;
  state->fLineStartCapacity = kInlineLineStarts;
}

int NoteLineStart(LineReadState* state, int offset) {
  const int index = state->fLineIndex;
  if (index >= state->fLineStartCapacity) {
    // Offsets are 32-bit and every line holds a byte, so the count stays below INT_MAX.
    const int capacity = state->fLineStartCapacity > INT_MAX / 2 ? INT_MAX
                                                                  : state->fLineStartCapacity * 2;
    int* starts;
    if (state->fLineStarts == state->fInlineLineStarts) {
      starts = static_cast<int*>(malloc(sizeof(int) * static_cast<size_t>(capacity)));
      if (starts) memcpy(starts, state->fInlineLineStarts, sizeof(state->fInlineLineStarts));
    } else {
      starts = static_cast<int*>(
          realloc(state->fLineStarts, sizeof(int) * static_cast<size_t>(capacity)));
    }
    if (!starts) {
      PyErr_NoMemory();
      return -1;
    }
    state->fLineStarts = starts;
    state->fLineStartCapacity = capacity;
  }
  state->fLineStarts[index] = offset;
  return 0;
}

int LineIndexOfOffset(const LineReadState* state, int offset) {
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
