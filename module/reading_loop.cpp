// The parser's reading methods: their arguments, and the source they read, the host's readline
// or a buffer that the call keeps locked while it reads.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/reading_loop.h"

#include "lines/list_read.h"
#include "module/parser.h"

namespace {

// Reads the source through readline, or from [data, dataEnd), the buffer of `owner`, when
// readline is null. Returns a new list, or nullptr with an exception set.
PyObject* ReadSource(PyObject* self, PyObject* readline, const char* data, const char* dataEnd,
                     PyObject* owner, int firstLine, int lineCount) {
  if (firstLine < 0) {  // refused before the host's stream moves
    PyErr_SetString(PyExc_ValueError, "first line must be >= 0");
    return nullptr;
  }
  if (lineCount < -1) {  // -1 alone means no limit; refused before the stream moves too
    PyErr_SetString(PyExc_ValueError, "line count must be >= 0, or -1 for no limit");
    return nullptr;
  }
  return ReadLineList(ParserShared(self), ParserOptions(self),
                      LineSource{.fReadline = readline,
                                 .fData = data,
                                 .fDataEnd = dataEnd,
                                 .fDataOwner = owner,
                                 .fFirstLine = firstLine,
                                 .fLineCount = lineCount});
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
  return ReadSource(self, readline, nullptr, nullptr, nullptr, firstLine, lineCount);
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
  PyObject* list =
      ReadSource(self, nullptr, data, data + view.len, view.obj, firstLine, lineCount);
  PyBuffer_Release(&view);
  return list;
}

}  // namespace

const PyMethodDef kGetLogicalLineListMethod = {"GetLogicalLineList", GetLogicalLineList,
                                               METH_VARARGS, kGetLogicalLineListDoc};
const PyMethodDef kGetLogicalLineListFromBufferMethod = {
    "GetLogicalLineListFromBuffer", GetLogicalLineListFromBuffer, METH_VARARGS,
    kGetLogicalLineListFromBufferDoc};
