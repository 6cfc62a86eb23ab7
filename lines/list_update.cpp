// Updating a list of lines after an edit.
//
// Why a partial re-read gives what a full read gives: the reader restarts afresh at the first
// physical line of every logical line, and a logical line depends only on its own physical
// lines and, when it ended open, on the next one, which it read to decide that it ended. So
// re-reading from the first line whose reading could have seen the edit, up to the first place
// after the edit where the old read also started afresh, gives what a full read gives; every
// other line keeps its object, and its annotations, with the lines after the edit moved by the
// change in the line count.
//
// Why the old lines can be trusted: all of the above holds of the lines as the last read or
// update left them, numbered by their shared table. The table records the list and its items
// then, and notes every line that leaves its numbering since (a line released, numbered for
// another list, or given another range). An update goes on only with the very list, holding
// the very lines, of that record; any other list is refused before anything changes. Every
// check and allocation comes before the list changes, and no host code runs during the call,
// so a refusal leaves the list exactly as it was.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/list_update.h"

#include <cstdint>
#include <cstring>

#include "assembly/line_builder.h"
#include "assembly/reading_state.h"
#include "assembly/source_reader.h"
#include "assembly/token_list.h"
#include "core/py_ref.h"
#include "lines/construction.h"
#include "lines/logical_line.h"
#include "lines/numbering.h"
#include "lines/shift_table.h"

namespace {

// The lines a re-read adds join the group before them while it holds no more than this: an
// update moves the later members of its own group one by one, and every later group as a whole.
constexpr size_t kGroupLimit = 64;

// Item i of a list that is as the table numbering it recorded: one of our lines.
LogicalLine* LineAt(PyObject* lines, Py_ssize_t i) { return AsLine(PyList_GET_ITEM(lines, i)); }

int64_t EndOf(const LogicalLine* line) { return FirstLineOf(line) + line->fLineCount; }

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
    if (FirstLineOf(LineAt(lines, middle)) < number) {
      low = middle + 1;
    } else {
      high = middle;
    }
  }
  return low;
}

// Whether reading the new text from physical line `number` goes on as the old read did from
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

int RefuseChangedList() {
  PyErr_SetString(PyExc_ValueError,
                  "the list was changed since it was read or last updated; read it again");
  return -1;
}

// Numbers the list's lines afresh in a new table, regrouped in order. Returns the table, with
// the caller's hold, or nullptr with MemoryError set and the lines as they were.
ShiftTable* Regroup(PyObject* lines) {
  const auto size = static_cast<size_t>(PyList_GET_SIZE(lines));
  ShiftTable* table = NewShiftTable();
  // Every allocation first: a failure then leaves the lines in the numbering they share.
  if (!table || ReserveGroups(table, size / kGroupLines + 1) != 0 ||
      ReserveItems(table, size) != 0) {
    if (table) DropShiftTable(table);
    PyErr_NoMemory();
    return nullptr;
  }
  for (size_t i = 0; i < size; i++)
    NumberLine(table, AsLine(PyList_GET_ITEM(lines, i)), i);  // cannot fail: room is reserved
  SealNumbering(table, lines);  // cannot fail either
  return table;
}

// The table that numbers a list that is not empty, with a hold for the caller: the one its
// lines share, while the list holds exactly what the last read or update left in it; regrouped
// when edits have split its groups so finely that moving them would cost more than numbering
// them again. A list changed since is refused: nothing short of reading the text again would
// prove that its lines still fit it. Returns nullptr with an exception set.
ShiftTable* TableFor(PyObject* lines) {
  const Py_ssize_t size = PyList_GET_SIZE(lines);
  PyObject* first = PyList_GET_ITEM(lines, 0);
  ShiftTable* table = IsLogicalLine(first) ? AsLine(first)->fShiftTable : nullptr;
  if (!table || !ListIsAsNumbered(table, lines)) {
    RefuseChangedList();
    return nullptr;
  }
  if (table->fCount > 2 * (static_cast<size_t>(size) / kGroupLines) + 64) return Regroup(lines);
  HoldShiftTable(table);
  return table;
}

