// Logical line builder: reads and tokenizes physical lines until the logical line is complete,
// handing back a physical line that starts a new statement.
#pragma once

#include "assembly/line_parts.h"
#include "assembly/reading_state.h"

// Reads the next logical line. Returns 1 with its parts filled in (valid until the next call),
// 0 when it read only lines that give nothing (blank ones, or comments that are skipped), or -1
// with an exception set. fLineNumber advances by the physical lines consumed.
int BuildLogicalLine(ReadingState* state, LineParts* parts);
