// ReadingState: everything one reading call keeps. Each part has one writer: the source line
// reader writes the source's part, the token list writes the tokens' part, and the builder
// writes the numbering; reading_state.cpp sets the whole up and releases it through them. The
// working state of the logical line being built is reused from one logical line to the next,
// so that a call allocates its arrays once.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>
#include <cstdint>

#include "assembly/line_parts.h"
#include "core/raw_bytes.h"
#include "core/text_buffer.h"
#include "core/token_position.h"
#include "tokenizer/formatted_string.h"
#include "tokenizer/token_start.h"

// Where physical lines come from, and the text of the logical line read from them so far.
// Written by the source line reader (source_reader.cpp) alone.
struct SourceLines {
  PyObject* fReadline;   // borrowed from the caller, or null: the buffer is read
  const char* fData;     // the buffer's next physical line, when there is no readline
  const char* fDataEnd;
  TextBuffer fPending;   // a physical line read but handed back: the next line to read
  int fAtEnd;            // 1 once readline returned b""
  int fAtStart;          // 1 until the first physical line is read: it may open with a mark
  int fMayHoldNul;       // 0 once the whole source is known to hold no NUL byte
  int64_t fSourceOffset;   // bytes the source has handed out so far
  int64_t fPendingOffset;  // where the pending line starts in the source
  int64_t fLineOffset;     // where the physical line read last starts in the source
  TextBuffer fText;      // every physical line read for the logical line, line breaks included
  // A copy of the whole text that readline hands out, for a list that updates keep; null when
  // none is wanted, and never for a buffer, which is its own copy.
  RawBytes* fKept;
  int fKeptOpen;        // 1 when the last piece kept ends without a line feed
  int fCutAtFeeds;      // 1 while every piece kept but the last ends at a line feed
  int64_t fKeptPieces;  // pieces kept: the lines of the text when no piece holds two
};

constexpr int kInlineLineStarts = 8;

// The tokens listed for the logical line, the scanner's state, and what was measured on the
// way. Written by the token list (token_list.cpp) alone.
struct LineTokens {
  ScanState fScan;            // carried from one physical line to the next
  FormattedStrings fStrings;  // the formatted strings open in fScan's string, when it is one
  // One block: fTokenCapacity references, of which fTokenCount are owned, then as many
  // positions, fTokenPositions pointing at the first.
  PyObject** fTokenArray;
  TokenPosition* fTokenPositions;
  int fTokenCount;
  size_t fTokenCapacity;
  int fIndent;            // of the first physical line; -1 until measured
  int fTabsInIndent;
  int fSpacesInIndent;
  int fNesting;           // open bracket depth of the listed tokens; may go negative
  int fSignificantCount;  // listed tokens that are not comments
  int* fLineStarts;       // offset in the text of each physical line 0..fLineIndex
  size_t fLineStartCapacity;
  int fInlineLineStarts[kInlineLineStarts];
};

struct ReadingState {
  ReadOptions fOptions;  // fixed for the call
  SourceLines fSource;
  LineTokens fTokens;
  // Written by the builder (line_builder.cpp).
  int64_t fLineNumber;   // number of the next physical line to read
  int fLineIndex;        // physical line within the logical line, from 0
};

// Sets up a call's state for reading through readline, numbering from firstLine.
void InitReadlineReading(ReadingState* state, const ReadOptions& options, PyObject* readline,
                         int64_t firstLine);

// Sets up a call's state for reading a buffer [data, dataEnd) from `from`, the start of the
// physical line numbered firstLine: offsets count from data, and a byte-order mark is skipped
// only at data itself. With `whole`, the rest of the buffer is searched for a NUL byte once,
// rather than line by line.
void InitBufferReading(ReadingState* state, const ReadOptions& options, const char* data,
                       const char* from, const char* dataEnd, int64_t firstLine, bool whole);

// Releases every reference and block the state holds.
void ReleaseReadingState(ReadingState* state);

// The length of the logical line's text, which its 32-bit offsets address.
inline int TextLength(const ReadingState* state) {
  return static_cast<int>(state->fSource.fText.fLength);
}
