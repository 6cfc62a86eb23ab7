// Updating a list of lines after an edit of the text it was read from: only the lines that the
// edit can affect are read again, and every other line keeps its object.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "assembly/line_parts.h"
#include "lines/line_state.h"

// The edit, in physical lines, each count >= 0: [fFirst, fFirst + fOldCount) of the old text
// became [fFirst, fFirst + fNewCount) of the new one.
struct Edit {
  int64_t fFirst;
  int64_t fOldCount;
  int64_t fNewCount;
  int64_t Delta() const { return fNewCount - fOldCount; }
};

// Makes `lines`, a list that a full read or an earlier update left, what a full read of the new
// text [data, end) gives; new lines are made as `shared` makes them. Returns a new (index,
// removed, added) tuple: from index on, `removed` old lines went and the list `added` took their
// place. Returns nullptr with an exception set and `lines` exactly as it was: ValueError for an
// edit outside the text, for lines that do not fit it, or for a list that the host changed
// since. No host code may run during the call (where an allocation can start a collection, the
// caller holds the collector off), and no create hook may be installed.
PyObject* UpdateLineList(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         const Edit& edit, const char* data, const char* end);
