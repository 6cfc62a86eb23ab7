// Token list of a logical line: turns scanned tokens into bytes objects with positions,
// measures indentation, and keeps the bracket and significant-token counters. It alone writes
// the tokens' part of the reading state.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/reading_state.h"

// Sets up an empty list, for strings read by `rules`.
void InitLineTokens(LineTokens* tokens, StringRules rules);

// Empties the list for the next logical line, releasing its tokens and keeping its storage.
void StartLineTokens(LineTokens* tokens);

// Releases every token and block the list holds.
void ReleaseLineTokens(LineTokens* tokens);

// Tokenizes the physical line from offset lineStart to the end of the text and lists its
// tokens; the first physical line also has its indentation measured. Returns 0, or -1 with an
// exception set.
int TokenizePhysicalLine(ReadingState* state, int lineStart);

// Lists the error token of a string that the input ended inside. Returns 0, or -1.
int AppendUnfinishedString(ReadingState* state);

// Forgets the physical line just tokenized, whose first token was listed at index k, as it is
// handed back: its tokens go, and the scan is as it was before it (`before`) with nothing open,
// or, when the line began inside a field of a formatted string, that string is left open to
// end before the line as an error token.
void ForgetPhysicalLine(LineTokens* tokens, int k, const ScanState& before);

// Forgets the listed tokens without releasing them: their references were handed on with the
// line's parts. The other counters stay until the next logical line starts.
inline void GiveUpTokens(ReadingState* state) { state->fTokens.fTokenCount = 0; }
