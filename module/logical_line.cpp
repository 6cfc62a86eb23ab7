// The LogicalLine type: its read-only attributes, the building of fTokens, and the release.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/logical_line.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "analysis/copy.h"
#include "analysis/editing.h"
#include "module/line_types.h"
#include "module/method_cast.h"
#include "module/py_ref.h"
#include "tokenizer/token_queries.h"

namespace {

LogicalLine* AsLine(PyObject* self) { return reinterpret_cast<LogicalLine*>(self); }

void ReleaseArray(PyObject** items, Py_ssize_t count) {
  for (Py_ssize_t i = 0; i < count; i++) Py_XDECREF(items[i]);
  free(items);
}

// A tuple that holds only str, int, None or such tuples can take part in no cycle, so the
// collector need not walk it.
void UntrackAtomicTuple(PyObject* tuple) { PyObject_GC_UnTrack(tuple); }

PyObject* NewInt(long value) { return PyLong_FromLong(value); }

// Returns a tuple of the objects in items[0, count), each with a new reference.
PyObject* TupleOf(PyObject** items, Py_ssize_t count) {
  PyObject* tuple = PyTuple_New(count);
  if (!tuple) return nullptr;
  for (Py_ssize_t i = 0; i < count; i++) {
    Py_INCREF(items[i]);
    PyTuple_SET_ITEM(tuple, i, items[i]);
  }
  return tuple;
}

// Returns a tuple of 2-tuples from pairs stored flat.
PyObject* PairTuple(PyObject** pairs, Py_ssize_t count) {
  PyRef outer = PyRef::Steal(PyTuple_New(count));
  if (!outer) return nullptr;
  for (Py_ssize_t i = 0; i < count; i++) {
    PyObject* pair = PyTuple_Pack(2, pairs[2 * i], pairs[2 * i + 1]);
    if (!pair) return nullptr;
    PyTuple_SET_ITEM(outer.Get(), i, pair);
  }
  return outer.Release();
}

PyObject* NamesIf(LogicalLine* line, bool shown) {
  return shown ? TupleOf(line->fNames, line->fNameCount) : PyTuple_New(0);
}

PyObject* FlagValue(LogicalLine* line, uint8_t flag) { return PyBool_FromLong(line->fFlags & flag); }

PyObject* ObjectOrNone(PyObject* object) {
  PyObject* result = object ? object : Py_None;
  Py_INCREF(result);
  return result;
}

// Getters, in attribute table order.

PyObject* GetType(PyObject* self, void*) {
  LogicalLine* line = AsLine(self);
  if (line->fType >= kLineTypeCount) {
    PyErr_SetString(PyExc_ValueError, "Invalid value found for line type");
    return nullptr;
  }
  PyObject* constant = LineTypeTable[line->fType].fObject;
  Py_INCREF(constant);
  return constant;
}
PyObject* GetParsed(PyObject* self, void*) { return FlagValue(AsLine(self), kParsedFlag); }
PyObject* GetTabsInIndent(PyObject* self, void*) { return FlagValue(AsLine(self), kTabsInIndentFlag); }
PyObject* GetSpacesInIndent(PyObject* self, void*) {
  return FlagValue(AsLine(self), kSpacesInIndentFlag);
}
PyObject* GetIncomplete(PyObject* self, void*) { return FlagValue(AsLine(self), kIncompleteFlag); }
PyObject* GetIndentLevel(PyObject* self, void*) { return NewInt(AsLine(self)->fIndentLevel); }
PyObject* GetFirstLine(PyObject* self, void*) { return NewInt(AsLine(self)->fFirstLine); }
PyObject* GetLineCount(PyObject* self, void*) { return NewInt(AsLine(self)->fLineCount); }
PyObject* GetTokenCount(PyObject* self, void*) { return NewInt(AsLine(self)->fTokenCount); }
PyObject* GetNamesDefined(PyObject* self, void*) { return NamesDefined(AsLine(self)); }
PyObject* GetTypeEquivs(PyObject* self, void*) {
  return PairTuple(AsLine(self)->fTypeEquivs, AsLine(self)->fTypeEquivCount);
}
PyObject* GetArgNames(PyObject* self, void*) {
  return NamesIf(AsLine(self), AsLine(self)->fType == kFunctionDef);
}
PyObject* GetArgTypeEquivs(PyObject* self, void*) {
  return PairTuple(AsLine(self)->fArgTypeEquivs, AsLine(self)->fArgTypeEquivCount);
}
PyObject* GetBaseClassNames(PyObject* self, void*) {
  return NamesIf(AsLine(self), AsLine(self)->fType == kClassDef);
}
PyObject* GetLocalScopeName(PyObject* self, void*) { return ObjectOrNone(AsLine(self)->fLocalScopeName); }
PyObject* GetTokens(PyObject* self, void*) {
  LogicalLine* line = AsLine(self);
  if (!line->fTokensTuple) {
    line->fTokensTuple = BuildTokensTuple(line);
    if (!line->fTokensTuple) return nullptr;
  }
  Py_INCREF(line->fTokensTuple);
  return line->fTokensTuple;
}
PyObject* GetLineText(PyObject* self, void*) {
  const char* text = AsLine(self)->fLineText;
  if (!text) Py_RETURN_NONE;
  return PyUnicode_DecodeUTF8(text, static_cast<Py_ssize_t>(strlen(text)), nullptr);
}
PyObject* GetScopeName(PyObject* self, void*) { return ObjectOrNone(AsLine(self)->fScopeName); }
PyObject* GetImportRefs(PyObject* self, void*) {
  const uint8_t type = AsLine(self)->fType;
  return NamesIf(AsLine(self), type == kImport || type == kFromImport);
}

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

PyMethodDef kLineMethods[] = {
    {"Copy", CopyLogicalLine, METH_VARARGS, "Deep copy a logical line"},
    {"__deepcopy__", CopyLogicalLine, METH_VARARGS, "Deep copy a logical line"},
    {"GetTokenString", AsMethod(GetTokenStringMethod), METH_VARARGS | METH_KEYWORDS,
     kGetTokenStringDoc},
    {"GetTokenType", AsMethod(GetTokenTypeMethod), METH_VARARGS | METH_KEYWORDS, kGetTokenTypeDoc},
    {"AppendAttrib", AppendAttribMethod, METH_VARARGS,
     "Append an attribute to the logical.  Raises ValueError if logical is a scope start line."},
    {"AppendArgName", AppendArgNameMethod, METH_VARARGS,
     "Append a single arg name or name sequence to the logical.  Raises ValueError if logical is "
     "not a function def."},
    {"AppendBaseClassName", AppendBaseClassNameMethod, METH_VARARGS,
     "Append name of base class to logical.  Raises ValueError if logical is not a class def."},
    {"AppendTypeEquiv", AppendTypeEquivMethod, METH_VARARGS,
     "Append a single type equivalency relationship to the logical."},
    {"AppendArgTypeEquiv", AppendArgTypeEquivMethod, METH_VARARGS,
     "Append a single argument type equivalency relationship to the logical."},
    {"SetLineRange", SetLineRangeMethod, METH_VARARGS,
     "Set the fFirstLine & fLineCount attributes of the logical."},
    {"SetParsed", SetParsedMethod, METH_VARARGS, "Set the fParsed attribute"},
    {"SetScopeName", SetScopeNameMethod, METH_O, "Set the fScopeName attribute"},
    {nullptr, nullptr, 0, nullptr},
};

void LineDealloc(PyObject* self) {
  LogicalLine* line = AsLine(self);
  // The positions and the line text live in the token array's block.
  line->fTokenPositions = nullptr;
  line->fLineText = nullptr;
  if (line->fTokenArray) ReleaseArray(line->fTokenArray, line->fTokenCount);
  line->fTokenArray = nullptr;
  ClearNames(line);
  ClearTypeEquivs(line);
  Py_XDECREF(line->fScopeName);
  Py_XDECREF(line->fTokensTuple);
  Py_XDECREF(line->fLocalScopeName);
  Py_TYPE(self)->tp_free(self);
}

}  // namespace

