// TextBuffer storage. Growth at least doubles the capacity, so a logical line that is read
// as many physical lines costs linear time in its length.
#include "assembly/text_buffer.h"

#include <cstdlib>
#include <cstring>

void InitTextBuffer(TextBuffer* buffer) {
  buffer->fInline[0] = '\0';
  buffer->fData = buffer->fInline;
  buffer->fCapacity = kInlineTextSize;
  buffer->fLength = 0;
}

void ResetTextBuffer(TextBuffer* buffer) {
  if (buffer->fData != buffer->fInline) free(buffer->fData);
  InitTextBuffer(buffer);
}

static int Grow(TextBuffer* buffer, size_t needed) {
  size_t capacity = buffer->fCapacity * 2;
  if (capacity < needed) capacity = needed;
  char* data;
  if (buffer->fData == buffer->fInline) {
    data = static_cast<char*>(malloc(capacity));
    if (!data) return -1;
    memcpy(data, buffer->fInline, buffer->fLength + 1);
  } else {
    data = static_cast<char*>(realloc(buffer->fData, capacity));
    if (!data) return -1;
  }
  buffer->fData = data;
  buffer->fCapacity = capacity;
  return 0;
}

int AppendBytes(TextBuffer* buffer, const char* bytes, size_t n) {
  if (n == 0) return 0;
  const size_t needed = buffer->fLength + n + 1;  // the terminating NUL included
  if (needed > buffer->fCapacity && Grow(buffer, needed) != 0) return -1;
  memcpy(buffer->fData + buffer->fLength, bytes, n);
  buffer->fLength += n;
  buffer->fData[buffer->fLength] = '\0';
  return 0;
}

void TruncateText(TextBuffer* buffer, size_t length) {
  if (length < buffer->fLength) {
    buffer->fLength = length;
    buffer->fData[length] = '\0';
  }
}
