// Source line reader: supplies the builder with one physical line per call, from the pending
// line, from the host's readline or from a buffer, and keeps the logical line's text.
#pragma once

#include <cstdint>

#include "assembly/reading_state.h"

// Sets up reading through readline.
void InitReadlineSource(SourceLines* source, PyObject* readline);

// Sets up reading a buffer [data, dataEnd) from `from`, the start of a physical line: offsets
// count from data, and a byte-order mark is skipped only at data itself. With `whole`, the rest
// of the buffer is searched for a NUL byte once, rather than line by line.
void InitBufferSource(SourceLines* source, const char* data, const char* from,
                      const char* dataEnd, bool whole);

// From now on, appends every piece that readline hands out to `kept` as well, and counts the
// pieces and notes whether each ends at a line feed.
void KeepSourceText(SourceLines* source, RawBytes* kept);

// The pieces that readline handed out and were kept, when each of them but the last ends at a
// line feed; -1 otherwise. The text was handed out as BytesIO.readline cuts it into lines when
// it has that many lines: no piece then holds a line feed before its end.
inline int64_t KeptPiecesCutAtFeeds(const SourceLines* source) {
  return source->fCutAtFeeds ? source->fKeptPieces : -1;
}

// Frees the text and the pending line.
void ReleaseSource(SourceLines* source);

// Empties the text for the next logical line, keeping its storage.
inline void StartText(SourceLines* source) { TruncateText(&source->fText, 0); }

// Appends the next physical line to the logical line's text. Sets fAtEnd when the source has
// no line left. lineNumber, the line's number, serves the message of a line holding a NUL
// byte. Returns 0, or -1 with an exception set.
int ReadSourceLine(SourceLines* source, int64_t lineNumber);

// Moves the text from lineStart on, the physical line read last, back to the pending line,
// from which the next read takes it. Returns 0, or -1 with MemoryError set.
int HandBackLine(SourceLines* source, int lineStart);

// Where, in the source, the next physical line to read starts.
inline int64_t NextLineOffset(const SourceLines* source) {
  return source->fPending.fLength ? source->fPendingOffset : source->fSourceOffset;
}
