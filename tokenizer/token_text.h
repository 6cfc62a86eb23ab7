// Reading a stored token's text without copying it, and the facts about a text that more than
// one layer needs: its bracket step and its error prefix.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstring>
#include <string_view>

#include "core/token_ids.h"

struct TokenText {
  const char* fBytes;
  Py_ssize_t fLength;

  // Every token the module lists is a bytes object.
  explicit TokenText(PyObject* token)
      : fBytes(PyBytes_AS_STRING(token)), fLength(PyBytes_GET_SIZE(token)) {}
  TokenText(const char* bytes, Py_ssize_t length) : fBytes(bytes), fLength(length) {}

  unsigned At(Py_ssize_t i) const {
    return i < fLength ? static_cast<unsigned char>(fBytes[i]) : 0;
  }
  bool Is(std::string_view word) const {
    return static_cast<size_t>(fLength) == word.size() &&
           memcmp(fBytes, word.data(), word.size()) == 0;
  }
  bool HasErrorPrefix() const {
    return fLength >= kErrorPrefixLength && memcmp(fBytes, kErrorPrefix, kErrorPrefixLength) == 0;
  }
};

// How a token with this first byte changes the bracket depth: +1 opens, -1 closes.
inline int BracketStep(unsigned first) {
  if (first == '(' || first == '[' || first == '{') return 1;
  if (first == ')' || first == ']' || first == '}') return -1;
  return 0;
}
