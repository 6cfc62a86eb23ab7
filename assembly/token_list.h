// Token list of a physical line: turns scanned tokens into bytes objects with positions,
// measures indentation, and keeps the bracket and significant-token counters.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_read_state.h"

// Tokenizes the physical line from offset lineStart to the end of the text and lists its
// tokens. When indentSlot is given, measures the line's indentation into it. Returns 0, or
// -1 with an exception set.
int TokenizePhysicalLine(LineReadState* state, int lineStart, int* indentSlot);

// Returns the error token for the scanner's current token and stores its position.
PyObject* MakeErrorToken(LineReadState* state, int* lineSlot, int* columnSlot);

// Lists a token (taking a new reference) at a position. Returns 0, or -1 with an exception set.
int AppendToken(LineReadState* state, PyObject* token, int lineIndex, int column);

// Removes the tokens from `index` on, undoing their counters.
void TruncateTokens(LineReadState* state, int index);
