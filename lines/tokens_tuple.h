// The value of fTokens: one (text, (line index, column)) entry per token.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"
#include "core/token_position.h"
#include "lines/logical_line.h"

// The parts of fTokens that one interpreter's lines share: positions, the ints in them, the str
// shown for a token, and whole entries.
struct EntryTables;

// Returns new empty tables, or nullptr with MemoryError set.
EntryTables* NewEntryTables();

// Returns a new (line index, column) tuple of ints, or nullptr with an exception set.
PyObject* PositionTuple(EntryTables* tables, TokenPosition position);

// Returns the line's fTokens tuple, built at the first call and the same object after, from the
// tables of the line's interpreter and the texts that its reads share.
PyObject* TokensTupleOf(EntryTables* tables, const TokenTexts* texts, LogicalLine* line);

// Empties the tables.
void ReleaseEntryTables(EntryTables* tables);

// Empties the tables and frees them.
void FreeEntryTables(EntryTables* tables);
