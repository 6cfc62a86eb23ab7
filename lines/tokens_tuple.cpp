// Building fTokens. Entries hold only str, int and tuples of those, which can take part in no
// cycle, so the collector need not walk them. Being immutable, the parts that repeat from line
// to line are made once and shared through the tables of the line's interpreter: the positions
// of the first lines and columns, the ints of position parts, the texts of short tokens, and
// whole entries. Sharing them cannot be observed, and it takes most of the allocations out of
// an entry.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/tokens_tuple.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "assembly/token_cache.h"
#include "core/py_ref.h"
#include "core/shared_table.h"
#include "tokenizer/token_queries.h"
#include "tokenizer/token_text.h"

namespace {

// Positions up to these bounds are shared; they cover nearly every token of real source.
constexpr int32_t kSharedLines = 16;
constexpr int32_t kSharedColumns = 256;

// The ints of position parts below this: past the small ints that the interpreter shares
// itself, a long line or a long logical line would otherwise make one for nearly every token.
// Larger parts are rare enough to be made each time.
constexpr int32_t kSharedInts = 1 << 16;

// The str shown for a short token, by the token's content: a slot holds a token's bytes and
// that str.
constexpr size_t kShownTextSets = 4096;  // a power of two
constexpr Py_ssize_t kShownTextLimit = 40;
struct ShownTextSlot {
  PyObject* fToken;  // owned bytes, or null
  PyObject* fText;   // owned str
  bool Full() const { return fToken != nullptr; }
  void Release() const {
    Py_XDECREF(fToken);
    Py_XDECREF(fText);
  }
};

// Whole entries, by the token object and the position they stand for. Short token texts are
// shared by every read, so the same token at the same place recurs from line to line and from
// file to file ("self" at column 8, "=" after a short name), and a hit reads neither the token
// nor its text. A slot holds its token, so that no other object can take the token's address
// while the slot names it.
struct EntrySlot {
  PyObject* fToken;    // owned, or null
  PyObject* fEntry;    // owned (text, position) tuple
  uint32_t fPosition;  // line index in the high half, column in the low
  bool Full() const { return fToken != nullptr; }
  void Release() const {
    Py_XDECREF(fToken);
    Py_XDECREF(fEntry);
  }
};
constexpr uintptr_t kEntrySets = 4096;  // a power of two

}  // namespace

struct EntryTables {
  SharedTable<ObjectSlot, kSharedLines * kSharedColumns> fPositions;  // by line * columns + column
  SharedTable<ObjectSlot, kSharedInts> fPositionInts;                 // by value
  SharedTable<ShownTextSlot, kShownTextSets> fShownTexts;
  SharedTable<EntrySlot, kEntrySets, 2> fEntries;
};

