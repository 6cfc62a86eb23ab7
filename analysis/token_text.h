// Reading a stored token's text without copying it.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstring>
#include <string_view>

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
  bool Is(std::string_view word) const {
    return static_cast<size_t>(fLength) == word.size() &&
           memcmp(fBytes, word.data(), word.size()) == 0;
  }
};
