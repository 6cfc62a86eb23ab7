// Updating a list of lines after an edit.
//
// Why a partial re-read gives what a full read gives: the reader restarts afresh at the first
// physical line of every logical line, and a logical line depends only on its own physical
// lines and, when it ended open, on the next one, which it read to decide that it ended. So
// re-reading from the first line whose reading could have seen the edit, up to the first place
// after the edit where the old read also started afresh, gives what a full read gives; every
// other line keeps its object, and its annotations, with the lines after the edit moved by the
// change in the line count and in the byte count.
//
// Why the old lines can be trusted: all of the above holds of the lines as the last read or
// update left them, numbered by their shared table. The table records the list and its items
// then, and notes every line that leaves its numbering since (a line released, numbered for
// another list, or given another range). An update goes on only with the very list, holding
// the very lines, of that record, and with the options they were read with; any other list is
// refused before anything changes.
//
// Why the edit can be trusted: the record keeps the text the lines were read from, and the
// lines outside the edit that the host describes are compared with it byte for byte, before
// anything changes. Only then are they what the old read made of those very lines. Every check
// and allocation comes before the list changes, and no host code runs during the call, so a
// refusal leaves the list exactly as it was.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/list_update.h"

#include <cstdint>
#include <string_view>

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

// The text a table records; empty for the new table of an empty list.
std::string_view RecordedText(const ShiftTable* table) { return table->fText.View(); }

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

