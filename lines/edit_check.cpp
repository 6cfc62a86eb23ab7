// Edits in physical lines: the proof that a description is true, and the search for one. Both
// compare bytes only; the cost is one pass over the text outside the edit.
#include "lines/edit_check.h"

#include <algorithm>
#include <cstring>

namespace {

// Compared a block at a time with memcmp, which is many times faster than a loop over bytes;
// only the block that differs is searched byte by byte.
constexpr size_t kBlock = 1024;

// The length of the longest common prefix of a[0, n) and b[0, n).
size_t CommonPrefix(const char* a, const char* b, size_t n) {
  size_t i = 0;
  while (n - i >= kBlock && memcmp(a + i, b + i, kBlock) == 0) i += kBlock;
  while (i < n && a[i] == b[i]) i++;
  return i;
}

// The length of the longest common suffix of the n bytes before a and the n before b.
size_t CommonSuffix(const char* a, const char* b, size_t n) {
  size_t i = 0;
  while (n - i >= kBlock && memcmp(a - i - kBlock, b - i - kBlock, kBlock) == 0) i += kBlock;
  while (i < n && a[-1 - static_cast<ptrdiff_t>(i)] == b[-1 - static_cast<ptrdiff_t>(i)]) i++;
  return i;
}

bool IsLineStart(std::string_view text, size_t at) { return at == 0 || text[at - 1] == '\n'; }

// Where the physical line that holds text[at] starts (at itself when at is a line start).
size_t LineStartOf(std::string_view text, size_t at) {
  while (at > 0 && text[at - 1] != '\n') at--;
  return at;
}

// Where the physical line after the first line feed at or after `at` starts, or the end.
size_t AfterFeed(std::string_view text, size_t at) {
  const void* feed = memchr(text.data() + at, '\n', text.size() - at);
  return feed ? static_cast<size_t>(static_cast<const char*>(feed) - text.data()) + 1
              : text.size();
}

}  // namespace

const char* SkipLines(const char* p, const char* end, int64_t count, int64_t* passed) {
  for (*passed = 0; *passed < count && p < end; ++*passed) {
    const auto* feed = static_cast<const char*>(memchr(p, '\n', static_cast<size_t>(end - p)));
    p = feed ? feed + 1 : end;
  }
  return p;
}

int64_t CountLines(std::string_view text) {
  int64_t count = 0;
  SkipLines(text.data(), text.data() + text.size(), INT64_MAX, &count);
  return count;
}

bool KeepsAllBut(std::string_view old, std::string_view next, size_t start, size_t end,
                 int64_t newCount) {
  const size_t tail = old.size() - end;
  if (start > next.size() || tail > next.size() - start) return false;  // no room for them
  const size_t middleEnd = next.size() - tail;
  // A last line without a line feed stays the last, else it is another line now; and the
  // kept tail must start a line of the new text as it started one of the old.
  if (start > 0 && old[start - 1] != '\n' && next.size() != start) return false;
  if (tail > 0 && !IsLineStart(next, middleEnd)) return false;
  // The cheap test first: most wrong counts are refused before any text is compared.
  if (CountLines(next.substr(start, middleEnd - start)) != newCount) return false;
  return memcmp(old.data(), next.data(), start) == 0 &&
         memcmp(old.data() + end, next.data() + middleEnd, tail) == 0;
}

ChangedBytes FindChange(std::string_view old, std::string_view next) {
  const size_t shorter = std::min(old.size(), next.size());
  const size_t same = CommonPrefix(old.data(), next.data(), shorter);
  if (same == old.size() && same == next.size())
    return ChangedBytes{.fStart = same, .fOldEnd = same, .fNewEnd = same};
  // The line that holds the first difference is changed, and so is a last line without a line
  // feed that the new text extends.
  const size_t start = LineStartOf(old, same);
  const size_t kept = CommonSuffix(old.data() + old.size(), next.data() + next.size(),
                                   shorter - start);
  size_t oldEnd = old.size() - kept;
  const size_t shift = next.size() - old.size();  // modulo 2**64, as is every sum with it
  // The kept tail is whole lines: it starts where a line starts in both texts. After its first
  // line feed, every line start is one in both, as the bytes before it are the same.
  if (kept > 0 && !(IsLineStart(old, oldEnd) && IsLineStart(next, oldEnd + shift)))
    oldEnd = AfterFeed(old, oldEnd);
  return ChangedBytes{.fStart = start, .fOldEnd = oldEnd, .fNewEnd = oldEnd + shift};
}
