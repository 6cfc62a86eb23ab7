// The constants that the module publishes: the line types as bytes objects, the attribute
// kinds and infos, LogicalLineType, COMMENT_TOKEN and __version__.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/module_state.h"

// Fills the constants into the module's dictionary, keeping the line types in the state too.
// Returns 0, or -1 with an exception set.
int AddModuleConstants(PyObject* module, ModuleState* state);
