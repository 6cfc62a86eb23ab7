// Building fTokens. Entries hold only str, int and tuples of those, which can take part in no
// cycle, so the collector need not walk them. Being immutable, the parts that repeat from line
// to line are made once for the process and shared: the positions of the first lines and
// columns, and the texts of short tokens. Sharing them cannot be observed, and it takes most
// of the allocations out of an entry.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/tokens_tuple.h"

#include <cstdint>
#include <cstring>

#include "core/py_ref.h"
#include "tokenizer/token_queries.h"
#include "tokenizer/token_text.h"

namespace {

// Positions up to these bounds are shared; they cover nearly every token of real source.
constexpr int kSharedLines = 16;
constexpr int kSharedColumns = 256;
PyObject* gPositions[kSharedLines][kSharedColumns];  // owned, made at first use

// Texts of short tokens, by content; a slot holds a token's bytes and the str shown for it.
constexpr uint32_t kTextSlots = 4096;  // a power of two
constexpr Py_ssize_t kSharedTextLimit = 40;
struct TextSlot {
  PyObject* fToken;  // owned bytes, or null
  PyObject* fText;   // owned str
};
TextSlot gTexts[kTextSlots];

// Whole entries, by the shared text and position they hold: the same token at the same place
// recurs from line to line ("self" at column 8, "=" after a short name). Two ways to a set,
// the one used last first: a pair of entries that take turns in one set would otherwise
// replace each other on every use.
constexpr uintptr_t kEntrySets = 8192;  // a power of two
struct EntrySet {
  PyObject* fWays[2];  // owned (text, position) tuples, or null
};
EntrySet gEntries[kEntrySets];

// Objects sit at multiples of 16 bytes, a few size classes apart: multiplying spreads the
// pair over every set, where a sum of the pointers would crowd a few.
uintptr_t EntrySetOf(PyObject* text, PyObject* position) {
  const uint64_t mixed = (reinterpret_cast<uint64_t>(text) * 0x9E3779B97F4A7C15ull) ^
                         reinterpret_cast<uint64_t>(position);
  return static_cast<uintptr_t>((mixed * 0xFF51AFD7ED558CCDull) >> 40) & (kEntrySets - 1);
}

bool EntryHolds(PyObject* entry, PyObject* text, PyObject* position) {
  return entry && PyTuple_GET_ITEM(entry, 0) == text && PyTuple_GET_ITEM(entry, 1) == position;
}

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

bool IsSharedPosition(TokenPosition position) {
  return position.fLine < kSharedLines && position.fColumn < kSharedColumns;
}

// Line indexes and columns are kept modulo 65536, so every int that a position can hold has a
// place here: past the small ints that the interpreter shares itself, a long line or a long
// logical line would otherwise make one for nearly every token.
PyObject* gPositionInts[1 << 16];  // owned, made at first use

// Returns a borrowed reference to the int of a position part, or nullptr with an exception.
PyObject* PositionInt(uint16_t value) {
  PyObject*& known = gPositionInts[value];
  if (!known) known = PyLong_FromLong(value);
  return known;
}

PyObject* NewPosition(TokenPosition position) {
  PyObject* row = PositionInt(position.fLine);
  PyObject* column = row ? PositionInt(position.fColumn) : nullptr;
  return column ? NewPair(row, column) : nullptr;
}

// Returns a borrowed reference to the shared tuple of a position (they live as long as the
// process), or nullptr with an exception set.
PyObject* SharedPosition(TokenPosition position) {
  PyObject*& shared = gPositions[position.fLine][position.fColumn];
  if (!shared) {
    PyObject* made = NewPosition(position);  // may set off a collection, and a finalizer
    if (!made) return nullptr;
    if (shared) {  // that made the same position meanwhile
      Py_DECREF(made);
    } else {
      shared = made;
    }
  }
  return shared;
}

bool IsSharedText(PyObject* token) { return PyBytes_GET_SIZE(token) <= kSharedTextLimit; }

// Returns a borrowed reference to the str shown for a short token, or nullptr with an
// exception set. It stays in the table only until another text takes its slot, and making a
// str sets off no collection, so it may be used until the next allocation of a tuple.
PyObject* SharedText(PyObject* token) {
  const TokenText text(token);
  TextSlot& slot = gTexts[HashText(text.fBytes, text.fLength) & (kTextSlots - 1)];
  if (slot.fToken == token) return slot.fText;
  if (slot.fToken && PyBytes_GET_SIZE(slot.fToken) == text.fLength &&
      memcmp(PyBytes_AS_STRING(slot.fToken), text.fBytes, static_cast<size_t>(text.fLength)) == 0) {
    // The same text from another read: each read has its own token objects, and the rest of
    // this one will ask with this object, which is then found without comparing texts.
    Py_INCREF(token);
    Py_SETREF(slot.fToken, token);
    return slot.fText;
  }
  PyObject* shown = TokenStr(token);
  if (!shown) return nullptr;
  Py_INCREF(token);
  PyObject* oldToken = slot.fToken;
  PyObject* oldText = slot.fText;
  slot = TextSlot{.fToken = token, .fText = shown};
  Py_XDECREF(oldToken);
  Py_XDECREF(oldText);
  return shown;
}

// Returns a new reference to the str shown for a token.
PyObject* TextOf(PyObject* token) {
  if (!IsSharedText(token)) return TokenStr(token);
  PyObject* shown = SharedText(token);
  Py_XINCREF(shown);
  return shown;
}

// Returns a new reference to the entry of a token at a position. When both parts are shared,
// so is the entry, found by the two objects it holds: a hit touches neither of them.
PyObject* TokenEntry(PyObject* token, TokenPosition at) {
  if (!IsSharedText(token) || !IsSharedPosition(at)) {
    PyRef position = PyRef::Steal(PositionTuple(at));
    PyRef text = PyRef::Steal(position ? TextOf(token) : nullptr);
    return text ? NewPair(text.Get(), position.Get()) : nullptr;
  }
  PyObject* position = SharedPosition(at);
  PyObject* text = position ? SharedText(token) : nullptr;
  if (!text) return nullptr;
  EntrySet& set = gEntries[EntrySetOf(text, position)];
  PyObject* first = set.fWays[0];
  if (EntryHolds(first, text, position)) {
    Py_INCREF(first);
    return first;
  }
  PyObject* second = set.fWays[1];
  if (EntryHolds(second, text, position)) {
    set.fWays[1] = first;
    set.fWays[0] = second;
    Py_INCREF(second);
    return second;
  }
  const PyRef held = PyRef::FromBorrowed(text);  // through the tuple's allocation
  PyObject* entry = NewPair(text, position);
  if (!entry) return nullptr;
  // That allocation may have run a finalizer that filled the set: take it as it is now.
  PyObject* dropped = set.fWays[1];
  set.fWays[1] = set.fWays[0];
  set.fWays[0] = entry;
  Py_INCREF(entry);
  Py_XDECREF(dropped);
  return entry;
}

PyObject* BuildTokensTuple(LogicalLine* line) {
  PyRef tuple = PyRef::Steal(PyTuple_New(line->fTokenCount));
  if (!tuple) return nullptr;
  // Out of the collector's sight from the start: the entries' allocations set off collections,
  // which would otherwise walk the whole tuple, again and again for a long line.
  if (line->fTokenCount > 0) PyObject_GC_UnTrack(tuple.Get());
  for (int i = 0; i < line->fTokenCount; i++) {
    PyObject* entry = TokenEntry(line->fTokenArray[i], line->fTokenPositions[i]);
    if (!entry) return nullptr;
    PyTuple_SET_ITEM(tuple.Get(), i, entry);
  }
  return tuple.Release();
}

}  // namespace

PyObject* PositionTuple(TokenPosition position) {
  if (!IsSharedPosition(position)) return NewPosition(position);
  PyObject* shared = SharedPosition(position);
  Py_XINCREF(shared);
  return shared;
}

PyObject* LineTokens(LogicalLine* line) {
  if (!line->fTokensTuple) {
    PyObject* built = BuildTokensTuple(line);
    if (!built) return nullptr;
    if (line->fTokensTuple) {  // a finalizer that a collection ran read it meanwhile
      Py_DECREF(built);
    } else {
      line->fTokensTuple = built;
    }
  }
  Py_INCREF(line->fTokensTuple);
  return line->fTokensTuple;
}
