// LineState: what the lines of one interpreter share. The module keeps one for each interpreter
// that imports it; reading and the line operations are handed it and find nothing on their own,
// so nothing that one interpreter makes is reachable from another.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

struct TokenTexts;   // assembly/token_cache.h
struct EntryTables;  // lines/tokens_tuple.h

struct LineState {
  PyTypeObject* fLineType;  // owned: this interpreter's LogicalLine type
  PyObject* fCreateHook;    // owned, or null until SetLogicalCreateFunction
  TokenTexts* fTokenTexts;  // owned tables: the token texts that reads share
  EntryTables* fEntries;    // owned tables: the parts of fTokens that lines share
};

// Returns a new state, with a LogicalLine type for `module` that has the Python surface's
// methods and attributes, or nullptr with an exception set.
LineState* NewLineState(PyObject* module, PyMethodDef* methods, PyGetSetDef* attributes);

// Visits every object the state holds, for the collector.
int VisitLineState(LineState* shared, visitproc visit, void* arg);

// Releases every object the state holds; what it holds afterwards is empty.
void ClearLineState(LineState* shared);

// Empties the tables that reads share, keeping the rest.
void ReleaseSharedTables(LineState* shared);

// Releases the state and its block.
void FreeLineState(LineState* shared);
