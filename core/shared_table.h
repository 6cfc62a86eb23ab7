// SharedTable: the one kind of table that reads share. Token texts, fTokens entries and their
// positions recur from line to line and from file to file, so a bounded table hands out the same
// immutable object again instead of making a new one. Each interpreter that imports the module
// has tables of its own, which only its own code, under its own lock, reads and writes.
//
// What the tables rely on:
// - A slot is empty (all zero) or full. A full slot owns one reference to each object it
//   holds, and its key says what they stand for. The objects are bytes, str, int, or tuples of
//   those: immutable, so every reader may share them, and released without running any Python
//   code.
// - A slot changes only whole: Store takes over references made before the call and allocates
//   nothing. Making an object may set off a collection, and a collection may run a finalizer
//   that reads lines and so uses any table, even the same set. So a caller makes every object
//   of a slot first, and names the set again by its index when it stores; a slot that Find
//   returned may be read only until the next allocation, and what is kept past one is a
//   reference of the caller's own. A set may then hold the key twice, which only costs a way.
// - A set holds kWays slots, the one found last first. A new slot takes the last way and moves
//   to the first only when it is found again, so a run of keys seen once (fresh names, the
//   numbers of a long literal) passes through the last way and leaves the keys that recur.
// - All zero is empty, so a table in freshly zeroed memory is ready. Release empties every slot;
//   the table fills again as it is used. The module releases its tables when it is freed, and a
//   leak check releases them to count what reading holds.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

// A slot of a table that a key indexes directly: one object, and nothing else to compare.
// Every slot type has these two members.
struct ObjectSlot {
  PyObject* fObject;  // owned, or null
  bool Full() const { return fObject != nullptr; }
  void Release() const { Py_XDECREF(fObject); }
};

template <typename Slot, size_t kSets, size_t kWays = 1>
class SharedTable {
 public:
  // Returns the full slot of set `set` for which matches(slot) holds, now the set's first way,
  // or nullptr.
  template <typename Match>
  Slot* Find(size_t set, Match matches) {
    Slot* ways = fSets[set].fWays;
    for (size_t way = 0; way < kWays; way++) {
      if (!ways[way].Full() || !matches(ways[way])) continue;
      const Slot found = ways[way];
      for (; way > 0; way--) ways[way] = ways[way - 1];
      ways[0] = found;
      return &ways[0];
    }
    return nullptr;
  }

  // Returns the slot of a table with one way to a set, which its key indexes directly, or
  // nullptr while it is empty.
  const Slot* At(size_t set) const {
    static_assert(kWays == 1, "a key indexes one slot only where a set has one way");
    const Slot& slot = fSets[set].fWays[0];
    return slot.Full() ? &slot : nullptr;
  }

  // Whether set `set` has a full slot for which matches(slot) holds; the order stays.
  template <typename Match>
  bool Holds(size_t set, Match matches) const {
    for (const Slot& slot : fSets[set].fWays) {
      if (slot.Full() && matches(slot)) return true;
    }
    return false;
  }

  // Puts `slot` into the last way of set `set`, taking over its references, and releases what
  // the way held.
  void Store(size_t set, const Slot& slot) {
    Slot& way = fSets[set].fWays[kWays - 1];
    const Slot dropped = way;
    way = slot;
    dropped.Release();
  }

  // Empties every slot.
  void Release() {
    for (Set& set : fSets) {
      for (Slot& slot : set.fWays) {
        const Slot dropped = slot;
        slot = Slot{};
        dropped.Release();
      }
    }
  }

 private:
  // Two ways of a set share a cache line.
  struct alignas(kWays > 1 ? 64 : alignof(Slot)) Set {
    Slot fWays[kWays];
  };
  static_assert(kWays == 1 || sizeof(Set) == 64, "a set of ways fills one cache line");
  Set fSets[kSets];
};
