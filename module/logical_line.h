// The LogicalLine record: one logical line's tokens, range, indentation, line type, and the
// annotations that the host adds later.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "module/token_position.h"

enum LineFlag : uint8_t {
  kParsedFlag = 1,
  kTabsInIndentFlag = 2,
  kSpacesInIndentFlag = 4,
  kIncompleteFlag = 8,
};

struct LogicalLine {
  PyObject_HEAD
  PyObject** fTokenArray;          // fTokenCount owned references, usually bytes; a heap block
                                   // that also holds fTokenPositions and fLineText
  TokenPosition* fTokenPositions;  // fTokenCount positions inside fTokenArray's block, or null
  int32_t fFirstLine;
  int32_t fTokenCount;
  Py_ssize_t fNameCount;
  Py_ssize_t fTypeEquivCount;
  Py_ssize_t fArgTypeEquivCount;
  int16_t fIndentLevel;
  int16_t fLineCount;
  uint8_t fType;   // a line type value, 0 to 25
  uint8_t fFlags;  // LineFlag bits
  PyObject* fScopeName;       // owned, or null
  PyObject** fNames;          // fNameCount owned references; capacity is the count made even
  PyObject** fTypeEquivs;     // fTypeEquivCount pairs, stored flat
  PyObject** fArgTypeEquivs;  // fArgTypeEquivCount pairs, stored flat
  char* fLineText;            // own NUL-terminated copy inside fTokenArray's block, or null
  PyObject* fTokensTuple;     // cache of fTokens; the tokens never change once set
  PyObject* fLocalScopeName;  // the defined name on a class or function line, else None
};

extern PyTypeObject LogicalLineType;

// Returns a new record in the fresh state (no tokens, type kUnknown, fLocalScopeName None).
LogicalLine* NewLogicalLine();

// Releases every fNames entry and frees the array.
void ClearNames(LogicalLine* line);

// Releases both pair lists and frees their arrays.
void ClearTypeEquivs(LogicalLine* line);

// What the entries of one fTokens tuple share while it is built.
struct EntryParts;

// Returns element `index` of fTokens: (text, (line index, column) or None). `shared`, when
// given, lets entries of one tuple share their texts and line indices.
PyObject* MakeTokenEntry(LogicalLine* line, Py_ssize_t index, EntryParts* shared);

// Returns the value of fTokens, built anew.
PyObject* BuildTokensTuple(LogicalLine* line);

// Returns the value of fNamesDefined.
PyObject* NamesDefined(LogicalLine* line);
