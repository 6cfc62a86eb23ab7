// Token queries. Kinds are not stored: they come again from the token text, and error tokens
// are told by their "<errortoken> " prefix.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/token_queries.h"

#include "core/py_ref.h"
#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/string_prefixes.h"
#include "tokenizer/token_start.h"
#include "tokenizer/token_text.h"

int LineTokenIdForStart(const char* p, const char* end) {
  const int id = TokenIdForStart(&kOperatorTable, p, end);
  if (id != NAME_TOKEN || !kPrefixFirstLetters.Has(Byte(p)) || !MayOpenPrefixedString(p, end))
    return id;
  return StartsTemplateString(p, end) ? STRING_TOKEN : id;
}

int TokenTypeOfText(PyObject* text, int skip, bool lineToken) {
  PyRef encoded;
  if (PyUnicode_Check(text)) {
    encoded = PyRef::Steal(PyUnicode_AsUTF8String(text));
    if (!encoded) return -1;
    text = encoded.Get();
  } else if (!PyBytes_Check(text)) {
    PyErr_SetString(PyExc_TypeError, "String must be a bytes or unicode instance");
    return -1;
  }
  TokenText token(text);
  if (token.HasErrorPrefix()) {
    if (!skip) return ERROR_TOKEN;
    token = TokenText(token.fBytes + kErrorPrefixLength, token.fLength - kErrorPrefixLength);
  }
  const char* end = token.fBytes + token.fLength;
  return lineToken ? LineTokenIdForStart(token.fBytes, end)
                   : TokenIdForStart(&kOperatorTable, token.fBytes, end);
}

PyObject* TokenStr(PyObject* token, int skip) {
  TokenText text(token);
  // Only a text longer than the prefix loses it: a bare prefix is shown as it is.
  if (skip && text.fLength > kErrorPrefixLength && text.HasErrorPrefix())
    text = TokenText(text.fBytes + kErrorPrefixLength, text.fLength - kErrorPrefixLength);
  return PyUnicode_DecodeUTF8(text.fBytes, text.fLength, "replace");
}
