// TextBuffer: a growable NUL-terminated byte string with inline storage for short texts.
// It holds the logical line's text and the pending physical line.
#pragma once

#include <cstddef>
#include <cstring>

constexpr size_t kInlineTextSize = 160;
// Zero bytes kept after the text, its terminating NUL first: a scanner may load a whole word of
// kTextPadding bytes at any offset of the text without reading past the storage, and a run of
// name characters or blanks ends at the first of them. Every storage the buffer uses, inline or
// grown, holds the text and this padding: GrowTextBuffer adds it, and only it makes storage.
constexpr size_t kTextPadding = 8;
static_assert(kInlineTextSize > kTextPadding, "the inline storage holds the padding");

struct TextBuffer {
  char fInline[kInlineTextSize];
  char* fData;       // fInline, or a heap block owned by the buffer
  size_t fCapacity;  // bytes of storage, terminating NUL included
  size_t fLength;    // text bytes held; fData[fLength] and the padding after it are zero
};

// Puts the buffer into the fresh state without freeing anything.
void InitTextBuffer(TextBuffer* buffer);

// Frees the heap block, if any, and puts the buffer into the fresh state.
void ResetTextBuffer(TextBuffer* buffer);

// Makes room for `length` bytes of text and the padding after them. Returns 0, or -1 when
// storage cannot be had (no Python exception is set; the buffer is unchanged).
int GrowTextBuffer(TextBuffer* buffer, size_t length);

// Zeroes the padding from the end of the text on.
inline void Terminate(TextBuffer* buffer) {
  memset(buffer->fData + buffer->fLength, 0, kTextPadding);
}

// Appends n bytes. Returns 0, or -1 when storage cannot be had (no Python exception is set;
// the buffer is unchanged). Inline: every physical line read is appended.
inline int AppendBytes(TextBuffer* buffer, const char* bytes, size_t n) {
  if (n == 0) return 0;
  const size_t length = buffer->fLength + n;
  if (length + kTextPadding > buffer->fCapacity && GrowTextBuffer(buffer, length) != 0) return -1;
  memcpy(buffer->fData + buffer->fLength, bytes, n);
  buffer->fLength += n;
  Terminate(buffer);
  return 0;
}

// Cuts the text to `length` bytes, keeping the storage.
void TruncateText(TextBuffer* buffer, size_t length);
