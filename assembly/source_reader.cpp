// Reading physical lines through readline or from a buffer. The source stays bytes: nothing is
// decoded here.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/source_reader.h"

#include <climits>
#include <cstring>

#include "core/py_ref.h"

namespace {

// Editors on some systems open a UTF-8 file with this mark; it is no part of the source.
constexpr char kByteOrderMark[] = "\xEF\xBB\xBF";
constexpr Py_ssize_t kByteOrderMarkLength = sizeof(kByteOrderMark) - 1;

// Appends bytes to the logical line text, refusing a text that its 32-bit offsets cannot
// address.
int AcceptText(ReadingState* state, const char* bytes, size_t n) {
  if (n >= static_cast<size_t>(INT_MAX) - state->fText.fLength) {
    PyErr_SetString(PyExc_ValueError, "Logical line too long");
    return -1;
  }
  if (AppendBytes(&state->fText, bytes, n) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  return 0;
}

// Takes the next physical line from the source: a readline result (held in `line` while it is
// read), or the buffer up to and including its next line feed, as BytesIO.readline cuts it.
// Returns 0, or -1 with an exception set.
int NextPhysicalLine(ReadingState* state, PyRef* line, const char** bytes, Py_ssize_t* size) {
  if (!state->fReadline) {
    const char* start = state->fData;
    const auto* feed = start == state->fDataEnd
                           ? nullptr
                           : static_cast<const char*>(memchr(
                                 start, '\n', static_cast<size_t>(state->fDataEnd - start)));
    state->fData = feed ? feed + 1 : state->fDataEnd;
    *bytes = start;
    *size = state->fData - start;
    return 0;
  }
  *line = PyRef::Steal(PyObject_CallNoArgs(state->fReadline));
  if (!*line) return -1;
  PyObject* read = line->Get();
  // Anything but bytes (a str included) gets the accessor's TypeError.
  if (!PyBytes_Check(read)) return PyBytes_AsStringAndSize(read, const_cast<char**>(bytes), size);
  *bytes = PyBytes_AS_STRING(read);
  *size = PyBytes_GET_SIZE(read);
  return 0;
}

}  // namespace

int ReadSourceLine(ReadingState* state) {
  TextBuffer* pending = &state->fPending;
  if (pending->fLength > 0) {
    state->fLineOffset = state->fPendingOffset;
    if (AcceptText(state, pending->fData, pending->fLength) != 0) return -1;
    ResetTextBuffer(pending);
    return 0;
  }
  PyRef line;
  const char* bytes = nullptr;
  Py_ssize_t size = 0;
  if (NextPhysicalLine(state, &line, &bytes, &size) != 0) return -1;
  state->fLineOffset = state->fSourceOffset;
  state->fSourceOffset += size;
  if (state->fAtStart) {
    state->fAtStart = 0;
    if (size >= kByteOrderMarkLength && memcmp(bytes, kByteOrderMark, kByteOrderMarkLength) == 0) {
      if (size == kByteOrderMarkLength) return ReadSourceLine(state);  // the mark alone: no line
      bytes += kByteOrderMarkLength;
      size -= kByteOrderMarkLength;
    }
  }
  state->fAtEnd = size == 0;
  if (size == 0) return 0;
  if (state->fMayHoldNul && memchr(bytes, '\0', static_cast<size_t>(size))) {
    PyErr_Format(PyExc_ValueError, "Binary data encountered at lineno %lld while tokenizing",
                 static_cast<long long>(state->fLineNumber));
    return -1;
  }
  return AcceptText(state, bytes, static_cast<size_t>(size));
}
