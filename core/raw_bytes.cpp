// RawBytes storage.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "core/raw_bytes.h"

#include <cstdint>
#include <cstring>

int AppendRawBytes(RawBytes* bytes, const char* data, size_t n) {
  if (n > SIZE_MAX / 2 - bytes->fLength) return -1;
  const size_t needed = bytes->fLength + n;
  if (needed > bytes->fCapacity) {
    size_t capacity = bytes->fCapacity < 256 ? 256 : bytes->fCapacity;
    while (capacity < needed) capacity *= 2;
    char* grown = static_cast<char*>(PyMem_RawRealloc(bytes->fData, capacity));
    if (!grown) return -1;
    bytes->fData = grown;
    bytes->fCapacity = capacity;
  }
  memcpy(bytes->fData + bytes->fLength, data, n);
  bytes->fLength = needed;
  return 0;
}

char* TakeRawBytes(RawBytes* bytes) {
  char* block = static_cast<char*>(
      PyMem_RawRealloc(bytes->fData, bytes->fLength ? bytes->fLength : 1));
  if (!block) return nullptr;
  InitRawBytes(bytes);
  return block;
}

void ReleaseRawBytes(RawBytes* bytes) {
  PyMem_RawFree(bytes->fData);
  InitRawBytes(bytes);
}
