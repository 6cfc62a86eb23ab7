// Keeping the text of a list's record.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/kept_text.h"

#include <cstring>

int KeepText(PyObject* owner, const char* data, const char* end, KeptText* kept) {
  const auto length = static_cast<size_t>(end - data);
  if (owner && PyBytes_CheckExact(owner) && PyBytes_AS_STRING(owner) == data &&
      static_cast<size_t>(PyBytes_GET_SIZE(owner)) == length) {
    *kept = KeptText{.fObject = Py_NewRef(owner), .fCopy = nullptr, .fLength = length};
    return 0;
  }
  char* copy = static_cast<char*>(PyMem_RawMalloc(length ? length : 1));
  if (!copy) {
    PyErr_NoMemory();
    return -1;
  }
  if (length) memcpy(copy, data, length);
  *kept = KeptText{.fObject = nullptr, .fCopy = copy, .fLength = length};
  return 0;
}

int KeepCollectedText(RawBytes* bytes, KeptText* kept) {
  const size_t length = bytes->fLength;
  char* copy = TakeRawBytes(bytes);
  if (!copy) {
    PyErr_NoMemory();
    return -1;
  }
  *kept = KeptText{.fObject = nullptr, .fCopy = copy, .fLength = length};
  return 0;
}

void ReleaseKeptText(KeptText* kept) {
  Py_XDECREF(kept->fObject);  // a bytes object: its release runs no code of the host's
  PyMem_RawFree(kept->fCopy);
  *kept = KeptText{.fObject = nullptr, .fCopy = nullptr, .fLength = 0};
}
