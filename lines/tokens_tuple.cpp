// Building fTokens. Entries hold only str, int and tuples of those, which can take part in no
// cycle, so the collector need not walk them.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/tokens_tuple.h"

#include <cstdint>

#include "core/py_ref.h"
#include "tokenizer/token_queries.h"

namespace {

PyObject* NewPair(PyObject* first, PyObject* second) {
  PyObject* pair = PyTuple_New(2);
  if (!pair) return nullptr;
  Py_INCREF(first);
  PyTuple_SET_ITEM(pair, 0, first);
  Py_INCREF(second);
  PyTuple_SET_ITEM(pair, 1, second);
  PyObject_GC_UnTrack(pair);
  return pair;
}

// The texts of one fTokens tuple. The reader hands out one object per repeated token text,
// so a repeated token decodes once. Borrowed: the entries built so far hold them.
struct SharedTexts {
  static constexpr uintptr_t kSlots = 64;
  PyObject* fToken[kSlots] = {};
  PyObject* fText[kSlots] = {};

  PyObject* TextOf(PyObject* token) {
    const uintptr_t slot = (reinterpret_cast<uintptr_t>(token) >> 4) % kSlots;
    if (fToken[slot] == token) {
      Py_INCREF(fText[slot]);
      return fText[slot];
    }
    PyObject* text = TokenStr(token);
    if (text) {
      fToken[slot] = token;
      fText[slot] = text;
    }
    return text;
  }
};

PyObject* BuildTokensTuple(LogicalLine* line) {
  PyRef tuple = PyRef::Steal(PyTuple_New(line->fTokenCount));
  if (!tuple) return nullptr;
  SharedTexts shared;
  for (int i = 0; i < line->fTokenCount; i++) {
    PyRef position = PyRef::Steal(PositionTuple(line->fTokenPositions[i]));
    if (!position) return nullptr;
    PyRef text = PyRef::Steal(shared.TextOf(line->fTokenArray[i]));
    if (!text) return nullptr;
    PyObject* entry = NewPair(text.Get(), position.Get());
    if (!entry) return nullptr;
    PyTuple_SET_ITEM(tuple.Get(), i, entry);
  }
  if (line->fTokenCount > 0) PyObject_GC_UnTrack(tuple.Get());
  return tuple.Release();
}

}  // namespace

PyObject* PositionTuple(TokenPosition position) {
  PyRef row = PyRef::Steal(PyLong_FromLong(position.fLine));
  if (!row) return nullptr;
  PyRef column = PyRef::Steal(PyLong_FromLong(position.fColumn));
  if (!column) return nullptr;
  return NewPair(row.Get(), column.Get());
}

PyObject* LineTokens(LogicalLine* line) {
  if (!line->fTokensTuple) {
    line->fTokensTuple = BuildTokensTuple(line);
    if (!line->fTokensTuple) return nullptr;
  }
  Py_INCREF(line->fTokensTuple);
  return line->fTokensTuple;
}
