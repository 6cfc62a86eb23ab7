// The parser object: four options fixed at creation, and the one method GetLogicalLineList.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_parts.h"
#include "lines/line_state.h"
#include "module/module_state.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/string_prefixes.h"

struct LogicalLineParser {
  PyObject_HEAD
  int fSkipWhitespaceLines;  // a line of comments only is not returned
  int fCopyStrings;          // string tokens keep their own text
  int fRemoveComments;       // comment tokens are not listed
  const OperatorTable* fOperatorTable;  // always the module's one table
  int fIncludeLineText;      // lines carry their source text
  StringRules fStringRules;  // the interpreter version whose strings the parser reads
  LineState* fShared;        // its module's, which lives while the parser holds its type
  int fLazyImports;          // "lazy import" and "lazy from" begin imports
};

// Returns a new parser type for `module`, or nullptr with an exception set.
PyTypeObject* NewParserType(PyObject* module);

// Returns a new parser of the module whose state is `state`, whose options are the truth values
// of the four objects, taken in the order skip_whitespace_lines, remove_comments, copy_strings,
// include_line_text, and the string rules of featureVersion; nullptr with the exception of the
// first truth test that raises, or of a feature version that is refused.
PyObject* NewParser(ModuleState* state, PyObject* copyStrings, PyObject* skipWhitespaceLines,
                    PyObject* removeComments, PyObject* includeLineText, PyObject* featureVersion);

// The options of a parser, as the reader takes them.
ReadOptions ParserOptions(PyObject* parser);

// What the lines that a parser reads share.
inline LineState* ParserShared(PyObject* parser) {
  return reinterpret_cast<LogicalLineParser*>(parser)->fShared;
}

// Returns a new (3, minor) tuple of the newest interpreter version whose reading the parser
// knows; every later version reads as it does. nullptr with an exception set on failure.
PyObject* NewestFeatureVersion();
