// The parser's UpdateLogicalLineList: re-reads only what an edit of the text touched.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

extern const PyMethodDef kUpdateLogicalLineListMethod;
