// The value of fTokens: one (text, (line index, column)) entry per token.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "core/token_position.h"
#include "lines/logical_line.h"

// Returns a new (line index, column) tuple of ints, or nullptr with an exception set.
PyObject* PositionTuple(TokenPosition position);

// Returns the line's fTokens tuple, built at the first call and the same object after.
PyObject* TokensTupleOf(LogicalLine* line);

// Empties every table that reading shares: the entries and parts of fTokens, the token texts.
void ReleaseSharedTables();
