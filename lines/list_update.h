// Updating a list of lines after an edit of the text it was read from: only the lines that the
// edit can affect are read again, and every other line keeps its object.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_parts.h"
#include "lines/edit_check.h"
#include "lines/line_state.h"

// Makes `lines`, a list that a full read or an earlier update left, what a full read of the new
// text [data, end) gives, with new lines made as `shared` makes them. `told` is the host's
// description of the edit, proved against the old text that the list's record keeps before
// anything changes; with none, the narrowest true one is found by comparing the two texts. The
// record keeps the new text: `owner`, the object whose buffer it is, when that is a bytes
// object, else a copy. Returns a new (index, removed, added) tuple: from index on, `removed` old
// lines went and the list `added` took their place. Returns nullptr with an exception set and
// `lines` exactly as it was: ValueError for a list that the host changed since, one read with
// other options, or a description that is not true of the two texts. No host code may run during the call (where an allocation can start a collection,
// the caller holds the collector off), and no create hook may be installed.
PyObject* UpdateLineList(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         const Edit* told, const char* data, const char* end, PyObject* owner);
