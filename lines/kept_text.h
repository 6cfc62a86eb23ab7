// The text a list's record keeps, so that an update can prove what the host says of an edit:
// the very bytes object read, which cannot change, or a copy on the interpreter's raw heap.
// Either way the record holds at most one byte more per byte of source.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>
#include <string_view>

#include "core/raw_bytes.h"

struct KeptText {
  PyObject* fObject;  // an owned exact bytes object holding the text, or null
  char* fCopy;        // an owned raw heap block (PyMem_RawMalloc) holding the text, or null
  size_t fLength;
  std::string_view View() const {
    if (fObject) return {PyBytes_AS_STRING(fObject), fLength};
    return {fCopy, fLength};
  }
};

// Keeps [data, end): the owner itself when it is exactly a bytes object holding that text, else
// a copy. Returns 0, or -1 with MemoryError set and *kept untouched.
int KeepText(PyObject* owner, const char* data, const char* end, KeptText* kept);

// Keeps the text collected in `bytes` by taking over its storage, trimmed to the text, and
// leaves `bytes` empty. Returns 0, or -1 with MemoryError set and both untouched.
int KeepCollectedText(RawBytes* bytes, KeptText* kept);

// Frees what the text holds and leaves it empty; runs no code of the host's.
void ReleaseKeptText(KeptText* kept);
