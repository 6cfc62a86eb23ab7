// An edit of a text in physical lines, as BytesIO.readline cuts them: proving that a host's
// description of one is true of the old and the new text, and finding one when it tells none.
// An update that trusted a wrong description would keep lines that no longer fit the text.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

// The edit, in physical lines, each count >= 0: [fFirst, fFirst + fOldCount) of the old text
// became [fFirst, fFirst + fNewCount) of the new one, and every other line stayed as it was.
struct Edit {
  int64_t fFirst;
  int64_t fOldCount;
  int64_t fNewCount;
  int64_t Delta() const { return fNewCount - fOldCount; }
};

// Where an edit lies in bytes: [fStart, fOldEnd) of the old text became [fStart, fNewEnd) of the
// new one. Each bound is the start of a physical line, or the end of its text.
struct ChangedBytes {
  size_t fStart;
  size_t fOldEnd;
  size_t fNewEnd;
};

// Moves p over `count` physical lines of [p, end); stores in *passed how many there were
// before the end.
const char* SkipLines(const char* p, const char* end, int64_t count, int64_t* passed);

// The physical lines of `text`: a last line without a line feed counts, and a final line feed
// starts no new one.
int64_t CountLines(std::string_view text);

// True when `next` is `old` with the whole lines old[start, end) replaced by exactly `newCount`
// whole lines, and every line before and after them kept byte for byte. `start` and `end` must
// be where physical lines of `old` start, or its end.
bool KeepsAllBut(std::string_view old, std::string_view next, size_t start, size_t end,
                 int64_t newCount);

// The narrowest change in whole lines that takes `old` to `next`: every line before fStart and
// from the ends on is kept, byte for byte.
ChangedBytes FindChange(std::string_view old, std::string_view next);
