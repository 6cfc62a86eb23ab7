// The LogicalLine attributes: all read-only, each a new reference.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>
#include <cstring>

#include "core/py_ref.h"
#include "lines/tokens_tuple.h"
#include "module/line_surface.h"
#include "module/module_state.h"

namespace {

// Returns a tuple of 2-tuples from pairs stored flat.
PyObject* PairTuple(const ObjectList* pairs) {
  PyRef outer = PyRef::Steal(PyTuple_New(pairs->fCount / 2));
  if (!outer) return nullptr;
  for (Py_ssize_t i = 0; i < pairs->fCount / 2; i++) {
    PyObject* pair = PyTuple_Pack(2, pairs->fItems[2 * i], pairs->fItems[2 * i + 1]);
    if (!pair) return nullptr;
    PyTuple_SET_ITEM(outer.Get(), i, pair);
  }
  return outer.Release();
}

// fNames whole, on the line types whose view shows it; an empty tuple on every other line.
PyObject* NamesIf(PyObject* self, bool shown) {
  return shown ? ObjectListTuple(&AsLine(self)->fNames) : PyTuple_New(0);
}

PyObject* FlagValue(PyObject* self, uint8_t flag) {
  return PyBool_FromLong(AsLine(self)->fFlags & flag);
}

PyObject* ObjectOrNone(PyObject* object) {
  PyObject* result = object ? object : Py_None;
  Py_INCREF(result);
  return result;
}

// Getters, in attribute table order.

PyObject* GetType(PyObject* self, void*) {
  PyObject* constant = StateOfType(Py_TYPE(self))->fLineTypes[AsLine(self)->fType];
  Py_INCREF(constant);
  return constant;
}
PyObject* GetParsed(PyObject* self, void*) { return FlagValue(self, kParsedFlag); }
PyObject* GetTabsInIndent(PyObject* self, void*) { return FlagValue(self, kTabsInIndentFlag); }
PyObject* GetSpacesInIndent(PyObject* self, void*) { return FlagValue(self, kSpacesInIndentFlag); }
PyObject* GetIncomplete(PyObject* self, void*) { return FlagValue(self, kIncompleteFlag); }
PyObject* GetIndentLevel(PyObject* self, void*) { return PyLong_FromLong(AsLine(self)->fIndentLevel); }
PyObject* GetFirstLine(PyObject* self, void*) {
  return PyLong_FromLongLong(FirstLineOf(AsLine(self)));
}
PyObject* GetLineCount(PyObject* self, void*) { return PyLong_FromLong(AsLine(self)->fLineCount); }
PyObject* GetTokenCount(PyObject* self, void*) { return PyLong_FromLong(AsLine(self)->fTokenCount); }
PyObject* GetNamesDefined(PyObject* self, void*) { return NamesDefined(AsLine(self)); }
PyObject* GetTypeEquivs(PyObject* self, void*) { return PairTuple(&AsLine(self)->fTypeEquivs); }
PyObject* GetArgNames(PyObject* self, void*) {
  return NamesIf(self, AsLine(self)->fType == kFunctionDef);
}
PyObject* GetArgTypeEquivs(PyObject* self, void*) {
  return PairTuple(&AsLine(self)->fArgTypeEquivs);
}
PyObject* GetBaseClassNames(PyObject* self, void*) {
  return NamesIf(self, AsLine(self)->fType == kClassDef);
}
PyObject* GetLocalScopeName(PyObject* self, void*) {
  return ObjectOrNone(AsLine(self)->fLocalScopeName);
}
PyObject* GetTokens(PyObject* self, void*) {
  const LineState* shared = StateOfType(Py_TYPE(self))->fShared;
  return TokensTupleOf(shared->fEntries, shared->fTokenTexts, AsLine(self));
}
PyObject* GetLineText(PyObject* self, void*) {
  const char* text = AsLine(self)->fLineText;
  if (!text) Py_RETURN_NONE;
  return PyUnicode_DecodeUTF8(text, static_cast<Py_ssize_t>(strlen(text)), nullptr);
}
PyObject* GetScopeName(PyObject* self, void*) { return ObjectOrNone(AsLine(self)->fScopeName); }
PyObject* GetImportRefs(PyObject* self, void*) {
  const uint8_t type = AsLine(self)->fType;
  return NamesIf(self, type == kImport || type == kFromImport);
}

}  // namespace

PyGetSetDef kLineAttributes[] = {
    {"fType", GetType, nullptr, nullptr, nullptr},
    {"fParsed", GetParsed, nullptr, nullptr, nullptr},
    {"fTabsInIndent", GetTabsInIndent, nullptr, nullptr, nullptr},
    {"fSpacesInIndent", GetSpacesInIndent, nullptr, nullptr, nullptr},
    {"fIncomplete", GetIncomplete, nullptr, nullptr, nullptr},
    {"fIndentLevel", GetIndentLevel, nullptr, nullptr, nullptr},
    {"fFirstLine", GetFirstLine, nullptr, nullptr, nullptr},
    {"fLineCount", GetLineCount, nullptr, nullptr, nullptr},
    {"fTokenCount", GetTokenCount, nullptr, nullptr, nullptr},
    {"fNamesDefined", GetNamesDefined, nullptr, nullptr, nullptr},
    {"fTypeEquivs", GetTypeEquivs, nullptr, nullptr, nullptr},
    {"fArgNames", GetArgNames, nullptr, nullptr, nullptr},
    {"fArgTypeEquivs", GetArgTypeEquivs, nullptr, nullptr, nullptr},
    {"fBaseClassNames", GetBaseClassNames, nullptr, nullptr, nullptr},
    {"fLocalScopeName", GetLocalScopeName, nullptr, nullptr, nullptr},
    {"fTokens", GetTokens, nullptr, nullptr, nullptr},
    {"fLineText", GetLineText, nullptr, nullptr, nullptr},
    {"fScopeName", GetScopeName, nullptr, nullptr, nullptr},
    {"fImportRefs", GetImportRefs, nullptr, nullptr, nullptr},
    {nullptr, nullptr, nullptr, nullptr, nullptr},
};

PyObject* NamesDefined(LogicalLine* line) {
  if (line->fType == kClassDef || line->fType == kFunctionDef) {
    PyObject* name = line->fLocalScopeName;
    if (name != Py_None) return PyTuple_Pack(1, name);
    return PyTuple_New(0);
  }
  PyObject* tuple = PyTuple_New(line->fNames.fCount);
  if (!tuple) return nullptr;
  for (Py_ssize_t i = 0; i < line->fNames.fCount; i++) {
    PyObject* item = line->fNames.fItems[i];
    if (PyTuple_Check(item) && PyTuple_GET_SIZE(item) > 0) item = PyTuple_GET_ITEM(item, 0);
    Py_INCREF(item);
    PyTuple_SET_ITEM(tuple, i, item);
  }
  return tuple;
}
