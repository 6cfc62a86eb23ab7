// What the reader takes in (the parser's options) and what it hands back for one logical line.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

#include "assembly/token_cache.h"
#include "core/token_position.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/string_prefixes.h"

struct ReadOptions {
  const OperatorTable* fOperatorTable;
  TokenTexts* fTokenTexts;    // the texts that the reads of the parser's interpreter share
  bool fCopyStrings;          // string tokens keep their own text, else the placeholder
  bool fSkipWhitespaceLines;  // a line of comments only is not handed back
  bool fRemoveComments;       // comment tokens are not listed
  bool fIncludeLineText;      // the parts carry the line's source text
  StringRules fStringRules;   // how formatted strings are read
  bool fLazyImports;          // "lazy import" and "lazy from" begin imports
  // Equal options read every text alike: an update reads with the options of the list's read.
  bool operator==(const ReadOptions&) const = default;
};

// The parts of one logical line. Everything is borrowed from the reader, valid until it reads
// the next line; whoever builds a line from them takes its own references and copies.
struct LineParts {
  int fIndentLevel;                 // >= 0
  int fFirstLine;                   // >= 0
  int fLineCount;                   // >= 1
  PyObject* const* fTokens;         // fTokenCount bytes objects
  const TokenPosition* fPositions;  // fTokenCount positions
  int fTokenCount;
  int fSpacesInIndent;
  int fTabsInIndent;
  int fIncomplete;
  const char* fLineText;            // NUL-terminated UTF-8, or null
  size_t fLineTextLength;
  int64_t fOffset;                  // where the first physical line starts in the source
  bool fLazyImports;                // read with lazy imports: the classifier takes them
};
