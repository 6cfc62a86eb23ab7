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
int AcceptText(SourceLines* source, const char* bytes, size_t n) {
  if (n >= static_cast<size_t>(INT_MAX) - source->fText.fLength) {
    PyErr_SetString(PyExc_ValueError, "Logical line too long");
    return -1;
  }
  if (AppendBytes(&source->fText, bytes, n) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  return 0;
}

// Takes the next physical line from the source: a readline result (held in `line` while it is
// read), or the buffer up to and including its next line feed, as BytesIO.readline cuts it.
// Returns 0, or -1 with an exception set.
int NextPhysicalLine(SourceLines* source, PyRef* line, const char** bytes, Py_ssize_t* size) {
  if (!source->fReadline) {
    const char* start = source->fData;
    const auto* feed = start == source->fDataEnd
                           ? nullptr
                           : static_cast<const char*>(memchr(
                                 start, '\n', static_cast<size_t>(source->fDataEnd - start)));
    source->fData = feed ? feed + 1 : source->fDataEnd;
    *bytes = start;
    *size = source->fData - start;
    return 0;
  }
  *line = PyRef::Steal(PyObject_CallNoArgs(source->fReadline));
  if (!*line) return -1;
  PyObject* read = line->Get();
  // Anything but bytes (a str included) gets the accessor's TypeError.
  if (!PyBytes_Check(read)) return PyBytes_AsStringAndSize(read, const_cast<char**>(bytes), size);
  *bytes = PyBytes_AS_STRING(read);
  *size = PyBytes_GET_SIZE(read);
  return 0;
}

// Copies a piece that readline handed out to the kept text, if one is kept, and counts it. A
// piece is one line as BytesIO.readline cuts one when it ends at its only line feed, or is the
// last; the last byte tells the first half here, and the count of the pieces the second, once
// the text is whole. Returns 0, or -1 with MemoryError set.
int KeepPiece(SourceLines* source, const char* bytes, Py_ssize_t size) {
  if (!source->fKept || size == 0) return 0;
  const auto n = static_cast<size_t>(size);
  if (source->fKeptOpen) source->fCutAtFeeds = 0;
  source->fKeptOpen = bytes[n - 1] != '\n';
  source->fKeptPieces++;
  if (AppendRawBytes(source->fKept, bytes, n) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  return 0;
}

}  // namespace

void InitReadlineSource(SourceLines* source, PyObject* readline) {
  source->fReadline = readline;
  source->fData = nullptr;
  source->fDataEnd = nullptr;
  InitTextBuffer(&source->fPending);
  source->fAtEnd = 0;
  source->fAtStart = 1;
  source->fMayHoldNul = 1;
  source->fSourceOffset = 0;
  source->fPendingOffset = 0;
  source->fLineOffset = 0;
  InitTextBuffer(&source->fText);
  source->fKept = nullptr;
  source->fKeptOpen = 0;
  source->fCutAtFeeds = 1;
  source->fKeptPieces = 0;
}

void KeepSourceText(SourceLines* source, RawBytes* kept) { source->fKept = kept; }

void InitBufferSource(SourceLines* source, const char* data, const char* from,
                      const char* dataEnd, bool whole) {
  InitReadlineSource(source, nullptr);
  source->fData = from;
  source->fDataEnd = dataEnd;
  source->fAtStart = from == data;
  source->fSourceOffset = from - data;
  // A whole buffer without a NUL byte, the usual case, needs no search of every line for one;
  // a read that may stop early searches line by line, never past where it stops.
  if (whole)
    source->fMayHoldNul = memchr(from, '\0', static_cast<size_t>(dataEnd - from)) != nullptr;
}

void ReleaseSource(SourceLines* source) {
  ResetTextBuffer(&source->fText);
  ResetTextBuffer(&source->fPending);
}

int HandBackLine(SourceLines* source, int lineStart) {
  TextBuffer* text = &source->fText;
  // The pending line is empty here: the read of the line just took from it.
  if (AppendBytes(&source->fPending, text->fData + lineStart,
                  text->fLength - static_cast<size_t>(lineStart)) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  TruncateText(text, static_cast<size_t>(lineStart));
  source->fPendingOffset = source->fLineOffset;
  return 0;
}

int ReadSourceLine(SourceLines* source, int64_t lineNumber) {
  TextBuffer* pending = &source->fPending;
  if (pending->fLength > 0) {
    source->fLineOffset = source->fPendingOffset;
    if (AcceptText(source, pending->fData, pending->fLength) != 0) return -1;
    ResetTextBuffer(pending);
    return 0;
  }
  PyRef line;
  const char* bytes = nullptr;
  Py_ssize_t size = 0;
  if (NextPhysicalLine(source, &line, &bytes, &size) != 0 || KeepPiece(source, bytes, size) != 0)
    return -1;
  source->fLineOffset = source->fSourceOffset;
  source->fSourceOffset += size;
  if (source->fAtStart) {
    source->fAtStart = 0;
    if (size >= kByteOrderMarkLength && memcmp(bytes, kByteOrderMark, kByteOrderMarkLength) == 0) {
      if (size == kByteOrderMarkLength) return ReadSourceLine(source, lineNumber);  // no line
      bytes += kByteOrderMarkLength;
      size -= kByteOrderMarkLength;
    }
  }
  source->fAtEnd = size == 0;
  if (size == 0) return 0;
  if (source->fMayHoldNul && memchr(bytes, '\0', static_cast<size_t>(size))) {
    PyErr_Format(PyExc_ValueError, "Binary data encountered at lineno %lld while tokenizing",
                 static_cast<long long>(lineNumber));
    return -1;
  }
  return AcceptText(source, bytes, static_cast<size_t>(size));
}
