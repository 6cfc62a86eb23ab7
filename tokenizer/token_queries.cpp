// Token queries. Kinds are not stored: they come again from the token text, and error tokens
// are told by their "<errortoken> " prefix.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/token_queries.h"

#include <cstring>

#include "module/logical_line.h"
#include "module/py_ref.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/token_ids.h"
#include "tokenizer/token_start.h"

const char kGetTokenTypeDoc[] =
    "Get the type of the i'th token. If skip_error_prefix is true and the token is an "
    "errortoken, the probable token type of the string after the <errortoken> prefix is "
    "returned. This is typically used to treat unterminated string literals as strings.";
const char kGetTokenStringDoc[] =
    "Get the string rep for the i'th token. If skip_error_prefix is true and the token is an "
    "errortoken, the string after the <errortoken> prefix is returned";

namespace {

bool HasErrorPrefix(const char* bytes, Py_ssize_t n) {
  return n >= kErrorPrefixLength && memcmp(bytes, kErrorPrefix, kErrorPrefixLength) == 0;
}

// Returns the token at `index` (borrowed), or nullptr with IndexError set.
PyObject* TokenAt(PyObject* self, int index) {
  LogicalLine* line = reinterpret_cast<LogicalLine*>(self);
  if (index < 0 || index >= line->fTokenCount) {
    PyErr_SetString(PyExc_IndexError, "Invalid token index");
    return nullptr;
  }
  return line->fTokenArray[index];
}

int ParseIndexAndSkip(PyObject* args, PyObject* kwargs, const char* format, int* index, int* skip) {
  static const char* keywords[] = {"i", "skip_error_prefix", nullptr};
  return PyArg_ParseTupleAndKeywords(args, kwargs, format, const_cast<char**>(keywords), index,
                                     skip);
}

// Returns the token text after its error prefix, or a new reference to the token itself.
PyObject* StripErrorPrefix(PyObject* token) {
  if (PyUnicode_Check(token)) {
    // A str token is examined for the prefix too, on its characters.
    Py_ssize_t n = 0;
    const char* bytes = PyUnicode_AsUTF8AndSize(token, &n);
    if (!bytes) return nullptr;
    if (n > kErrorPrefixLength && HasErrorPrefix(bytes, n))
      return PyUnicode_Substring(token, kErrorPrefixLength, PyUnicode_GET_LENGTH(token));
    Py_INCREF(token);
    return token;
  }
  char* bytes = PyBytes_AsString(token);
  if (!bytes) return nullptr;
  const Py_ssize_t n = PyBytes_Size(token);
  if (n > kErrorPrefixLength && HasErrorPrefix(bytes, n))
    return PySequence_GetSlice(token, kErrorPrefixLength, n);
  Py_INCREF(token);
  return token;
}

}  // namespace

int TokenTypeOfText(PyObject* text, int skip) {
  PyRef encoded;
  const char* bytes = nullptr;
  Py_ssize_t n = 0;
  if (PyBytes_Check(text)) {
    bytes = PyBytes_AS_STRING(text);
    n = PyBytes_GET_SIZE(text);
  } else if (PyUnicode_Check(text)) {
    encoded = PyRef::Steal(PyUnicode_AsUTF8String(text));
    if (!encoded) return -1;
    bytes = PyBytes_AS_STRING(encoded.Get());
    n = PyBytes_GET_SIZE(encoded.Get());
  } else {
    PyErr_SetString(PyExc_TypeError, "String must be a bytes or unicode instance");
    return -1;
  }
  if (HasErrorPrefix(bytes, n)) {
    if (!skip) return ERROR_TOKEN;
    bytes += kErrorPrefixLength;
    n -= kErrorPrefixLength;
  }
  return TokenIdForStart(&kOperatorTable, bytes, bytes + n);
}

PyObject* TokenTextToStr(PyObject* token) {
  if (token == Py_None || PyUnicode_Check(token)) {
    Py_INCREF(token);
    return token;
  }
  return PyUnicode_DecodeUTF8(PyBytes_AS_STRING(token), PyBytes_GET_SIZE(token), "replace");
}

int GetTokenTypeDirect(PyObject* line, int index, int skip) {
  PyObject* token = TokenAt(line, index);
  return token ? TokenTypeOfText(token, skip) : -1;
}

int GetStringTokenTypeDirect(PyObject* text, int skip) { return TokenTypeOfText(text, skip); }

PyObject* GetTokenTypeMethod(PyObject* self, PyObject* args, PyObject* kwargs) {
  int index = 0;
  int skip = 0;
  if (!ParseIndexAndSkip(args, kwargs, "i|i:GetTokenType", &index, &skip)) return nullptr;
  const int id = GetTokenTypeDirect(self, index, skip);
  return id < 0 ? nullptr : PyLong_FromLong(id);
}

PyObject* GetTokenStringMethod(PyObject* self, PyObject* args, PyObject* kwargs) {
  int index = 0;
  int skip = 0;
  if (!ParseIndexAndSkip(args, kwargs, "i|i:GetTokenString", &index, &skip)) return nullptr;
  PyObject* token = TokenAt(self, index);
  if (!token) return nullptr;
  PyRef text = PyRef::Steal(skip ? StripErrorPrefix(token) : (Py_INCREF(token), token));
  if (!text) return nullptr;
  return TokenTextToStr(text.Get());
}
