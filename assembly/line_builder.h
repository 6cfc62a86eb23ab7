// Logical line builder: reads and tokenizes physical lines until the logical line is complete,
// handing back a physical line that starts a new statement, then constructs the line.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "assembly/line_read_state.h"
#include "assembly/text_buffer.h"
#include "assembly/token_cache.h"
#include "module/parser.h"

// Returns a new reference to the next logical line (or to what the create hook returned), a
// new reference to None when there is nothing to return, or nullptr with an exception set.
// *lineNumber is the number of the next physical line to read and advances by the lines
// consumed.
PyObject* BuildLogicalLine(LogicalLineParser* parser, PyObject* readline, TextBuffer* pending,
                           int64_t* lineNumber, int* atEnd, TokenCache* cache,
                           TokenStorage* storage);