// Where physical line `number` starts, when the text up to it is as the lines were read: from
// the nearest line at or before it, whose offset the read recorded, over the lines in between.
// Returns nullptr with ValueError set when the lines were not read from this text; *whole
// tells whether the text has that many lines.
const char* PhysicalLineStart(PyObject* lines, const char* data, const char* end, int64_t number,
                              bool* whole) {
  const Py_ssize_t next = FirstLineFrom(lines, number + 1);
  const LogicalLine* known = next > 0 ? LineAt(lines, next - 1) : nullptr;
  if (known && SourceOffsetOf(known) > end - data) {
    RefuseLines();
    return nullptr;
  }
  const int64_t count = number - (known ? FirstLineOf(known) : 0);
  int64_t passed = 0;
  const char* at = SkipLines(known ? data + SourceOffsetOf(known) : data, end, count, &passed);
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
  return seen > edit.fFirst ? FirstLineOf(before) : edit.fFirst;
}

// Reads the new text from physical line `start` until the reader starts afresh after the edit
// at a place where the old read also did, or the text ends. Appends the lines read to `added`
// and stores the new number of the line where reading stopped. Returns 0, or -1.
int ReRead(const LineState* shared, const ReadOptions& options, PyObject* lines, const Edit& edit,
           const char* data, const char* from, const char* dataEnd, int64_t start,
           PyObject* added, int64_t* stop, int64_t* stopOffset) {
  ReadingState state;
  InitBufferReading(&state, options, data, from, dataEnd, start, false);
  int status = 0;
  const int64_t editEnd = edit.fFirst + edit.fNewCount;
  while (!state.fSource.fAtEnd && status == 0) {
    if (state.fLineNumber >= editEnd &&
        ReadsOnAsBefore(lines, state.fLineNumber, state.fLineNumber - edit.Delta()))
      break;
    LineParts parts;
    const int built = BuildLogicalLine(&state, &parts);
    if (built <= 0) {
      status = built;
      continue;
    }
    PyRef line = PyRef::Steal(CreateNativeLogicalLine(shared->fLineType, parts, true));
    GiveUpTokens(&state);  // taken over by the call, whatever its outcome
    if (!line || PyList_Append(added, line.Get()) != 0) status = -1;
  }
  *stop = state.fSource.fAtEnd ? INT64_MAX : state.fLineNumber;
  *stopOffset = NextLineOffset(&state.fSource);
  ReleaseReadingState(&state);
  return status;
}

// Inserts groups for `count` lines at `position` in the order, and attaches the lines from
// index `from` of the list to them. Room for the groups must have been reserved.
void GroupNewLines(PyObject* lines, ShiftTable* table, Py_ssize_t from, Py_ssize_t count,
                   size_t position) {
  uint32_t group = 0;
  for (Py_ssize_t i = 0; i < count; i++) {
    if (static_cast<size_t>(i) % kGroupLines == 0) group = InsertGroup(table, position++);
    AttachLine(AsLine(PyList_GET_ITEM(lines, from + i)), table, group);
  }
}

// After the list's slice from `index` took the `added` new lines, which are not numbered yet:
// numbers them, and moves every later line by the edit. The new lines join the group of the
// line before them, or groups of their own; the later lines of that group move one by one (to
// a group of their own when the new lines did not join), and every later group as a whole.
// Cannot fail: the table has room for ReservedGroups(added) more groups.
void Renumber(PyObject* lines, ShiftTable* table, Py_ssize_t index, Py_ssize_t added,
              int64_t lineDelta, int64_t byteDelta) {
  const Py_ssize_t size = PyList_GET_SIZE(lines);
  const Py_ssize_t after = index + added;
  LogicalLine* before = index > 0 ? LineAt(lines, index - 1) : nullptr;
  LogicalLine* next = after < size ? LineAt(lines, after) : nullptr;
  const bool join = before && table->fGroups[before->fGroup].fMembers +
                                      static_cast<size_t>(added) <= kGroupLimit;
  size_t moveFrom = table->fCount;  // the first group that moves as a whole
  if (next) {
    const uint32_t group = next->fGroup;
    moveFrom = table->fGroups[group].fPosition;
    if (before && before->fGroup == group) {  // the group holds lines on both sides
      const uint32_t target = join ? group : InsertGroup(table, moveFrom + 1);
      for (Py_ssize_t i = after; i < size; i++) {
        LogicalLine* line = LineAt(lines, i);
        if (line->fGroup != group) break;
        MoveLine(line, lineDelta, byteDelta);
        if (!join) {
          DetachLine(line);
          AttachLine(line, table, target);
        }
      }
      moveFrom = table->fGroups[target].fPosition + 1;
    }
  }
  ShiftGroupsFrom(table, moveFrom, lineDelta, byteDelta);
  if (join) {
    for (Py_ssize_t i = index; i < after; i++)
      AttachLine(AsLine(PyList_GET_ITEM(lines, i)), table, before->fGroup);
  } else {
    const size_t position = before ? table->fGroups[before->fGroup].fPosition + 1
                            : next ? table->fGroups[next->fGroup].fPosition
                                   : table->fCount;
    GroupNewLines(lines, table, index, added, position);
  }
}

