// Construction of LogicalLine objects from the parts that the builder gathered, and the
// process-wide create hook that may take construction over.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

#include "module/token_position.h"

struct LineParts {
  int fIndentLevel;                      // >= 0
  int fFirstLine;                        // >= 0
  int fLineCount;                        // >= 1
  PyObject* const* fTokens;              // fTokenCount borrowed references
  const TokenPosition* fPositions;       // fTokenCount positions, or null
  int fTokenCount;
  int fSpacesInIndent;
  int fTabsInIndent;
  int fIncomplete;
  const char* fLineText;                 // NUL-terminated UTF-8, or null
  size_t fLineTextLength;
};

// Returns a new LogicalLine, or whatever the create hook returned when one is installed;
// nullptr with an exception set on failure.
PyObject* CreateLogicalLine(const LineParts& parts);

// Returns a new native LogicalLine built from the parts, never consulting the hook.
PyObject* CreateNativeLogicalLine(const LineParts& parts);

// Module function SetLogicalCreateFunction(hook).
PyObject* SetLogicalCreateFunction(PyObject* self, PyObject* args);
