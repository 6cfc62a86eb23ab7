// Source line reader: supplies the builder with one physical line per call, from the pending
// line or from the host's readline.
#pragma once

#include "assembly/reading_state.h"

// Appends the next physical line to the logical line's text. Sets fAtEnd when readline
// returns an empty bytes object. Returns 0, or -1 with an exception set.
int ReadSourceLine(ReadingState* state);