// Slots left out stay empty; the interpreter fills them in when the type is readied.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmissing-field-initializers"
PyTypeObject LogicalLineType = {
    .ob_base = PyVarObject_HEAD_INIT(nullptr, 0)
    .tp_name = "LogicalLine",
    .tp_basicsize = sizeof(LogicalLine),
    .tp_dealloc = LineDealloc,
    .tp_flags = Py_TPFLAGS_DEFAULT,  // no subclassing, no collector, no constructor
    .tp_methods = kLineMethods,
    .tp_getset = kLineAttributes,
};
#pragma GCC diagnostic pop

LogicalLine* NewLogicalLine() {
  LogicalLine* line = PyObject_New(LogicalLine, &LogicalLineType);
  if (!line) return nullptr;
  line->fTokenArray = nullptr;
  line->fTokenPositions = nullptr;
  line->fFirstLine = 0;
  line->fTokenCount = 0;
  line->fNameCount = 0;
  line->fTypeEquivCount = 0;
  line->fArgTypeEquivCount = 0;
  line->fIndentLevel = 0;
  line->fLineCount = 0;
  line->fType = kUnknown;
  line->fFlags = 0;
  line->fScopeName = nullptr;
  line->fNames = nullptr;
  line->fTypeEquivs = nullptr;
  line->fArgTypeEquivs = nullptr;
  line->fLineText = nullptr;
  line->fTokensTuple = nullptr;
  Py_INCREF(Py_None);
  line->fLocalScopeName = Py_None;
  return line;
}

void ClearNames(LogicalLine* line) {
  ReleaseArray(line->fNames, line->fNameCount);
  line->fNames = nullptr;
  line->fNameCount = 0;
}

void ClearTypeEquivs(LogicalLine* line) {
  ReleaseArray(line->fTypeEquivs, 2 * line->fTypeEquivCount);
  line->fTypeEquivs = nullptr;
  line->fTypeEquivCount = 0;
  ReleaseArray(line->fArgTypeEquivs, 2 * line->fArgTypeEquivCount);
  line->fArgTypeEquivs = nullptr;
  line->fArgTypeEquivCount = 0;
}

