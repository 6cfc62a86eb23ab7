// Reading a whole source into a list of lines: one line per logical line that the builder
// finds, made by construction (or the host's create hook). A full read of the module's own
// lines is numbered as it is built, so that updates of the list need not walk it, and its
// record keeps the text and the options it was read with.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "assembly/line_parts.h"
#include "lines/line_state.h"

// Where the physical lines come from, and which of them start logical lines: from firstLine
// (>= 0), lineCount of them (-1: all).
struct LineSource {
  PyObject* fReadline;  // the host's callable, or null to read [fData, fDataEnd)
  const char* fData;
  const char* fDataEnd;
  PyObject* fDataOwner;  // the object whose buffer [fData, fDataEnd) is, or null
  int fFirstLine;
  int fLineCount;
};

// Returns a new list of the lines read, made as `shared` makes them, or nullptr with an
// exception set: no partial list.
PyObject* ReadLineList(LineState* shared, const ReadOptions& options, const LineSource& source);
