// The parser's method table: GetLogicalLineList, the reading loop.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

extern PyMethodDef kParserMethods[];
