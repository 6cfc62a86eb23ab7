// Reading a source into a list of lines. A failure returns no partial list.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/list_read.h"

#include "assembly/line_builder.h"
#include "assembly/reading_state.h"
#include "assembly/token_list.h"
#include "core/py_ref.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "lines/numbering.h"
#include "lines/shift_table.h"

namespace {

// Reads logical lines into `list` until the stop line (-1: none), numbering them with `table`
// when there is one. Returns 0, or -1.
int ReadLines(LineState* shared, ReadingState* state, int64_t stop, PyObject* list,
              ShiftTable* table) {
  while (!(stop != -1 && state->fLineNumber >= stop) && !state->fSource.fAtEnd) {
    LineParts parts;
    const int built = BuildLogicalLine(state, &parts);
    if (built < 0) return -1;
    if (built == 0) continue;
    PyRef line = PyRef::Steal(CreateLogicalLine(shared, parts, true));
    GiveUpTokens(state);  // taken over by the call, whatever its outcome
    if (!line) return -1;
    if (line.Get() == Py_None) continue;
    // A readline may install a create hook halfway through: its objects are not numbered, and
    // an update refuses the list from then on, as it refuses every list while a hook is set.
    if (table && IsLogicalLine(line.Get()) &&
        NumberLine(table, AsLine(line.Get()), static_cast<size_t>(PyList_GET_SIZE(list))) != 0)
      return -1;
    if (PyList_Append(list, line.Get()) != 0) return -1;
  }
  return 0;
}

}  // namespace

PyObject* ReadLineList(LineState* shared, const ReadOptions& options, const LineSource& source) {
  PyRef list = PyRef::Steal(PyList_New(0));
  if (!list) return nullptr;
  const bool whole = source.fLineCount == -1;
  ReadingState state;
  if (source.fReadline) {
    InitReadlineReading(&state, options, source.fReadline, source.fFirstLine);
  } else {
    InitBufferReading(&state, options, source.fData, source.fData, source.fDataEnd,
                      source.fFirstLine, whole);
  }
  // Counted in 64 bits, so that no sum of the two arguments wraps; -1 means no stop line.
  const int64_t stop = whole ? -1 : static_cast<int64_t>(source.fFirstLine) + source.fLineCount;
  // A whole read is numbered as it is built, so that the first update of the list need not
  // walk it; a window cannot be updated, and a hook's lines are not ours.
  ShiftTable* table = nullptr;
  if (source.fFirstLine == 0 && whole && !HasCreateHook(shared)) {
    table = NewShiftTable();
    if (!table) {
      ReleaseReadingState(&state);
      return PyErr_NoMemory();
    }
  }
  int status = ReadLines(shared, &state, stop, list.Get(), table);
  ReleaseReadingState(&state);
  if (table) {
    if (status == 0) status = SealNumbering(table, list.Get());
    DropShiftTable(table);
  }
  return status == 0 ? list.Release() : nullptr;
}
