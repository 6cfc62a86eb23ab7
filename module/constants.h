// The constants that the module publishes: the line types as bytes objects, the attribute
// kinds and infos, LogicalLineType, COMMENT_TOKEN and __version__.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/line_type.h"

struct LineTypeRow {
  const char* fName;         // the module attribute
  const char* fDescription;  // content of the bytes constant
  PyObject* fObject;         // the constant, set once at import and kept for the process
};

extern LineTypeRow LineTypeTable[kLineTypeCount];

// Fills the constants into the module's dictionary. Returns 0, or -1 with an exception set.
int AddModuleConstants(PyObject* dict);
