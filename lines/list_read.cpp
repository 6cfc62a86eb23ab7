// Reading a source into a list of lines. A failure returns no partial list.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/list_read.h"

#include "assembly/line_builder.h"
#include "assembly/reading_state.h"
#include "assembly/source_reader.h"
#include "assembly/token_list.h"
#include "core/py_ref.h"
#include "core/raw_bytes.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "lines/numbering.h"
#include "lines/shift_table.h"

namespace {

// Reads logical lines into `list` until the stop line (-1: none). While *table is set, the
// lines are the module's own and are numbered with it. A readline may install a create hook
// halfway through: the lines are then the host's objects, never numbered (one may be a line of
// another list, whose numbering it keeps), and *table is cleared, so that the list is never
// recorded and an update refuses it. Returns 0, or -1.
int ReadLines(LineState* shared, ReadingState* state, int64_t stop, PyObject* list,
              ShiftTable** table) {
  while (!(stop != -1 && state->fLineNumber >= stop) && !state->fSource.fAtEnd) {
    LineParts parts;
    const int built = BuildLogicalLine(state, &parts);
    if (built < 0) return -1;
    if (built == 0) continue;
    if (*table && HasCreateHook(shared)) *table = nullptr;
    PyRef line = PyRef::Steal(*table ? CreateNativeLogicalLine(shared->fLineType, parts, true)
                                     : CreateLogicalLine(shared, parts, true));
    GiveUpTokens(state);  // taken over by the call, whatever its outcome
    if (!line) return -1;
    if (line.Get() == Py_None) continue;
    if (*table && NumberLine(*table, AsLine(line.Get()),
                             static_cast<size_t>(PyList_GET_SIZE(list))) != 0)
      return -1;
    if (PyList_Append(list, line.Get()) != 0) return -1;
  }
  return 0;
}

// Records the list that a whole read numbered with `table`, with the text it was read from:
// the buffer, or what readline handed out. Lines that readline cut otherwise than a buffer is
// cut are numbered unlike a read of their text: their list is not recorded, or, where that is
// not known yet, the first update counts the lines and refuses it. Returns 0, or -1 with an
// exception set.
int SealRead(ShiftTable* table, PyObject* list, const ReadOptions& options,
             const LineSource& source, const SourceLines& read, RawBytes* kept) {
  const int64_t pieces = source.fReadline ? KeptPiecesCutAtFeeds(&read) : -1;
  if (source.fReadline && pieces < 0) return 0;
  KeptText text{};
  if ((source.fReadline ? KeepCollectedText(kept, &text)
                        : KeepText(source.fDataOwner, source.fData, source.fDataEnd, &text)) != 0)
    return -1;
  const int status = SealNumbering(table, list, &text, options, pieces);
  ReleaseKeptText(&text);  // left empty when the table took it
  return status;
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
  RawBytes kept;
  InitRawBytes(&kept);
  if (source.fFirstLine == 0 && whole && !HasCreateHook(shared)) {
    table = NewShiftTable();
    if (!table) {
      ReleaseReadingState(&state);
      return PyErr_NoMemory();
    }
    if (source.fReadline) KeepSourceText(&state.fSource, &kept);
  }
  ShiftTable* numbering = table;  // cleared when a hook takes over
  int status = ReadLines(shared, &state, stop, list.Get(), &numbering);
  if (status == 0 && numbering)
    status = SealRead(numbering, list.Get(), options, source, state.fSource, &kept);
  ReleaseReadingState(&state);
  ReleaseRawBytes(&kept);
  if (table) DropShiftTable(table);
  return status == 0 ? list.Release() : nullptr;
}
