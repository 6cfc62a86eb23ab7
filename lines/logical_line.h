// The LogicalLine record: one logical line's tokens, range, indentation, line type, and the
// annotations that the host adds later.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "core/object_list.h"
#include "core/token_position.h"
#include "lines/shift_table.h"

enum LineFlag : uint8_t {
  kParsedFlag = 1,
  kTabsInIndentFlag = 2,
  kSpacesInIndentFlag = 4,
  kIncompleteFlag = 8,
};

// The record is followed by its storage, ob_size bytes: the token references, then their
// positions, then the line text. One allocation makes a line, and one frees it.
struct LogicalLine {
  PyObject_VAR_HEAD
  PyObject** fTokenArray;          // fTokenCount owned bytes objects, in the storage
  TokenPosition* fTokenPositions;  // fTokenCount positions, in the storage
  int32_t fTokenCount;
  int32_t fIndentLevel;
  int32_t fLineCount;
  uint8_t fType;   // a line type value, 0 to 25
  uint8_t fFlags;  // LineFlag bits
  PyObject* fScopeName;        // owned, or null
  ObjectList fNames;           // base classes, argument names or attributes, by fType
  ObjectList fTypeEquivs;      // pairs, two entries each
  ObjectList fArgTypeEquivs;   // pairs, two entries each
  char* fLineText;             // own NUL-terminated copy in the storage, or null
  PyObject* fTokensTuple;      // cache of fTokens; the tokens never change once set
  PyObject* fLocalScopeName;   // the defined name on a class or function line, else None
  // Where the line starts: its first physical line, and that line's offset in the text read.
  // Both are stored less the shift of its group when it shares the numbering of an updated
  // list; read them with FirstLineOf and SourceOffsetOf.
  int64_t fStoredFirstLine;
  int64_t fStoredOffset;
  ShiftTable* fShiftTable;  // a hold on the numbering it shares, or null
  uint32_t fGroup;          // its group in fShiftTable
};

// Returns a new LogicalLine type for `module`, with the Python surface's methods and attributes,
// or nullptr with an exception set.
PyTypeObject* NewLineType(PyObject* module, PyMethodDef* methods, PyGetSetDef* attributes);

// True when the object is a LogicalLine, of whichever import of the module: none of them can be
// subclassed, and all share their release function.
bool IsLogicalLine(PyObject* object);

inline LogicalLine* AsLine(PyObject* object) { return reinterpret_cast<LogicalLine*>(object); }

inline int64_t FirstLineOf(const LogicalLine* line) {
  const ShiftTable* table = line->fShiftTable;
  return line->fStoredFirstLine + (table ? table->fGroups[line->fGroup].fLineShift : 0);
}

inline int64_t SourceOffsetOf(const LogicalLine* line) {
  const ShiftTable* table = line->fShiftTable;
  return line->fStoredOffset + (table ? table->fGroups[line->fGroup].fByteShift : 0);
}

// Sets the first line, keeping the line in its group.
void SetFirstLine(LogicalLine* line, int64_t first);

// Moves the line by `lines` physical lines and `bytes` bytes, on its own.
void MoveLine(LogicalLine* line, int64_t lines, int64_t bytes);

// Has the line share a table's numbering, in group `group`, keeping its numbers. The line
// must share none yet.
void AttachLine(LogicalLine* line, ShiftTable* table, uint32_t group);

// Takes the line out of the numbering it shares, if any, keeping its numbers. The numbering is
// no longer trusted until it is recorded again.
void DetachLine(LogicalLine* line);

// Returns a new record of `type` in the fresh state (no tokens, type kUnknown, fLocalScopeName
// None), with `storage` bytes of storage after it, at LineStorage.
LogicalLine* NewLogicalLine(PyTypeObject* type, size_t storage);

inline char* LineStorage(LogicalLine* line) { return reinterpret_cast<char*>(line + 1); }

// Has the cyclic collector watch the line, from the first object the host stores in it.
void TrackLine(LogicalLine* line);

// Releases every appended annotation: the names, then both pair lists.
void ClearAppended(LogicalLine* line);

// Returns token `index` (borrowed), or nullptr with IndexError "Invalid token index" set.
PyObject* TokenAt(LogicalLine* line, int index);
