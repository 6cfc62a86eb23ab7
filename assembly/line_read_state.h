// LineReadState: the builder's working state for one logical line.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/text_buffer.h"
#include "assembly/token_cache.h"
#include "module/parser.h"
#include "module/token_position.h"
#include "tokenizer/token_start.h"

constexpr int kInlineLineStarts = 8;

// Token arrays that the reading loop keeps from one logical line to the next, so that a line
// does not allocate arrays of its own.
struct TokenStorage {
  PyObject** fTokenArray;
  TokenPosition* fTokenPositions;
  int fTokenCapacity;
};

void InitTokenStorage(TokenStorage* storage);

// Frees the arrays.
void ReleaseTokenStorage(TokenStorage* storage);

struct LineReadState {
  LogicalLineParser* fParser;  // borrowed
  TextBuffer fText;            // every physical line read for this logical line
  int fTextLength;             // bytes of fText accepted so far
  ScanState fScan;             // carried from one physical line to the next
  PyObject** fTokenArray;      // fTokenCount owned references
  TokenPosition* fTokenPositions;
  int fTokenCount;
  int fTokenCapacity;
  int fCopyStrings;
  int fTabsInIndent;
  int fSpacesInIndent;
  int fTabWidth;
  int fLineIndex;          // physical line within the logical line, from 0
  int fNesting;            // open bracket depth of the listed tokens; may go negative
  int fSignificantCount;   // listed tokens that are not comments
  int* fLineStarts;        // offset in fText of each physical line 0..fLineIndex
  int fLineStartCapacity;
  int fInlineLineStarts[kInlineLineStarts];
  TokenCache* fCache;      // owned by the reading loop
  TokenStorage* fStorage;  // owned by the reading loop; lends the token arrays
};

void InitLineReadState(LineReadState* state, LogicalLineParser* parser, TokenCache* cache,
                       TokenStorage* storage);

// Releases every listed token and every block the state holds, and returns the token arrays
// to the storage.
void ReleaseLineReadState(LineReadState* state);

// Records where physical line fLineIndex starts. Returns 0, or -1 with MemoryError set.
int NoteLineStart(LineReadState* state, int offset);

// Returns the index of the physical line that holds text offset `offset`.
int LineIndexOfOffset(const LineReadState* state, int offset);
