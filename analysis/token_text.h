// Reading a stored token's text without copying it.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstring>

struct TokenText {
  const char* fBytes;
  Py_ssize_t fLength;

  // A token that is not bytes reads as empty text.
  explicit TokenText(PyObject* token)
      : fBytes(PyBytes_Check(token) ? PyBytes_AS_STRING(token) : ""),
        fLength(PyBytes_Check(token) ? PyBytes_GET_SIZE(token) : 0) {}

  unsigned At(Py_ssize_t i) const {
    return i < fLength ? static_cast<unsigned char>(fBytes[i]) : 0;
  }
  bool Is(const char* word) const {
    const size_t n = strlen(word);
    return static_cast<size_t>(fLength) == n && memcmp(fBytes, word, n) == 0;
  }
};
