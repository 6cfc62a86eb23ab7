// Token list of a physical line: turns scanned tokens into bytes objects with positions,
// measures indentation, and keeps the bracket and significant-token counters.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/reading_state.h"

// Tokenizes the physical line from offset lineStart to the end of the text and lists its
// tokens; the first physical line also has its indentation measured. Returns 0, or -1 with an
// exception set.
int TokenizePhysicalLine(ReadingState* state, int lineStart);

// Lists the error token of a string that the input ended inside. Returns 0, or -1.
int AppendUnfinishedString(ReadingState* state);

// Removes the tokens from `index` on, undoing their counters.
void TruncateTokens(ReadingState* state, int index);

// Forgets the listed tokens without releasing them: their references were handed on with the
// line's parts. The other counters stay until the next logical line starts.
inline void GiveUpTokens(ReadingState* state) { state->fTokenCount = 0; }
