// The token text table, and the fixed texts.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"

#include <cstdint>
#include <cstring>

#include "tokenizer/operator_table.h"
#include "tokenizer/token_start.h"
#include "tokenizer/token_text.h"

namespace {

// A text is known by its first eight bytes and its last eight (zero-padded words), and its
// length: that is the whole text up to 16 bytes, and the rest is compared only beyond that.
struct CacheSlot {
  PyObject* fBytes;  // owned, or null
  uint64_t fHead;
  uint64_t fTail;
  Py_ssize_t fLength;
};

// Two ways to a set, the one used last first, in one cache line: two texts that take turns in
// a set keep both. A new text takes the second way, and the first only once it is found again,
// so that a run of texts seen once (numbers in a long literal, fresh names) passes through the
// second ways and leaves the texts that recur in the first.
struct alignas(64) CacheSet {
  CacheSlot fWays[2];
};

constexpr size_t kCacheSets = 4096;  // a power of two: 8,192 texts in 256 KB
CacheSet gTexts[kCacheSets];

PyObject* gFixedTexts[kTokenIdLimit];  // owned, or null

CacheSet& SetOf(uint64_t head, uint64_t tail, Py_ssize_t n) {
  return gTexts[HashWords(head, tail, n) & (kCacheSets - 1)];
}

bool SlotHolds(const CacheSlot& slot, const char* p, Py_ssize_t n, uint64_t head,
               uint64_t tail) {
  return slot.fBytes && slot.fHead == head && slot.fTail == tail && slot.fLength == n &&
         (n <= 16 || memcmp(TokenText(slot.fBytes).fBytes + 8, p + 8,
                            static_cast<size_t>(n - 16)) == 0);
}

}  // namespace

PyObject* CachedBytes(const char* p, Py_ssize_t n) {
  if (n > kCachedTextLimit || n <= 1) return PyBytes_FromStringAndSize(p, n);
  const uint64_t head = WordAt(p, n);
  const uint64_t tail = TailWord(p, n);
  CacheSet& set = SetOf(head, tail, n);
  CacheSlot& first = set.fWays[0];
  if (SlotHolds(first, p, n, head, tail)) {
    Py_INCREF(first.fBytes);
    return first.fBytes;
  }
  if (SlotHolds(set.fWays[1], p, n, head, tail)) {
    const CacheSlot found = set.fWays[1];
    set.fWays[1] = first;
    first = found;
    Py_INCREF(found.fBytes);
    return found.fBytes;
  }
  PyObject* bytes = PyBytes_FromStringAndSize(p, n);
  if (!bytes) return nullptr;
  PyObject* dropped = set.fWays[1].fBytes;
  set.fWays[1] = CacheSlot{.fBytes = bytes, .fHead = head, .fTail = tail, .fLength = n};
  Py_INCREF(bytes);
  Py_XDECREF(dropped);  // a bytes object: its release runs no Python code
  return bytes;
}

bool IsSharedToken(PyObject* token) {
  const TokenText text(token);
  const Py_ssize_t n = text.fLength;
  if (n <= 1) return true;
  if (n > kCachedTextLimit) return false;
  const int id = TokenIdForStart(&kOperatorTable, text.fBytes, text.fBytes + n);
  if (id != NAME_TOKEN) return gFixedTexts[id] == token;
  // A token object has nothing readable past its text: its head is read a byte at a time.
  const CacheSet& set = SetOf(HeadWord(text.fBytes, n), TailWord(text.fBytes, n), n);
  return set.fWays[0].fBytes == token || set.fWays[1].fBytes == token;
}

PyObject* CachedFixedText(int id) {
  PyObject* known = gFixedTexts[id];
  Py_XINCREF(known);
  return known;
}

PyObject* StoreFixedText(int id, const char* text) {
  PyObject* bytes = PyBytes_FromString(text);
  if (!bytes) return nullptr;
  Py_XSETREF(gFixedTexts[id], bytes);
  Py_INCREF(bytes);
  return bytes;
}
