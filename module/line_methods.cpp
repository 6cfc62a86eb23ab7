// The LogicalLine methods: argument parsing around the line operations.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/copy.h"
#include "lines/editing.h"
#include "module/line_surface.h"
#include "module/method_cast.h"
#include "tokenizer/token_queries.h"

namespace {

PyObject* NoneOr(int status) {
  if (status != 0) return nullptr;
  Py_RETURN_NONE;
}

PyObject* AppendOne(PyObject* self, PyObject* args, const char* format,
                    int (*append)(LogicalLine*, PyObject*)) {
  PyObject* object = nullptr;
  if (!PyArg_ParseTuple(args, format, &object)) return nullptr;
  return NoneOr(append(AsLine(self), object));
}

PyObject* AppendTwo(PyObject* self, PyObject* args, const char* format,
                    int (*append)(LogicalLine*, PyObject*, PyObject*)) {
  PyObject* a = nullptr;
  PyObject* b = nullptr;
  if (!PyArg_ParseTuple(args, format, &a, &b)) return nullptr;
  return NoneOr(append(AsLine(self), a, b));
}

// Parses (i, skip_error_prefix=0) and returns token i (borrowed), or nullptr.
PyObject* IndexedToken(PyObject* self, PyObject* args, PyObject* kwargs, const char* format,
                       int* skip) {
  static const char* keywords[] = {"i", "skip_error_prefix", nullptr};
  int index = 0;
  if (!PyArg_ParseTupleAndKeywords(args, kwargs, format, const_cast<char**>(keywords), &index,
                                   skip))
    return nullptr;
  return TokenAt(AsLine(self), index);
}

PyDoc_STRVAR(kCopyDoc, "Deep copy a logical line");
PyObject* Copy(PyObject* self, PyObject*) { return CopyLogicalLine(AsLine(self)); }

PyDoc_STRVAR(kGetTokenStringDoc,
             "Get the string rep for the i'th token. If skip_error_prefix is true and the token "
             "is an errortoken, the string after the <errortoken> prefix is returned");
PyObject* GetTokenString(PyObject* self, PyObject* args, PyObject* kwargs) {
  int skip = 0;
  PyObject* token = IndexedToken(self, args, kwargs, "i|i:GetTokenString", &skip);
  return token ? TokenStr(token, skip) : nullptr;
}

PyDoc_STRVAR(kGetTokenTypeDoc,
             "Get the type of the i'th token. If skip_error_prefix is true and the token is an "
             "errortoken, the probable token type of the string after the <errortoken> prefix is "
             "returned. This is typically used to treat unterminated string literals as "
             "strings.");
PyObject* GetTokenType(PyObject* self, PyObject* args, PyObject* kwargs) {
  int skip = 0;
  PyObject* token = IndexedToken(self, args, kwargs, "i|i:GetTokenType", &skip);
  if (!token) return nullptr;
  const int id = TokenTypeOfText(token, skip);
  return id < 0 ? nullptr : PyLong_FromLong(id);
}

PyDoc_STRVAR(kAppendAttribDoc,
             "Append an attribute to the logical.  Raises ValueError if logical is a scope "
             "start line.");
PyObject* AppendAttribMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendAttrib", AppendAttrib);
}

PyDoc_STRVAR(kAppendArgNameDoc,
             "Append a single arg name or name sequence to the logical.  Raises ValueError if "
             "logical is not a function def.");
PyObject* AppendArgNameMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendArgName", AppendArgName);
}

PyDoc_STRVAR(kAppendBaseClassNameDoc,
             "Append name of base class to logical.  Raises ValueError if logical is not a "
             "class def.");
PyObject* AppendBaseClassNameMethod(PyObject* self, PyObject* args) {
  return AppendOne(self, args, "O:AppendBaseClassName", AppendBaseClassName);
}

PyDoc_STRVAR(kAppendTypeEquivDoc, "Append a single type equivalency relationship to the logical.");
PyObject* AppendTypeEquivMethod(PyObject* self, PyObject* args) {
  return AppendTwo(self, args, "OO:AppendTypeEquiv", AppendTypeEquiv);
}

PyDoc_STRVAR(kAppendArgTypeEquivDoc,
             "Append a single argument type equivalency relationship to the logical.");
PyObject* AppendArgTypeEquivMethod(PyObject* self, PyObject* args) {
  return AppendTwo(self, args, "OO:AppendArgTypeEquiv", AppendArgTypeEquiv);
}

PyDoc_STRVAR(kSetLineRangeDoc, "Set the fFirstLine & fLineCount attributes of the logical.");
PyObject* SetLineRange(PyObject* self, PyObject* args) {
  int first = 0;
  int count = 0;
  if (!PyArg_ParseTuple(args, "ii", &first, &count)) return nullptr;
  LogicalLine* line = AsLine(self);
  if (first == FirstLineOf(line) && count == line->fLineCount) Py_RETURN_NONE;
  DetachLine(line);  // the list it is in no longer fits the text it was read from
  SetFirstLine(line, first);
  line->fLineCount = count;
  Py_RETURN_NONE;
}

PyDoc_STRVAR(kSetParsedDoc, "Set the fParsed attribute");
PyObject* SetParsed(PyObject* self, PyObject* args) {
  PyObject* flag = nullptr;
  if (!PyArg_ParseTuple(args, "O", &flag)) return nullptr;
  const int truth = PyObject_IsTrue(flag);
  if (truth < 0) return nullptr;  // a failing truth test leaves the flag as it was
  LogicalLine* line = AsLine(self);
  line->fFlags = truth ? (line->fFlags | kParsedFlag) : (line->fFlags & ~kParsedFlag);
  Py_RETURN_NONE;
}

PyDoc_STRVAR(kSetScopeNameDoc, "Set the fScopeName attribute");
PyObject* SetScopeNameMethod(PyObject* self, PyObject* name) {
  SetScopeName(AsLine(self), name);
  Py_RETURN_NONE;
}

}  // namespace

PyMethodDef kLineMethods[] = {
    {"Copy", Copy, METH_VARARGS, kCopyDoc},
    {"__deepcopy__", Copy, METH_VARARGS, kCopyDoc},
    {"GetTokenString", AsMethod(GetTokenString), METH_VARARGS | METH_KEYWORDS, kGetTokenStringDoc},
    {"GetTokenType", AsMethod(GetTokenType), METH_VARARGS | METH_KEYWORDS, kGetTokenTypeDoc},
    {"AppendAttrib", AppendAttribMethod, METH_VARARGS, kAppendAttribDoc},
    {"AppendArgName", AppendArgNameMethod, METH_VARARGS, kAppendArgNameDoc},
    {"AppendBaseClassName", AppendBaseClassNameMethod, METH_VARARGS, kAppendBaseClassNameDoc},
    {"AppendTypeEquiv", AppendTypeEquivMethod, METH_VARARGS, kAppendTypeEquivDoc},
    {"AppendArgTypeEquiv", AppendArgTypeEquivMethod, METH_VARARGS, kAppendArgTypeEquivDoc},
    {"SetLineRange", SetLineRange, METH_VARARGS, kSetLineRangeDoc},
    {"SetParsed", SetParsed, METH_VARARGS, kSetParsedDoc},
    {"SetScopeName", SetScopeNameMethod, METH_O, kSetScopeNameDoc},
    {nullptr, nullptr, 0, nullptr},
};
