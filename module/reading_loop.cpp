// The reading loop: asks the builder for one logical line at a time until the input ends or
// the stop line is reached. A failure anywhere returns no partial list.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/reading_loop.h"

#include <cstdint>
#include <cstdlib>

#include "assembly/line_builder.h"
#include "assembly/text_buffer.h"
#include "assembly/token_cache.h"
#include "module/parser.h"
#include "module/py_ref.h"

const char kGetLogicalLineListDoc[] =
    "Read logical lines from buffer.  Text is obtained through a readline function that is the "
    "first arguement to this method.  The 2nd & 3rd arguments optional; the 2nd arg is the line "
    "# of the first line read with readline and it defaults to 0.  The 3rd arg is the number of "
    "lines to scan for logical lines -- note that if a logical line continues past the end of "
    "this range, more lines will be processed.  If the 3rd arg is not specified, all lines until "
    "the end of the file are scanned.";

namespace {

// The reading state of one call; calls may nest, so nothing of it is shared.
struct ReadingState {
  TextBuffer fPending;  // a physical line read but handed back
  int64_t fLineNumber;  // the next physical line to read
  int fAtEnd;
  TokenCache* fCache;
  TokenStorage fStorage;  // token arrays lent to each logical line in turn

  ReadingState() : fLineNumber(0), fAtEnd(0), fCache(nullptr) {
    InitTextBuffer(&fPending);
    InitTokenStorage(&fStorage);
  }
  ~ReadingState() {
    ResetTextBuffer(&fPending);
    ReleaseTokenStorage(&fStorage);
    if (fCache) {
      ClearTokenCache(fCache);
      PyMem_Free(fCache);
    }
  }
};

// Reads logical lines into `list`. Returns 0, or -1 with an exception set.
int ReadLines(LogicalLineParser* parser, PyObject* readline, int firstLine, int lineCount,
              PyObject* list) {
  ReadingState reading;
  reading.fCache = static_cast<TokenCache*>(PyMem_Malloc(sizeof(TokenCache)));
  if (!reading.fCache) {
    PyErr_NoMemory();
    return -1;
  }
  InitTokenCache(reading.fCache);
  // Counted in 64 bits, so that no sum of the two arguments wraps; -1 means no stop line.
  const int64_t stop = lineCount == -1 ? -1 : static_cast<int64_t>(firstLine) + lineCount;
  const bool hasStop = stop != -1;
  reading.fLineNumber = firstLine;
  while (!(hasStop && reading.fLineNumber >= stop) && !reading.fAtEnd) {
    PyRef line = PyRef::Steal(BuildLogicalLine(parser, readline, &reading.fPending,
                                               &reading.fLineNumber, &reading.fAtEnd,
                                               reading.fCache, &reading.fStorage));
    if (!line) return -1;
    if (line.Get() == Py_None) continue;
    if (PyList_Append(list, line.Get()) != 0) return -1;
  }
  return 0;
}

}  // namespace

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
  PyRef list = PyRef::Steal(PyList_New(0));
  if (!list) return nullptr;
  if (ReadLines(reinterpret_cast<LogicalLineParser*>(self), readline, firstLine, lineCount,
                list.Get()) != 0)
    return nullptr;
  return list.Release();
}
