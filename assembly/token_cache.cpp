// The per-call token text cache: direct-mapped, so a miss simply replaces the slot.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"

#include <cstdint>
#include <cstring>

void InitTokenCache(TokenCache* cache) {
  memset(cache->fSlots, 0, sizeof(cache->fSlots));
  memset(cache->fById, 0, sizeof(cache->fById));
}

void ClearTokenCache(TokenCache* cache) {
  for (PyObject*& slot : cache->fSlots) Py_CLEAR(slot);
  for (PyObject*& slot : cache->fById) Py_CLEAR(slot);
}

static uint32_t HashText(const char* p, Py_ssize_t n) {
  uint32_t hash = 2166136261u;
  for (Py_ssize_t i = 0; i < n; i++) hash = (hash ^ static_cast<unsigned char>(p[i])) * 16777619u;
  return hash;
}

PyObject* CachedBytes(TokenCache* cache, const char* p, Py_ssize_t n) {
  if (n > kCachedTextLimit || n <= 1) return PyBytes_FromStringAndSize(p, n);
  PyObject*& slot = cache->fSlots[HashText(p, n) & (kTokenCacheSlots - 1)];
  if (slot && PyBytes_GET_SIZE(slot) == n && memcmp(PyBytes_AS_STRING(slot), p, n) == 0) {
    Py_INCREF(slot);
    return slot;
  }
  PyObject* bytes = PyBytes_FromStringAndSize(p, n);
  if (!bytes) return nullptr;
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