namespace {

bool IsSharedPosition(TokenPosition position) {
  return position.fLine < kSharedLines && position.fColumn < kSharedColumns;
}

// Only shared positions are keyed, which lie far below 65536 in both parts.
uint32_t PositionKey(TokenPosition at) {
  return static_cast<uint32_t>(at.fLine) << 16 | static_cast<uint32_t>(at.fColumn);
}

// Objects sit at multiples of 16 bytes: multiplying spreads the pair over every set.
uintptr_t EntrySetOf(PyObject* token, uint32_t position) {
  const uint64_t mixed = (reinterpret_cast<uint64_t>(token) ^ position) * 0x9E3779B97F4A7C15ull;
  return static_cast<uintptr_t>(mixed >> 40) & (kEntrySets - 1);
}

// Returns a new pair of the objects that make(0) and make(1) return (new references), out of
// the collector's sight, or nullptr with an exception set.
template <typename Make>
PyObject* NewPair(Make make) {
  PyRef pair = PyRef::Steal(PyTuple_New(2));
  if (!pair) return nullptr;
  PyObject_GC_UnTrack(pair.Get());
  for (Py_ssize_t i = 0; i < 2; i++) {
    PyObject* item = make(i);
    if (!item) return nullptr;
    PyTuple_SET_ITEM(pair.Get(), i, item);
  }
  return pair.Release();
}

// Returns a new reference to the int of a position part, or nullptr with an exception set.
PyObject* PositionInt(EntryTables* tables, int32_t value) {
  if (value >= kSharedInts) return PyLong_FromLong(value);
  const auto index = static_cast<size_t>(value);
  if (const ObjectSlot* known = tables->fPositionInts.At(index)) return Py_NewRef(known->fObject);
  PyObject* made = PyLong_FromLong(value);
  if (made) tables->fPositionInts.Store(index, ObjectSlot{.fObject = Py_NewRef(made)});
  return made;
}

PyObject* NewPosition(EntryTables* tables, TokenPosition position) {
  return NewPair([tables, position](Py_ssize_t i) {
    return PositionInt(tables, i == 0 ? position.fLine : position.fColumn);
  });
}

// Returns a new reference to the str shown for a token, or nullptr with an exception set.
PyObject* ShownText(EntryTables* tables, PyObject* token) {
  const TokenText text(token);
  if (text.fLength > kShownTextLimit) return TokenStr(token);
  const size_t set = HashText(text.fBytes, text.fLength) & (kShownTextSets - 1);
  const ShownTextSlot* found = tables->fShownTexts.Find(set, [&](const ShownTextSlot& slot) {
    return slot.fToken == token || (PyBytes_GET_SIZE(slot.fToken) == text.fLength &&
                                    memcmp(PyBytes_AS_STRING(slot.fToken), text.fBytes,
                                           static_cast<size_t>(text.fLength)) == 0);
  });
  if (found && found->fToken == token) return Py_NewRef(found->fText);
  // The same text from another read keeps its str under this read's token object, which the
  // rest of this read asks with and then finds without comparing texts.
  PyObject* shown = found ? Py_NewRef(found->fText) : TokenStr(token);
  if (shown)
    tables->fShownTexts.Store(set,
                              ShownTextSlot{.fToken = Py_NewRef(token), .fText = Py_NewRef(shown)});
  return shown;
}

// Returns a new reference to the entry of a token at a position, made anew.
PyObject* NewEntry(EntryTables* tables, PyObject* token, TokenPosition at) {
  return NewPair([tables, token, at](Py_ssize_t i) {
    return i == 0 ? ShownText(tables, token) : PositionTuple(tables, at);
  });
}

// Returns a new reference to the entry of a token at a position: the shared one when a shared
// token at a shared position has one.
PyObject* TokenEntry(EntryTables* tables, const TokenTexts* texts, PyObject* token,
                     TokenPosition at) {
  if (!IsSharedPosition(at)) return NewEntry(tables, token, at);
  const uint32_t position = PositionKey(at);
  const size_t set = EntrySetOf(token, position);
  const EntrySlot* found = tables->fEntries.Find(set, [&](const EntrySlot& slot) {
    return slot.fToken == token && slot.fPosition == position;
  });
  if (found) return Py_NewRef(found->fEntry);
  // A token made for its read alone would only hold its slot until another pushed it out.
  if (!IsSharedToken(texts, token)) return NewEntry(tables, token, at);
  PyObject* entry = NewEntry(tables, token, at);
  if (entry) {
    tables->fEntries.Store(set, EntrySlot{.fToken = Py_NewRef(token), .fEntry = Py_NewRef(entry),
                                          .fPosition = position});
  }
  return entry;
}

PyObject* BuildTokensTuple(EntryTables* tables, const TokenTexts* texts, LogicalLine* line) {
  PyRef tuple = PyRef::Steal(PyTuple_New(line->fTokenCount));
  if (!tuple) return nullptr;
  // Out of the collector's sight from the start: the entries' allocations set off collections,
  // which would otherwise walk the whole tuple, again and again for a long line.
  if (line->fTokenCount > 0) PyObject_GC_UnTrack(tuple.Get());
  for (int i = 0; i < line->fTokenCount; i++) {
    PyObject* entry = TokenEntry(tables, texts, line->fTokenArray[i], line->fTokenPositions[i]);
    if (!entry) return nullptr;
    PyTuple_SET_ITEM(tuple.Get(), i, entry);
  }
  return tuple.Release();
}

}  // namespace

EntryTables* NewEntryTables() {
  auto* tables = static_cast<EntryTables*>(calloc(1, sizeof(EntryTables)));  // all zero: empty
  if (!tables) PyErr_NoMemory();
  return tables;
}

PyObject* PositionTuple(EntryTables* tables, TokenPosition position) {
  if (!IsSharedPosition(position)) return NewPosition(tables, position);
  const auto index = static_cast<size_t>(position.fLine * kSharedColumns + position.fColumn);
  if (const ObjectSlot* known = tables->fPositions.At(index)) return Py_NewRef(known->fObject);
  PyObject* made = NewPosition(tables, position);
  if (made) tables->fPositions.Store(index, ObjectSlot{.fObject = Py_NewRef(made)});
  return made;
}

PyObject* TokensTupleOf(EntryTables* tables, const TokenTexts* texts, LogicalLine* line) {
  if (!line->fTokensTuple) {
    PyObject* built = BuildTokensTuple(tables, texts, line);
    if (!built) return nullptr;
    if (line->fTokensTuple) {  // a finalizer that a collection ran read it meanwhile
      Py_DECREF(built);
    } else {
      line->fTokensTuple = built;
    }
  }
  return Py_NewRef(line->fTokensTuple);
}

void ReleaseEntryTables(EntryTables* tables) {
  tables->fEntries.Release();
  tables->fShownTexts.Release();
  tables->fPositions.Release();
  tables->fPositionInts.Release();
}

void FreeEntryTables(EntryTables* tables) {
  if (!tables) return;
  ReleaseEntryTables(tables);
  free(tables);
}
