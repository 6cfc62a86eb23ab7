// The per-call token text cache.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"

#include <cstdint>
#include <cstring>

#include "tokenizer/token_text.h"

namespace {

constexpr size_t kMaxCacheSlots = 4096;

// Moves the texts into a table four times the size, once half the slots are filled. A text
// that finds its new slot taken is dropped: the cache only ever saves work.
void GrowCache(TokenCache* cache) {
  if (cache->fSlotCount >= kMaxCacheSlots || cache->fFilled * 2 < cache->fSlotCount) return;
  const size_t count = cache->fSlotCount * 4;
  auto* slots = static_cast<CacheSlot*>(PyMem_Calloc(count, sizeof(CacheSlot)));
  if (!slots) return;  // the small table still serves
  size_t filled = 0;
  for (size_t i = 0; i < cache->fSlotCount; i++) {
    CacheSlot& old = cache->fSlots[i];
    if (!old.fBytes) continue;
    CacheSlot& slot = slots[old.fHash & (count - 1)];
    if (slot.fBytes) {
      Py_DECREF(old.fBytes);
    } else {
      slot = old;
      filled++;
    }
  }
  if (cache->fSlots != cache->fInline) PyMem_Free(cache->fSlots);
  cache->fSlots = slots;
  cache->fSlotCount = count;
  cache->fFilled = filled;
}

}  // namespace

void InitTokenCache(TokenCache* cache) {
  memset(cache->fInline, 0, sizeof(cache->fInline));
  memset(cache->fById, 0, sizeof(cache->fById));
  cache->fSlots = cache->fInline;
  cache->fSlotCount = kInlineCacheSlots;
  cache->fFilled = 0;
}

void ClearTokenCache(TokenCache* cache) {
  for (size_t i = 0; i < cache->fSlotCount; i++) Py_XDECREF(cache->fSlots[i].fBytes);
  for (PyObject*& slot : cache->fById) Py_CLEAR(slot);
  if (cache->fSlots != cache->fInline) PyMem_Free(cache->fSlots);
}

PyObject* CachedBytes(TokenCache* cache, const char* p, Py_ssize_t n) {
  if (n > kCachedTextLimit || n <= 1) return PyBytes_FromStringAndSize(p, n);
  const uint64_t head = WordAt(p, n);
  const uint64_t tail = n > 8 ? WordAt(p + n - 8, 8) : 0;
  const uint32_t hash = HashWords(head, tail, n);
  CacheSlot& slot = cache->fSlots[hash & (cache->fSlotCount - 1)];
  if (slot.fBytes && slot.fHead == head && slot.fTail == tail && slot.fLength == n &&
      (n <= 16 || memcmp(TokenText(slot.fBytes).fBytes + 8, p + 8,
                         static_cast<size_t>(n - 16)) == 0)) {
    Py_INCREF(slot.fBytes);
    return slot.fBytes;
  }
  PyObject* bytes = PyBytes_FromStringAndSize(p, n);
  if (!bytes) return nullptr;
  Py_INCREF(bytes);
  if (!slot.fBytes) cache->fFilled++;
  PyObject* old = slot.fBytes;
  slot = CacheSlot{.fBytes = bytes, .fHead = head, .fTail = tail, .fHash = hash,
                   .fLength = static_cast<uint32_t>(n)};
  Py_XDECREF(old);
  GrowCache(cache);
  return bytes;
}

PyObject* CachedFixedText(TokenCache* cache, int id) {
  PyObject* known = cache->fById[id];
  Py_XINCREF(known);
  return known;
}

PyObject* StoreFixedText(TokenCache* cache, int id, const char* text) {
  PyObject* bytes = PyBytes_FromString(text);
  if (!bytes) return nullptr;
  Py_XSETREF(cache->fById[id], bytes);
  Py_INCREF(bytes);
  return bytes;
}
