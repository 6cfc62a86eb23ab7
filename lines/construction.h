// Construction of LogicalLine objects from the parts of a logical line, and the create hook of
// an interpreter, which may take construction over there.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_parts.h"
#include "lines/line_state.h"

// Returns a new LogicalLine of the interpreter that `shared` serves, or whatever its create hook
// returned when one is installed; nullptr with an exception set on failure. With `take`, the
// call takes over the references to the parts' tokens, whatever its outcome, so that a line
// keeps them without taking its own.
PyObject* CreateLogicalLine(LineState* shared, const LineParts& parts, bool take = false);

// Returns a new native LogicalLine of `lineType` built from the parts, never consulting the
// hook; `take` as for CreateLogicalLine.
PyObject* CreateNativeLogicalLine(PyTypeObject* lineType, const LineParts& parts,
                                  bool take = false);

// True once a create hook is installed in `shared`: lines are then the host's own objects.
bool HasCreateHook(const LineState* shared);

// Installs the create hook of `shared` (any object; a new reference is kept), releasing the
// previous one.
void SetCreateHook(LineState* shared, PyObject* hook);

// Removes the create hook of `shared`, if one is installed: lines are the module's own again.
void DropCreateHook(LineState* shared);