// Returns the index of the first line that starts after byte `offset` of the text read.
Py_ssize_t FirstLineAfter(PyObject* lines, int64_t offset) {
  Py_ssize_t low = 0;
  Py_ssize_t high = PyList_GET_SIZE(lines);
  while (low < high) {
    const Py_ssize_t middle = low + (high - low) / 2;
    if (SourceOffsetOf(LineAt(lines, middle)) <= offset) {
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

int Refuse(const char* why) {
  PyErr_SetString(PyExc_ValueError, why);
  return -1;
}

constexpr char kChangedList[] =
    "the list was changed since it was read or last updated; read it again";
constexpr char kOtherOptions[] =
    "the list was read with other options than this parser's; update it with a parser made "
    "with the same options";
constexpr char kOutsideText[] = "the edit lies outside the text";
constexpr char kWrongEdit[] =
    "the edit does not describe the change: outside the lines it names, the new text is not "
    "the old one";

// The record of a list that is not empty: the table that its first item shares, if any.
ShiftTable* RecordOf(PyObject* lines) {
  PyObject* first = PyList_GET_ITEM(lines, 0);
  return IsLogicalLine(first) ? AsLine(first)->fShiftTable : nullptr;
}

// Refuses a list that is not exactly as the last read or update left it, or that was read with
// other options. Returns 0, or -1 with ValueError set.
int CheckRecord(ShiftTable* table, PyObject* lines, const ReadOptions& options) {
  // Nothing short of reading the text again would prove that a changed list still fits it.
  if (!table || !ListIsAsNumbered(table, lines)) return Refuse(kChangedList);
  if (!(table->fOptions == options)) return Refuse(kOtherOptions);
  // A readline that handed out two lines in one piece numbered them as one: such a list never
  // fits its text, and is refused from now on.
  if (table->fUnprovenLines >= 0) {
    if (CountLines(RecordedText(table)) != table->fUnprovenLines) {
      table->fStale = true;
      return Refuse(kChangedList);
    }
    table->fUnprovenLines = -1;
  }
  return 0;
}

// Where physical line `number` of the text read starts: from the nearest line at or before it,
// whose offset the read recorded, over the lines in between. *whole, unless null, tells whether
// the text has that many lines.
size_t OldLineStart(PyObject* lines, std::string_view old, int64_t number, bool* whole) {
  const Py_ssize_t next = FirstLineFrom(lines, number + 1);
  const LogicalLine* known = next > 0 ? LineAt(lines, next - 1) : nullptr;
  const char* from = old.data() + (known ? SourceOffsetOf(known) : 0);
  const int64_t count = number - (known ? FirstLineOf(known) : 0);
  int64_t passed = 0;
  const char* at = SkipLines(from, old.data() + old.size(), count, &passed);
  if (whole) *whole = passed == count;
  return static_cast<size_t>(at - old.data());
}

// The number of the physical line of the text read that starts at byte `offset`.
int64_t OldLineNumber(PyObject* lines, std::string_view old, size_t offset) {
  const Py_ssize_t next = FirstLineAfter(lines, static_cast<int64_t>(offset));
  const LogicalLine* known = next > 0 ? LineAt(lines, next - 1) : nullptr;
  const size_t from = known ? static_cast<size_t>(SourceOffsetOf(known)) : 0;
  return (known ? FirstLineOf(known) : 0) + CountLines(old.substr(from, offset - from));
}

// The edit from the old text, that `lines` were read from, to the new one: the told edit once
// it is proved true, or the narrowest true one. Returns 0 with *edit set, or -1 with ValueError.
int EditOf(PyObject* lines, std::string_view old, std::string_view next, const Edit* told,
           Edit* edit) {
  if (!told) {
    const ChangedBytes change = FindChange(old, next);
    *edit = Edit{
        .fFirst = OldLineNumber(lines, old, change.fStart),
        .fOldCount = CountLines(old.substr(change.fStart, change.fOldEnd - change.fStart)),
        .fNewCount = CountLines(next.substr(change.fStart, change.fNewEnd - change.fStart))};
    return 0;
  }
  bool whole = false;
  const size_t start = OldLineStart(lines, old, told->fFirst, &whole);
  int64_t passed = 0;
  const char* end =
      SkipLines(old.data() + start, old.data() + old.size(), told->fOldCount, &passed);
  if (!whole || passed < told->fOldCount) return Refuse(kOutsideText);
  if (!KeepsAllBut(old, next, start, static_cast<size_t>(end - old.data()), told->fNewCount))
    return Refuse(kWrongEdit);
  *edit = *told;
  return 0;
}

// Numbers the list's lines afresh in a new table, regrouped in order, with the record of the
// old one. Returns the table, with the caller's hold, or nullptr with MemoryError set and the
// lines as they were.
ShiftTable* Regroup(PyObject* lines, ShiftTable* old) {
  const auto size = static_cast<size_t>(PyList_GET_SIZE(lines));
  ShiftTable* table = NewShiftTable();
  // Every allocation first: a failure then leaves the lines in the numbering they share.
  if (!table || ReserveGroups(table, size / kGroupLines + 1) != 0 ||
      ReserveItems(table, size) != 0) {
    if (table) DropShiftTable(table);
    PyErr_NoMemory();
    return nullptr;
  }
  // Taken before the lines leave the old table, which the last of them frees.
  KeptText text = old->fText;
  old->fText = KeptText{};
  const ReadOptions options = old->fOptions;
  for (size_t i = 0; i < size; i++)
    NumberLine(table, AsLine(PyList_GET_ITEM(lines, i)), i);  // cannot fail: room is reserved
  SealNumbering(table, lines, &text, options, -1);            // cannot fail either
  return table;
}

// The table to renumber a recorded list with, with a hold for the caller: its own, or a new one
// when edits have split its groups so finely that moving them would cost more than numbering
// the lines again. Returns nullptr with MemoryError set.
ShiftTable* TableToRenumber(PyObject* lines, ShiftTable* table) {
  const auto size = static_cast<size_t>(PyList_GET_SIZE(lines));
  if (table->fCount > 2 * (size / kGroupLines) + 64) return Regroup(lines, table);
  HoldShiftTable(table);
  return table;
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

// Reads the new text from physical line `start`, at byte `from`, until the reader starts afresh
// after the edit at a place where the old read also did, or the text ends. Appends the lines
// read to `added` and stores the new number of the line where reading stopped. Returns 0, or -1.
int ReRead(const LineState* shared, const ReadOptions& options, PyObject* lines, const Edit& edit,
           std::string_view next, size_t from, int64_t start, PyObject* added, int64_t* stop) {
  ReadingState state;
  InitBufferReading(&state, options, next.data(), next.data() + from, next.data() + next.size(),
                    start, false);
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

// Moves the lines from index `after` on by the edit. Every group after the edit moves as a
// whole. A group that the edit falls inside has its later members moved one by one; unless
// the new lines join that group, those members go to a group of their own just after it.
void MoveLaterLines(PyObject* lines, ShiftTable* table, const LogicalLine* before,
                    Py_ssize_t after, bool join, int64_t lineDelta, int64_t byteDelta) {
  const Py_ssize_t size = PyList_GET_SIZE(lines);
  if (after == size) return;  // the edit ends the list: nothing moves
  const uint32_t group = LineAt(lines, after)->fGroup;
  const size_t position = table->fGroups[group].fPosition;
  if (!before || before->fGroup != group) {  // the edit falls between two groups
    ShiftGroupsFrom(table, position, lineDelta, byteDelta);
    return;
  }
  const uint32_t target = join ? group : InsertGroup(table, position + 1);
  for (Py_ssize_t i = after; i < size && LineAt(lines, i)->fGroup == group; i++) {
    LogicalLine* line = LineAt(lines, i);
    MoveLine(line, lineDelta, byteDelta);
    if (!join) {
      DetachLine(line);
      AttachLine(line, table, target);
    }
  }
  ShiftGroupsFrom(table, table->fGroups[target].fPosition + 1, lineDelta, byteDelta);
}

// Numbers the `added` new lines from index `index`: in the group of the line before them when
// they join it, else in groups of their own just after it, or first in the order.
void NumberNewLines(PyObject* lines, ShiftTable* table, Py_ssize_t index, Py_ssize_t added,
                    const LogicalLine* before, bool join) {
  if (join) {
    for (Py_ssize_t i = index; i < index + added; i++)
      AttachLine(LineAt(lines, i), table, before->fGroup);
    return;
  }
  GroupNewLines(lines, table, index, added,
                before ? table->fGroups[before->fGroup].fPosition + 1 : 0);
}

// After the list's slice from `index` took the `added` new lines, which are not numbered yet:
// moves every later line by the edit, and numbers the new lines. They join the group of the
// line before them while it stays small. Cannot fail: the table has room for
// ReservedGroups(added) more groups.
void Renumber(PyObject* lines, ShiftTable* table, Py_ssize_t index, Py_ssize_t added,
              int64_t lineDelta, int64_t byteDelta) {
  const LogicalLine* before = index > 0 ? LineAt(lines, index - 1) : nullptr;
  const bool join = before && table->fGroups[before->fGroup].fMembers +
                                      static_cast<size_t>(added) <= kGroupLimit;
  MoveLaterLines(lines, table, before, index + added, join, lineDelta, byteDelta);
  NumberNewLines(lines, table, index, added, before, join);
}

// The groups that Renumber may make for `added` new lines.
size_t ReservedGroups(Py_ssize_t added) {
  return 1 + (static_cast<size_t>(added) + kGroupLines - 1) / kGroupLines;
}

// Updates `lines`, numbered by `table`, for the edit, proved true, to the new text [data, end)
// that `owner` holds. Returns the result, or nullptr with an exception set and `lines`
// unchanged.
PyObject* UpdateNumbered(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         ShiftTable* table, const Edit& edit, const char* data, const char* end,
                         PyObject* owner) {
  const std::string_view old = RecordedText(table);
  const std::string_view next(data, static_cast<size_t>(end - data));
  const int64_t start = ReReadStart(lines, edit);
  // The re-read starts before the edit, where the new text is the old one.
  const size_t from = OldLineStart(lines, old, start, nullptr);
  PyRef added = PyRef::Steal(PyList_New(0));
  int64_t stop = 0;
  if (!added ||
      ReRead(shared, options, lines, edit, next, from, start, added.Get(), &stop) != 0)
    return nullptr;
  // Old lines from the start up to where the re-read stopped, in the old numbering, go. The
  // ones after it are in the text after the edit, kept byte for byte: they move by the lines
  // and the bytes that the edit added.
  const Py_ssize_t size = PyList_GET_SIZE(lines);
  const Py_ssize_t index = FirstLineFrom(lines, start);
  const Py_ssize_t kept = stop == INT64_MAX ? size : FirstLineFrom(lines, stop - edit.Delta());
  const int64_t byteDelta = static_cast<int64_t>(next.size()) - static_cast<int64_t>(old.size());
  const Py_ssize_t count = PyList_GET_SIZE(added.Get());
  PyRef result = PyRef::Steal(Py_BuildValue("nnO", index, kept - index, added.Get()));
  if (!result) return nullptr;
  if (ReserveGroups(table, ReservedGroups(count)) != 0 ||
      ReserveItems(table, static_cast<size_t>(size - (kept - index) + count)) != 0)
    return PyErr_NoMemory();
  KeptText text{};
  if (KeepText(owner, data, end, &text) != 0) return nullptr;
  // The old lines stay alive until the list is renumbered: releasing them may run a host's
  // code, which must find the list whole.
  PyRef removed = PyRef::Steal(PyList_GetSlice(lines, index, kept));
  if (!removed || PyList_SetSlice(lines, index, kept, added.Get()) != 0) {
    ReleaseKeptText(&text);
    return nullptr;
  }
  for (Py_ssize_t i = 0; i < kept - index; i++) DetachLine(LineAt(removed.Get(), i));
  Renumber(lines, table, index, count, edit.Delta(), byteDelta);
  SealReplacedLines(table, lines, static_cast<size_t>(index), static_cast<size_t>(kept - index),
                    static_cast<size_t>(count), &text, options);
  return result.Release();
}

// An empty list proves nothing about the text it came from: the new text is read in full, as
// an edit of all of it, into a new numbering.
PyObject* ReadIntoEmpty(const LineState* shared, const ReadOptions& options, PyObject* lines,
                        const Edit* told, const char* data, const char* end, PyObject* owner) {
  const int64_t total = CountLines(std::string_view(data, static_cast<size_t>(end - data)));
  if (told && told->fFirst + told->fNewCount > total) {
    Refuse(kOutsideText);
    return nullptr;
  }
  ShiftTable* table = NewShiftTable();
  if (!table) return PyErr_NoMemory();
  const Edit whole{.fFirst = 0, .fOldCount = 0, .fNewCount = total};
  PyObject* result = UpdateNumbered(shared, options, lines, table, whole, data, end, owner);
  DropShiftTable(table);
  return result;
}

}  // namespace

PyObject* UpdateLineList(const LineState* shared, const ReadOptions& options, PyObject* lines,
                         const Edit* told, const char* data, const char* end, PyObject* owner) {
  if (PyList_GET_SIZE(lines) == 0)
    return ReadIntoEmpty(shared, options, lines, told, data, end, owner);
  ShiftTable* recorded = RecordOf(lines);
  if (CheckRecord(recorded, lines, options) != 0) return nullptr;
  Edit edit{};
  if (EditOf(lines, RecordedText(recorded),
             std::string_view(data, static_cast<size_t>(end - data)), told, &edit) != 0)
    return nullptr;
  ShiftTable* table = TableToRenumber(lines, recorded);
  if (!table) return nullptr;
  PyObject* result = UpdateNumbered(shared, options, lines, table, edit, data, end, owner);
  DropShiftTable(table);
  return result;
}
