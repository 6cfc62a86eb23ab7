// Line scanner: cuts one physical line into tokens, one per call, carrying an open string
// literal over to the next physical line in the ScanState.
#pragma once

#include "tokenizer/operator_table.h"
#include "tokenizer/token_start.h"

// Position over one physical line of the logical line text.
struct ScanCursor {
  int fBase;               // offset of the line's first byte in the logical line text
  const char* fLineStart;  // the line's first byte
  const char* fLineEnd;    // one past its last byte, terminator included
  const char* fPos;        // where the next scan begins
  int fAtEnd;              // 1 once a call found no further token
  StringRules fRules;      // the string prefixes of the reading
};

// The offset in the logical line text of a position on the cursor's line.
inline int OffsetOf(const ScanCursor* cursor, const char* p) {
  return static_cast<int>(p - cursor->fLineStart) + cursor->fBase;
}

// Scans the next token into the state and moves the cursor past it, or sets fAtEnd. A token
// left with fComplete 0 is a string that continues on the next physical line. The line is the
// last of the text, which lies in a TextBuffer and so is followed by its zero padding.
void ScanNextToken(const OperatorTable* table, ScanState* state, ScanCursor* cursor);

// Scans a string body from `from` to its closing quote or the end of the line; returns where
// the token ends on this line.
const char* ScanStringBody(ScanState* state, const ScanCursor* cursor, const char* from);

// Returns the end of the name that begins at p, as the scanner steps over names. A zero byte
// follows the text.
const char* ScanNameEnd(const char* p, const char* end);

// Returns the end of the number that begins at p.
const char* ScanNumber(const char* p, const char* end);
