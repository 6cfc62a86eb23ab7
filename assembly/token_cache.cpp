// The per-call token text cache: direct-mapped, so a miss simply replaces the slot.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"

#include <cstdint>
#include <cstring>

void InitTokenCache(TokenCache* cache) {
  memset(cache->fSlots, 0, sizeof(cache->fSlots));
  memset(cache->fHashes, 0, sizeof(cache->fHashes));
  memset(cache->fById, 0, sizeof(cache->fById));
}

void ClearTokenCache(TokenCache* cache) {
  for (PyObject*& slot : cache->fSlots) Py_CLEAR(slot);
  for (PyObject*& slot : cache->fById) Py_CLEAR(slot);
}

// Mixes the first and last eight bytes and the length: enough to spread token texts over the
// slots, at a fixed cost whatever the length.
static uint32_t HashText(const char* p, Py_ssize_t n) {
  uint64_t head = 0;
  uint64_t tail = 0;
  memcpy(&head, p, static_cast<size_t>(n < 8 ? n : 8));
  if (n > 8) memcpy(&tail, p + n - 8, 8);
  const uint64_t mixed = (head ^ (tail * 0x9E3779B97F4A7C15ull) ^ static_cast<uint64_t>(n)) *
                         0xFF51AFD7ED558CCDull;
  return static_cast<uint32_t>(mixed >> 32);
}

PyObject* CachedBytes(TokenCache* cache, const char* p, Py_ssize_t n) {
  if (n > kCachedTextLimit || n <= 1) return PyBytes_FromStringAndSize(p, n);
  const uint32_t hash = HashText(p, n);
  const uint32_t index = hash & (kTokenCacheSlots - 1);
  PyObject*& slot = cache->fSlots[index];
  if (slot && cache->fHashes[index] == hash && PyBytes_GET_SIZE(slot) == n &&
      memcmp(PyBytes_AS_STRING(slot), p, static_cast<size_t>(n)) == 0) {
    Py_INCREF(slot);
    return slot;
  }
  PyObject* bytes = PyBytes_FromStringAndSize(p, n);
  if (!bytes) return nullptr;
  cache->fHashes[index] = hash;
  Py_XSETREF(slot, bytes);
  Py_INCREF(bytes);
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
