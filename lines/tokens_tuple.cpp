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

#include "assembly/token_cache.h"
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

// Whole entries, by the token object and the position they stand for. Short token texts are
// shared by every read, so the same token at the same place recurs from line to line and from
// file to file ("self" at column 8, "=" after a short name), and a hit reads neither the token
// nor its text. A slot holds its token, so that no other object can take the token's address
// while the slot names it. Two ways to a set, the one used last first, in one cache line: two
// entries that take turns in a set keep both. A new entry takes the second way and moves to
// the first only when it is found again, so entries used once pass through the second ways.
struct EntrySlot {
  PyObject* fToken;    // owned, or null
  PyObject* fEntry;    // owned (text, position) tuple
  uint32_t fPosition;  // line index in the high half, column in the low
};
struct alignas(64) EntrySet {
  EntrySlot fWays[2];
};
constexpr uintptr_t kEntrySets = 4096;  // a power of two
EntrySet gEntries[kEntrySets];

// Only shared positions are keyed, which lie far below 65536 in both parts.
uint32_t PositionKey(TokenPosition at) {
  return static_cast<uint32_t>(at.fLine) << 16 | static_cast<uint32_t>(at.fColumn);
}

// Objects sit at multiples of 16 bytes: multiplying spreads the pair over every set.
uintptr_t EntrySetOf(PyObject* token, uint32_t position) {
  const uint64_t mixed = (reinterpret_cast<uint64_t>(token) ^ position) * 0x9E3779B97F4A7C15ull;
  return static_cast<uintptr_t>(mixed >> 40) & (kEntrySets - 1);
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

// The ints of position parts below this are made once for the process: past the small ints
// that the interpreter shares itself, a long line or a long logical line would otherwise make
// one for nearly every token. Larger parts are rare enough to be made each time.
constexpr int32_t kSharedInts = 1 << 16;
PyObject* gPositionInts[kSharedInts];  // owned, made at first use

// Returns a new reference to the int of a position part, or nullptr with an exception.
PyObject* PositionInt(int32_t value) {
  if (value >= kSharedInts) return PyLong_FromLong(value);
  PyObject*& known = gPositionInts[value];
  if (!known) known = PyLong_FromLong(value);
  Py_XINCREF(known);
  return known;
}

PyObject* NewPosition(TokenPosition position) {
  PyRef row = PyRef::Steal(PositionInt(position.fLine));
  PyRef column = PyRef::Steal(row ? PositionInt(position.fColumn) : nullptr);
  return column ? NewPair(row.Get(), column.Get()) : nullptr;
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

// Returns a new reference to the entry of a token at a position, made anew.
PyObject* NewEntry(PyObject* token, TokenPosition at) {
  if (!IsSharedText(token) || !IsSharedPosition(at)) {
    PyRef position = PyRef::Steal(PositionTuple(at));
    PyRef text = PyRef::Steal(position ? TextOf(token) : nullptr);
    return text ? NewPair(text.Get(), position.Get()) : nullptr;
  }
  PyObject* position = SharedPosition(at);
  PyObject* text = position ? SharedText(token) : nullptr;
  if (!text) return nullptr;
  const PyRef held = PyRef::FromBorrowed(text);  // through the tuple's allocation
  return NewPair(text, position);
}

// Returns a new reference to the entry of a token at a position: the shared one when a short
// token at a shared position has one.
PyObject* TokenEntry(PyObject* token, TokenPosition at) {
  if (!IsSharedPosition(at)) return NewEntry(token, at);
  const uint32_t position = PositionKey(at);
  EntrySet& set = gEntries[EntrySetOf(token, position)];
  EntrySlot& first = set.fWays[0];
  if (first.fToken == token && first.fPosition == position) {
    Py_INCREF(first.fEntry);
    return first.fEntry;
  }
  if (set.fWays[1].fToken == token && set.fWays[1].fPosition == position) {
    const EntrySlot found = set.fWays[1];
    set.fWays[1] = first;
    first = found;
    Py_INCREF(found.fEntry);
    return found.fEntry;
  }
  // A token made for its read alone would only hold its slot until another pushed it out.
  if (!IsSharedToken(token)) return NewEntry(token, at);
  PyObject* entry = NewEntry(token, at);
  if (!entry) return nullptr;
  // Making it may have run a finalizer that filled the set: take the set as it is now.
  const EntrySlot dropped = set.fWays[1];
  Py_INCREF(token);
  Py_INCREF(entry);
  set.fWays[1] = EntrySlot{.fToken = token, .fEntry = entry, .fPosition = position};
  Py_XDECREF(dropped.fToken);  // a bytes object and a tuple of str and ints: their release
  Py_XDECREF(dropped.fEntry);  // runs no Python code
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
