// Construction of LogicalLine objects from the parts of a logical line, and the process-wide
// create hook that may take construction over.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/line_parts.h"

// Returns a new LogicalLine, or whatever the create hook returned when one is installed;
// nullptr with an exception set on failure.
PyObject* CreateLogicalLine(const LineParts& parts);

// Returns a new native LogicalLine built from the parts, never consulting the hook.
PyObject* CreateNativeLogicalLine(const LineParts& parts);

// True once a create hook is installed: lines are then the host's own objects.
bool HasCreateHook();

// Installs the create hook (any object; a new reference is kept), releasing the previous one.
void SetCreateHook(PyObject* hook);
