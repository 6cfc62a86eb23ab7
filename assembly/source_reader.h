// Source line reader: supplies the builder with one physical line per call, from the pending
// line or from the host's readline.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

#include "assembly/line_read_state.h"
#include "assembly/text_buffer.h"

// Appends the next physical line to the state's text. Sets *atEnd when readline returns an
// empty bytes object. Returns 0, or -1 with an exception set.
int ReadSourceLine(LineReadState* state, PyObject* readline, TextBuffer* pending, int* atEnd,
                   int64_t lineNumber);