// What the entries of one fTokens tuple can share. The reader hands out one object per
// repeated token text, so a repeated token decodes once, and the tokens of one physical line
// share its line index. Both are borrowed: the entries built so far hold them.
struct EntryParts {
  static constexpr uintptr_t kSlots = 64;
  PyObject* fToken[kSlots] = {};
  PyObject* fText[kSlots] = {};
  PyObject* fLineObject = nullptr;
  uint16_t fLine = 0;
};

namespace {

PyObject* NewPair(PyObject* first, PyObject* second) {
  PyObject* pair = PyTuple_New(2);
  if (!pair) return nullptr;
  Py_INCREF(first);
  PyTuple_SET_ITEM(pair, 0, first);
  Py_INCREF(second);
  PyTuple_SET_ITEM(pair, 1, second);
  return pair;
}

// Returns a new reference to the int for a line index.
PyObject* LineIndexObject(uint16_t lineIndex, EntryParts* shared) {
  if (shared && shared->fLineObject && shared->fLine == lineIndex) {
    Py_INCREF(shared->fLineObject);
    return shared->fLineObject;
  }
  PyObject* row = NewInt(lineIndex);
  if (row && shared) {
    shared->fLineObject = row;
    shared->fLine = lineIndex;
  }
  return row;
}

PyObject* PositionOf(LogicalLine* line, Py_ssize_t index, EntryParts* shared) {
  if (!line->fTokenPositions) Py_RETURN_NONE;
  const TokenPosition& pair = line->fTokenPositions[index];
  PyRef row = PyRef::Steal(LineIndexObject(pair.fLine, shared));
  if (!row) return nullptr;
  PyRef column = PyRef::Steal(NewInt(pair.fColumn));
  if (!column) return nullptr;
  PyObject* position = NewPair(row.Get(), column.Get());
  if (position) UntrackAtomicTuple(position);
  return position;
}

// Returns a new reference to the str shown for a token: str and None as they are, bytes
// decoded with U+FFFD for malformed sequences.
PyObject* TextOf(PyObject* token, EntryParts* shared) {
  if (token == Py_None || PyUnicode_Check(token)) {
    Py_INCREF(token);
    return token;
  }
  const uintptr_t slot = (reinterpret_cast<uintptr_t>(token) >> 4) % EntryParts::kSlots;
  if (shared && shared->fToken[slot] == token) {
    Py_INCREF(shared->fText[slot]);
    return shared->fText[slot];
  }
  PyObject* text =
      PyUnicode_DecodeUTF8(PyBytes_AS_STRING(token), PyBytes_GET_SIZE(token), "replace");
  if (text && shared) {
    shared->fToken[slot] = token;
    shared->fText[slot] = text;
  }
  return text;
}

}  // namespace

PyObject* MakeTokenEntry(LogicalLine* line, Py_ssize_t index, EntryParts* shared) {
  if (index < 0 || index >= line->fTokenCount) {
    PyErr_SetString(PyExc_IndexError, "Invalid token index");
    return nullptr;
  }
  PyRef position = PyRef::Steal(PositionOf(line, index, shared));
  if (!position) return nullptr;
  PyRef text = PyRef::Steal(TextOf(line->fTokenArray[index], shared));
  if (!text) return nullptr;
  PyObject* entry = NewPair(text.Get(), position.Get());
  if (entry && (text.Get() == Py_None || PyUnicode_CheckExact(text.Get())))
    UntrackAtomicTuple(entry);
  return entry;
}

PyObject* BuildTokensTuple(LogicalLine* line) {
  PyRef tuple = PyRef::Steal(PyTuple_New(line->fTokenCount));
  if (!tuple) return nullptr;
  EntryParts shared;
  bool atomic = true;
  for (Py_ssize_t i = 0; i < line->fTokenCount; i++) {
    PyObject* entry = MakeTokenEntry(line, i, &shared);
    if (!entry) return nullptr;
    atomic = atomic && !PyObject_GC_IsTracked(entry);
    PyTuple_SET_ITEM(tuple.Get(), i, entry);
  }
  if (atomic && line->fTokenCount > 0) UntrackAtomicTuple(tuple.Get());
  return tuple.Release();
}

PyObject* NamesDefined(LogicalLine* line) {
  if (line->fType == kClassDef || line->fType == kFunctionDef) {
    PyObject* name = line->fLocalScopeName;
    if (name && name != Py_None) return PyTuple_Pack(1, name);
    return PyTuple_New(0);
  }
  PyObject* tuple = PyTuple_New(line->fNameCount);
  if (!tuple) return nullptr;
  for (Py_ssize_t i = 0; i < line->fNameCount; i++) {
    PyObject* item = line->fNames[i];
    if (PyTuple_Check(item) && PyTuple_GET_SIZE(item) > 0) item = PyTuple_GET_ITEM(item, 0);
    Py_INCREF(item);
    PyTuple_SET_ITEM(tuple, i, item);
  }
  return tuple;
}
