// Token starts: which kind of token begins at a position, and the string start recogniser
// that this rule and the line scanner share.
#pragma once

#include "tokenizer/operator_table.h"

// The scanner's result and carry-over record.
struct ScanState {
  int fTokenId;   // id of the current token; 0 before the first
  int fStart;     // offset of its first byte in the logical line text; -1 before the first
  int fEnd;       // offset one past its last byte
  int fComplete;  // 0 while a string literal runs on into the next physical line
  char fQuote;    // quote character of the current string token
  int fTriple;    // 1 when the current string token is triple-quoted
};

// The state before a logical line's first token.
constexpr ScanState kFreshScan = {
    .fTokenId = 0, .fStart = -1, .fEnd = -1, .fComplete = 0, .fQuote = 0, .fTriple = 0};

// Returns the position just after the opening quote(s) when an optional prefix and a quote
// start at p, writing STRING_TOKEN, the quote and the triple flag; otherwise writes
// ERROR_TOKEN and returns nullptr.
const char* ScanStringStart(const char* p, const char* end, ScanState* state);

// Returns the id of the token that begins at p in [p, end). Never fails. For an operator, the
// row found is stored in *row when row is given.
int TokenIdForStart(const OperatorTable* table, const char* p, const char* end,
                    const OperatorEntry** row = nullptr);
