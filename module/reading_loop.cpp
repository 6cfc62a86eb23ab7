// The reading loop: asks the builder for one logical line at a time until the input ends or
// the stop line is reached, and builds a line from each. A failure returns no partial list.
// The source is the host's readline, or a buffer that the call keeps locked while it reads.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/reading_loop.h"

#include <cstdint>
#include <cstring>

#include "assembly/line_builder.h"
#include "assembly/reading_state.h"
#include "assembly/token_list.h"
#include "core/py_ref.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "lines/numbering.h"
#include "lines/shift_table.h"
#include "module/parser.h"

namespace {

// Reads logical lines into `list` until the stop line (-1: none), numbering our lines with
// `table` when there is one. Returns 0, or -1.
int ReadLines(ReadingState* state, int64_t stop, PyObject* list, ShiftTable* table) {
  while (!(stop != -1 && state->fLineNumber >= stop) && !state->fAtEnd) {
    LineParts parts;
    const int built = BuildLogicalLine(state, &parts);
    if (built < 0) return -1;
    if (built == 0) continue;
    PyRef line = PyRef::Steal(CreateLogicalLine(parts, true));
    GiveUpTokens(state);  // taken over by the call, whatever its outcome
    if (!line) return -1;
    if (line.Get() == Py_None) continue;
    if (table && Py_TYPE(line.Get()) == &LogicalLineType &&
        NumberLine(table, AsLine(line.Get()), static_cast<size_t>(PyList_GET_SIZE(list))) != 0)
      return -1;
    if (PyList_Append(list, line.Get()) != 0) return -1;
  }
  return 0;
}

// Reads the source through readline, or from [data, dataEnd) when readline is null. Returns a
// new list, or nullptr with an exception set.
PyObject* ReadSource(PyObject* self, PyObject* readline, const char* data, const char* dataEnd,
                     int firstLine, int lineCount) {
  if (firstLine < 0) {  // refused before the host's stream moves
    PyErr_SetString(PyExc_ValueError, "first line must be >= 0");
    return nullptr;
  }
  PyRef list = PyRef::Steal(PyList_New(0));
  if (!list) return nullptr;
  ReadingState state;
  InitReadingState(&state, ParserOptions(self), readline, data, dataEnd, firstLine);
  // A whole buffer read to its end without a NUL byte, the usual case, needs no search of every
  // line for one; a window that stops early is searched line by line, never past its end.
  if (!readline && lineCount == -1)
    state.fMayHoldNul = memchr(data, '\0', static_cast<size_t>(dataEnd - data)) != nullptr;
  // Counted in 64 bits, so that no sum of the two arguments wraps; -1 means no stop line.
  const int64_t stop = lineCount == -1 ? -1 : static_cast<int64_t>(firstLine) + lineCount;
  // A whole read is numbered as it is built, so that the first update of the list need not
  // walk it; a window cannot be updated, and a hook's lines are not ours.
  ShiftTable* table = nullptr;
  if (firstLine == 0 && lineCount == -1 && !HasCreateHook()) {
    table = NewShiftTable();
    if (!table) {
      ReleaseReadingState(&state);
      return PyErr_NoMemory();
    }
  }
  int status = ReadLines(&state, stop, list.Get(), table);
  ReleaseReadingState(&state);
  if (table) {
    if (status == 0) status = SealNumbering(table, list.Get());
    DropShiftTable(table);
  }
  return status == 0 ? list.Release() : nullptr;
}

PyDoc_STRVAR(kGetLogicalLineListDoc,
             "Read logical lines from buffer.  Text is obtained through a readline function that "
             "is the first arguement to this method.  The 2nd & 3rd arguments optional; the 2nd "
             "arg is the line # of the first line read with readline and it defaults to 0.  The "
             "3rd arg is the number of lines to scan for logical lines -- note that if a logical "
             "line continues past the end of this range, more lines will be processed.  If the "
             "3rd arg is not specified, all lines until the end of the file are scanned.");
PyObject* GetLogicalLineList(PyObject* self, PyObject* args) {
  PyObject* readline = nullptr;
  int firstLine = 0;
  int lineCount = -1;
  if (!PyArg_ParseTuple(args, "O|ii:GetLogicalLineList", &readline, &firstLine, &lineCount))
    return nullptr;
  if (!PyCallable_Check(readline)) {
    PyErr_SetString(PyExc_TypeError, "readline arg must be a callable");
    return nullptr;
  }
  return ReadSource(self, readline, nullptr, nullptr, firstLine, lineCount);
}

PyDoc_STRVAR(kGetLogicalLineListFromBufferDoc,
             "Read logical lines from a bytes-like object (bytes, bytearray, memoryview, mmap) "
             "that holds the whole source, as GetLogicalLineList does with the readline of an "
             "io.BytesIO over it, without calling Python code for reading.  The 2nd & 3rd "
             "arguments are the line # of the first line and the number of lines to scan, as for "
             "GetLogicalLineList.  The buffer stays locked while the call runs.");
PyObject* GetLogicalLineListFromBuffer(PyObject* self, PyObject* args) {
  Py_buffer view;
  int firstLine = 0;
  int lineCount = -1;
  // "y*" takes any object with the buffer protocol, and refuses a str with TypeError.
  if (!PyArg_ParseTuple(args, "y*|ii:GetLogicalLineListFromBuffer", &view, &firstLine,
                        &lineCount))
    return nullptr;
  const char* data = static_cast<const char*>(view.buf);
  PyObject* list = ReadSource(self, nullptr, data, data + view.len, firstLine, lineCount);
  PyBuffer_Release(&view);
  return list;
}

}  // namespace

const PyMethodDef kGetLogicalLineListMethod = {"GetLogicalLineList", GetLogicalLineList,
                                               METH_VARARGS, kGetLogicalLineListDoc};
const PyMethodDef kGetLogicalLineListFromBufferMethod = {
    "GetLogicalLineListFromBuffer", GetLogicalLineListFromBuffer, METH_VARARGS,
    kGetLogicalLineListFromBufferDoc};
