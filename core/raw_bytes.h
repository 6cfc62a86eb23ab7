// RawBytes: a growable byte string on the interpreter's raw heap (PyMem_RawMalloc) rather than
// the C library's, so that the memory traces that count what lines hold count it too. A list's
// record collects the text that readline hands out in one, and then keeps its block as it is.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

struct RawBytes {
  char* fData;  // owned raw heap block, or null while nothing is held
  size_t fLength;
  size_t fCapacity;
};

inline void InitRawBytes(RawBytes* bytes) { *bytes = RawBytes{nullptr, 0, 0}; }

// Appends n bytes, at least doubling the storage when it grows. Returns 0, or -1 when the
// memory cannot be had (no exception set; nothing changed).
int AppendRawBytes(RawBytes* bytes, const char* data, size_t n);

// Returns the held text in a raw heap block of its length (at least one byte), which the caller
// frees with PyMem_RawFree, and leaves `bytes` empty; nullptr when the memory cannot be had (no
// exception set; nothing changed). The block is trimmed where it lies, not copied.
char* TakeRawBytes(RawBytes* bytes);

// Frees the storage and leaves `bytes` empty.
void ReleaseRawBytes(RawBytes* bytes);