// The groups that Renumber may make for `added` new lines.
size_t ReservedGroups(Py_ssize_t added) {
  return 1 + (static_cast<size_t>(added) + kGroupLines - 1) / kGroupLines;
}

// Updates `lines`, numbered by `table`, for the edit, from the new text [data, end). Returns
// the result, or nullptr with an exception set and `lines` unchanged.
PyObject* UpdateNumbered(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         ShiftTable* table, const Edit& edit, const char* data, const char* end) {
  const int64_t start = ReReadStart(lines, edit);
  bool whole = true;
  const char* from = PhysicalLineStart(lines, data, end, start, &whole);
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
  if (!added || ReRead(shared, options, lines, edit, data, from, end, start, added.Get(), &stop,
                      &stopOffset) != 0)
    return nullptr;
  // Old lines from the start up to where the re-read stopped, in the old numbering, go. The
  // ones after it keep their text, moved by the bytes and the lines that the edit changed.
  const Py_ssize_t size = PyList_GET_SIZE(lines);
  const Py_ssize_t index = FirstLineFrom(lines, start);
  const Py_ssize_t kept = stop == INT64_MAX ? size : FirstLineFrom(lines, stop - edit.Delta());
  int64_t byteDelta = 0;
  if (kept < size) {
    const LogicalLine* next = LineAt(lines, kept);
    const char* at = SkipLines(data + stopOffset, end, FirstLineOf(next) + edit.Delta() - stop,
                               &passed);
    byteDelta = (at - data) - SourceOffsetOf(next);
    if (SourceOffsetOf(LineAt(lines, size - 1)) + byteDelta >= end - data) {  // past the text
      RefuseLines();
      return nullptr;
    }
  }
  const Py_ssize_t count = PyList_GET_SIZE(added.Get());
  PyRef result = PyRef::Steal(Py_BuildValue("nnO", index, kept - index, added.Get()));
  if (!result) return nullptr;
  if (ReserveGroups(table, ReservedGroups(count)) != 0 ||
      ReserveItems(table, static_cast<size_t>(size - (kept - index) + count)) != 0)
    return PyErr_NoMemory();
  // The old lines stay alive until the list is renumbered: releasing them may run a host's
  // code, which must find the list whole.
  PyRef removed = PyRef::Steal(PyList_GetSlice(lines, index, kept));
  if (!removed || PyList_SetSlice(lines, index, kept, added.Get()) != 0) return nullptr;
  for (Py_ssize_t i = 0; i < kept - index; i++) DetachLine(LineAt(removed.Get(), i));
  Renumber(lines, table, index, count, edit.Delta(), byteDelta);
  SealReplacedLines(table, lines, static_cast<size_t>(index), static_cast<size_t>(kept - index),
                    static_cast<size_t>(count));
  return result.Release();
}

}  // namespace

PyObject* UpdateLineList(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         const Edit& edit, const char* data, const char* end) {
  if (PyList_GET_SIZE(lines) > 0) {
    ShiftTable* table = TableFor(lines);
    if (!table) return nullptr;
    PyObject* result = UpdateNumbered(shared, options, lines, table, edit, data, end);
    DropShiftTable(table);
    return result;
  }
  // An empty list proves nothing about the text it came from: the new text is read in full, as
  // an edit of all of it, into a new numbering.
  int64_t total = 0;
  SkipLines(data, end, INT64_MAX, &total);
  if (edit.fFirst + edit.fNewCount > total) {
    PyErr_SetString(PyExc_ValueError, "the edit lies outside the text");
    return nullptr;
  }
  ShiftTable* table = NewShiftTable();
  if (!table) return PyErr_NoMemory();
  const Edit whole{.fFirst = 0, .fOldCount = 0, .fNewCount = total};
  PyObject* result = UpdateNumbered(shared, options, lines, table, whole, data, end);
  DropShiftTable(table);
  return result;
}

