// Types that belong to one module object: heap types, so that every interpreter that imports
// the module makes its own and frees them with it.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

// Returns a new type made from `spec` for `module`, or nullptr with an exception set. The spec
// names it "module.Name", which gives the type its __module__; the messages about its objects
// (no such attribute, cannot create instances) name it by Name alone.
PyTypeObject* NewModuleType(PyObject* module, PyType_Spec* spec);
