// Token texts shared within one GetLogicalLineList call: the same name, number or operator
// text read again hands out the same immutable bytes object instead of a new one.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "core/token_ids.h"

constexpr int kTokenCacheSlots = 4096;      // a power of two
constexpr Py_ssize_t kCachedTextLimit = 40;  // longer texts are rarely repeated

struct TokenCache {
  PyObject* fSlots[kTokenCacheSlots];  // owned bytes objects, or null
  uint32_t fHashes[kTokenCacheSlots];  // hash of each slot's text, checked before the text
  PyObject* fById[kTokenIdLimit];      // owned fixed texts of operators and placeholders
};

void InitTokenCache(TokenCache* cache);

// Releases every object that the cache holds.
void ClearTokenCache(TokenCache* cache);

// Returns a new reference to a bytes object holding the n bytes at p.
PyObject* CachedBytes(TokenCache* cache, const char* p, Py_ssize_t n);

// Returns a new reference to the fixed text stored for a token id, or nullptr if none is.
PyObject* CachedFixedText(TokenCache* cache, int id);

// Stores the fixed text that stands for a token id; returns a new reference to it.
PyObject* StoreFixedText(TokenCache* cache, int id, const char* text);
