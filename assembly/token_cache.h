// Token texts shared within one reading call: the same name, number or operator text read
// again hands out the same immutable bytes object instead of a new one.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>
#include <cstdint>

#include "core/token_ids.h"

constexpr Py_ssize_t kCachedTextLimit = 40;  // longer texts are rarely repeated
constexpr size_t kInlineCacheSlots = 256;   // what a short source needs; a power of two

// A text is known by its first eight bytes and its last eight (zero-padded words), and its
// length: that is the whole text up to 16 bytes, and the rest is compared only beyond that.
struct CacheSlot {
  PyObject* fBytes;  // owned, or null
  uint64_t fHead;
  uint64_t fTail;
  uint32_t fHash;    // of the head, the tail and the length
  uint32_t fLength;
};

// Direct-mapped: a miss replaces the slot. It starts small, so that a short source costs
// little to set up, and grows with the texts it holds.
struct TokenCache {
  CacheSlot* fSlots;  // fInline, or a heap block
  size_t fSlotCount;
  size_t fFilled;     // slots that hold a text
  CacheSlot fInline[kInlineCacheSlots];
  PyObject* fById[kTokenIdLimit];  // owned fixed texts of operators and the string placeholder
};

void InitTokenCache(TokenCache* cache);

// Releases every object that the cache holds, and its storage; the cache is not used again.
void ClearTokenCache(TokenCache* cache);

// Returns a new reference to a bytes object holding the n bytes at p, which lie in a text with
// the padding of a TextBuffer after it.
PyObject* CachedBytes(TokenCache* cache, const char* p, Py_ssize_t n);

// Returns a new reference to the fixed text stored for a token id, or nullptr if none is.
PyObject* CachedFixedText(TokenCache* cache, int id);

// Stores the fixed text that stands for a token id; returns a new reference to it.
PyObject* StoreFixedText(TokenCache* cache, int id, const char* text);
