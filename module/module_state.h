// ModuleState: what one import of the module owns, in the interpreter that imported it: the
// state its lines share, the parser type and the line type constants. Everything in it is
// released with the module object, and none of it is reachable from another interpreter.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/line_state.h"
#include "lines/line_type.h"

struct ModuleState {
  LineState* fShared;          // a block of its own, made at import
  PyTypeObject* fParserType;   // owned
  PyObject* fLineTypes[kLineTypeCount];  // owned bytes constants, by line type value
};

inline ModuleState* StateOf(PyObject* module) {
  return static_cast<ModuleState*>(PyModule_GetState(module));
}

// The state of the module that made `type`, one of its two types.
inline ModuleState* StateOfType(PyTypeObject* type) {
  return static_cast<ModuleState*>(PyType_GetModuleState(type));
}

// Makes `module` the one that CurrentModule finds in the calling interpreter. Returns 0, or -1
// with an exception set.
int MakeCurrent(PyObject* module);

// Returns a new reference to the module that the calling interpreter imported last, for native
// callers, which name no module; nullptr with RuntimeError set when there is none.
PyObject* CurrentModule();

// Has the interpreter drop the module's create hook when it shuts down, among its exit
// functions. Returns 0, or -1 with an exception set.
int DropCreateHookAtExit(PyObject* module);

// Visits, releases and frees what a state holds, for the module's slots.
int VisitState(ModuleState* state, visitproc visit, void* arg);
void ClearState(ModuleState* state);
void FreeState(ModuleState* state);
