// Updating a list of lines after an edit. The reader restarts afresh at the first physical
// line of every logical line, and a logical line depends only on its own physical lines and,
// when it ended open, on the next one, which it read to decide that it ended. So re-reading
// from the first line whose reading could have seen the edit, up to the first place after the
// edit where the old read also started afresh, gives what a full read gives; every other line
// keeps its object, and its annotations, with the lines after the edit moved by the change in
// the line count.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/update.h"

#include <cstdint>
#include <cstring>

#include "assembly/line_builder.h"
#include "assembly/reading_state.h"
#include "core/py_ref.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "module/parser.h"

namespace {

// The edit, in physical lines: [fFirst, fFirst + fOldCount) of the old text became
// [fFirst, fFirst + fNewCount) of the new one.
struct Edit {
  int64_t fFirst;
  int64_t fOldCount;
  int64_t fNewCount;
  int64_t Delta() const { return fNewCount - fOldCount; }
};

LogicalLine* LineAt(PyObject* lines, Py_ssize_t i) { return AsLine(PyList_GET_ITEM(lines, i)); }

int64_t EndOf(const LogicalLine* line) { return int64_t{line->fFirstLine} + line->fLineCount; }

// Moves p over `count` physical lines, cut as BytesIO.readline cuts them; stores in *passed
// how many there were before the end.
const char* SkipLines(const char* p, const char* end, int64_t count, int64_t* passed) {
  for (*passed = 0; *passed < count && p < end; ++*passed) {
    const auto* feed = static_cast<const char*>(memchr(p, '\n', static_cast<size_t>(end - p)));
    p = feed ? feed + 1 : end;
  }
  return p;
}

// Returns the index of the first line that starts at or after physical line `number`.
Py_ssize_t FirstLineFrom(PyObject* lines, int64_t number) {
  Py_ssize_t low = 0;
  Py_ssize_t high = PyList_GET_SIZE(lines);
  while (low < high) {
    const Py_ssize_t middle = low + (high - low) / 2;
    if (LineAt(lines, middle)->fFirstLine < number) {
      low = middle + 1;
    } else {
      high = middle;
    }
  }
  return low;
}

// True when reading the new text from physical line `number` goes on as the old read did from
// line `old`: the old read started afresh there (no line runs over it), and neither or both are
// the first line, where a byte-order mark is skipped.
bool ReadsOnAsBefore(PyObject* lines, int64_t number, int64_t old) {
  if ((number == 0) != (old == 0)) return false;
  const Py_ssize_t next = FirstLineFrom(lines, old);
  return next == 0 || EndOf(LineAt(lines, next - 1)) <= old;
}

int RefuseLines() {
  PyErr_SetString(PyExc_ValueError, "lines do not fit the text before the edit");
  return -1;
}

// Checks that `lines` is what this module read: its own line objects, in order, without
// overlaps. Returns 0, or -1 with an exception set.
int CheckLines(PyObject* lines) {
  int64_t end = 0;
  for (Py_ssize_t i = 0; i < PyList_GET_SIZE(lines); i++) {
    PyObject* item = PyList_GET_ITEM(lines, i);
    if (Py_TYPE(item) != &LogicalLineType) {
      PyErr_SetString(PyExc_TypeError, "lines must hold only the LogicalLine objects of a read");
      return -1;
    }
    const LogicalLine* line = AsLine(item);
    if (line->fFirstLine < end || line->fLineCount < 1 || line->fOffset < 0) return RefuseLines();
    end = EndOf(line);
  }
  return 0;
}

// Where physical line `number` starts, when the text up to it is as the lines were read: from
// the nearest line at or before it, whose offset the read recorded, over the lines in between.
// Returns nullptr with ValueError set when the lines were not read from this text; *whole
// tells whether the text has that many lines.
const char* StartOf(PyObject* lines, const char* data, const char* end, int64_t number,
                    bool* whole) {
  const Py_ssize_t next = FirstLineFrom(lines, number + 1);
  const LogicalLine* known = next > 0 ? LineAt(lines, next - 1) : nullptr;
  if (known && known->fOffset > end - data) {
    RefuseLines();
    return nullptr;
  }
  const int64_t count = number - (known ? known->fFirstLine : 0);
  int64_t passed = 0;
  const char* at = SkipLines(known ? data + known->fOffset : data, end, count, &passed);
  *whole = passed == count;
  return at;
}

// Where the re-read starts: the first line whose reading could have seen the edited lines.
// Only the last line before the edit can have: it runs into the edit, or ended open and so
// read the first edited line to decide that it ended.
int64_t ReReadStart(PyObject* lines, const Edit& edit) {
  const Py_ssize_t next = FirstLineFrom(lines, edit.fFirst);
  if (next == 0) return edit.fFirst;
  const LogicalLine* before = LineAt(lines, next - 1);
  const int64_t seen = EndOf(before) + ((before->fFlags & kIncompleteFlag) ? 1 : 0);
  return seen > edit.fFirst ? before->fFirstLine : edit.fFirst;
}

// Reads the new text from physical line `start` until the reader starts afresh after the edit
// at a place where the old read also did, or the text ends. Appends the lines read to `added`
// and stores the new number of the line where reading stopped. Returns 0, or -1.
int ReRead(PyObject* parser, PyObject* lines, const Edit& edit, const char* data,
           const char* dataEnd, int64_t start, PyObject* added, int64_t* stop,
           int64_t* stopOffset) {
  bool whole = true;
  const char* from = StartOf(lines, data, dataEnd, start, &whole);
  if (!from) return -1;
  ReadingState state;
  if (InitReadingState(&state, ParserOptions(parser), nullptr, from, dataEnd, start) != 0)
    return -1;
  state.fAtStart = start == 0;  // a byte-order mark counts only at the start of the text
  state.fSourceOffset = from - data;
  int status = 0;
  const int64_t editEnd = edit.fFirst + edit.fNewCount;
  while (!state.fAtEnd &&
         !(state.fLineNumber >= editEnd &&
           ReadsOnAsBefore(lines, state.fLineNumber, state.fLineNumber - edit.Delta()))) {
    LineParts parts;
    const int built = BuildLogicalLine(&state, &parts);
    if (built < 0) {
      status = -1;
      break;
    }
    if (built == 0) continue;
    PyRef line = PyRef::Steal(CreateNativeLogicalLine(parts));
    if (!line || PyList_Append(added, line.Get()) != 0) {
      status = -1;
      break;
    }
  }
  *stop = state.fAtEnd ? INT64_MAX : state.fLineNumber;
  *stopOffset = state.fPending.fLength ? state.fPendingOffset : state.fSourceOffset;
  ReleaseReadingState(&state);
  return status;
}

// Moves the lines from index `from` on by `lineDelta` physical lines and `byteDelta` bytes.
void MoveLines(PyObject* lines, Py_ssize_t from, int64_t lineDelta, int64_t byteDelta) {
  for (Py_ssize_t i = from; i < PyList_GET_SIZE(lines); i++) {
    LineAt(lines, i)->fFirstLine += static_cast<int32_t>(lineDelta);
    LineAt(lines, i)->fOffset += byteDelta;
  }
}

// Updates `lines` for the edit, from the new text [data, end). Returns the result, or nullptr
// with an exception set and `lines` unchanged.
PyObject* Update(PyObject* parser, PyObject* lines, const Edit& edit, const char* data,
                 const char* end) {
  if (CheckLines(lines) != 0) return nullptr;
  const int64_t start = ReReadStart(lines, edit);
  bool whole = true;
  const char* from = StartOf(lines, data, end, start, &whole);
  if (!from) return nullptr;
  int64_t passed = 0;  // the new lines must be in the text: count them, and no further
  SkipLines(from, end, edit.fFirst + edit.fNewCount - start, &passed);
  if (!whole || passed < edit.fFirst + edit.fNewCount - start) {
    PyErr_SetString(PyExc_ValueError, "the edit lies outside the text");
    return nullptr;
  }
  PyRef added = PyRef::Steal(PyList_New(0));
  int64_t stop = 0;
  int64_t stopOffset = 0;
  if (!added ||
      ReRead(parser, lines, edit, data, end, start, added.Get(), &stop, &stopOffset) != 0)
    return nullptr;
  // Old lines from the start up to where the re-read stopped, in the old numbering, go. The
  // ones after it keep their text, moved by the bytes and the lines that the edit changed.
  const Py_ssize_t index = FirstLineFrom(lines, start);
  const Py_ssize_t kept = stop == INT64_MAX ? PyList_GET_SIZE(lines)
                                            : FirstLineFrom(lines, stop - edit.Delta());
  int64_t byteDelta = 0;
  if (kept < PyList_GET_SIZE(lines)) {
    const LogicalLine* next = LineAt(lines, kept);
    const char* at = SkipLines(data + stopOffset, end, next->fFirstLine + edit.Delta() - stop,
                               &passed);
    byteDelta = (at - data) - next->fOffset;
    const LogicalLine* last = LineAt(lines, PyList_GET_SIZE(lines) - 1);
    if (last->fOffset + byteDelta >= end - data) {  // the lines run past the new text
      RefuseLines();
      return nullptr;
    }
  }
  PyRef result = PyRef::Steal(Py_BuildValue("nnO", index, kept - index, added.Get()));
  if (!result) return nullptr;
  // The later lines move before the list changes, and back if it cannot: the old lines that the
  // list releases may run a host's code, which must find the list whole.
  MoveLines(lines, kept, edit.Delta(), byteDelta);
  if (PyList_SetSlice(lines, index, kept, added.Get()) != 0) {
    MoveLines(lines, kept, -edit.Delta(), -byteDelta);
    return nullptr;
  }
  return result.Release();
}

PyDoc_STRVAR(kUpdateLogicalLineListDoc,
             "Update a list of logical lines after an edit of the text it was read from.  "
             "Arguments: the list (read by this parser from line 0, maybe updated before), the "
             "whole new text as a bytes-like object, the first edited physical line (from 0), "
             "the number of physical lines the edit replaced, and the number it put in their "
             "place.  Only the lines the edit can affect are read again; every other line keeps "
             "its object, and those after the edit move by the change in the line count.  The "
             "list is changed in place; the result is (index, removed, added): from index on, "
             "removed lines went and the list added took their place.");
PyObject* UpdateLogicalLineList(PyObject* self, PyObject* args) {
  PyObject* lines = nullptr;
  Py_buffer view;
  int first = 0;
  int oldCount = 0;
  int newCount = 0;
  if (!PyArg_ParseTuple(args, "O!y*iii:UpdateLogicalLineList", &PyList_Type, &lines, &view,
                        &first, &oldCount, &newCount))
    return nullptr;
  struct Release {
    Py_buffer* fView;
    ~Release() { PyBuffer_Release(fView); }
  } release{&view};
  if (HasCreateHook()) {
    PyErr_SetString(PyExc_TypeError,
                    "UpdateLogicalLineList needs the module's own lines, and a create hook is "
                    "installed");
    return nullptr;
  }
  const Edit edit{.fFirst = first, .fOldCount = oldCount, .fNewCount = newCount};
  if (first < 0 || oldCount < 0 || newCount < 0) {
    PyErr_SetString(PyExc_ValueError, "the edit lies outside the text");
    return nullptr;
  }
  // Reading allocates, and an allocation may set off a collection, which may run a host's
  // finalizer that changes the list under the update; the collector waits until it is done.
  const int collecting = PyGC_Disable();
  const char* data = static_cast<const char*>(view.buf);
  PyObject* result = Update(self, lines, edit, data, data + view.len);
  if (collecting) PyGC_Enable();
  return result;
}

}  // namespace

const PyMethodDef kUpdateLogicalLineListMethod = {
    "UpdateLogicalLineList", UpdateLogicalLineList, METH_VARARGS, kUpdateLogicalLineListDoc};
