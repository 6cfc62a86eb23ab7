// TextBuffer storage. A logical line read as many physical lines costs linear time in its
// length, because growth at least doubles the capacity.
#include "core/text_buffer.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "core/growth.h"

void InitTextBuffer(TextBuffer* buffer) {
  memset(buffer->fInline, 0, kTextPadding);
  buffer->fData = buffer->fInline;
  buffer->fCapacity = kInlineTextSize;
  buffer->fLength = 0;
}

void ResetTextBuffer(TextBuffer* buffer) {
  if (buffer->fData != buffer->fInline) free(buffer->fData);
  InitTextBuffer(buffer);
}

int GrowTextBuffer(TextBuffer* buffer, size_t length) {
  if (length > SIZE_MAX - kTextPadding) return -1;
  return Grow(&buffer->fData, &buffer->fCapacity, length + kTextPadding, kInlineTextSize,
              buffer->fInline);
}

void TruncateText(TextBuffer* buffer, size_t length) {
  if (length < buffer->fLength) {
    buffer->fLength = length;
    Terminate(buffer);
  }
}
