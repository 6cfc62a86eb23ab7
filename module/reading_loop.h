// The parser's reading methods: GetLogicalLineList and GetLogicalLineListFromBuffer.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

extern const PyMethodDef kGetLogicalLineListMethod;
extern const PyMethodDef kGetLogicalLineListFromBufferMethod;
