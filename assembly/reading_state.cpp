// ReadingState set-up and release, through the parts' own writers.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/reading_state.h"

#include "assembly/source_reader.h"
#include "assembly/token_list.h"

namespace {

void InitReadingState(ReadingState* state, const ReadOptions& options, int64_t firstLine) {
  state->fOptions = options;
  InitLineTokens(&state->fTokens, options.fStringRules);
  state->fLineNumber = firstLine;
  state->fLineIndex = 0;
}

}  // namespace

void InitReadlineReading(ReadingState* state, const ReadOptions& options, PyObject* readline,
                         int64_t firstLine) {
  InitReadingState(state, options, firstLine);
  InitReadlineSource(&state->fSource, readline);
}

void InitBufferReading(ReadingState* state, const ReadOptions& options, const char* data,
                       const char* from, const char* dataEnd, int64_t firstLine, bool whole) {
  InitReadingState(state, options, firstLine);
  InitBufferSource(&state->fSource, data, from, dataEnd, whole);
}

void ReleaseReadingState(ReadingState* state) {
  ReleaseLineTokens(&state->fTokens);
  ReleaseSource(&state->fSource);
}
