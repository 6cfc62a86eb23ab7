// Module-owned heap types.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "core/module_type.h"

#include <cstring>

PyTypeObject* NewModuleType(PyObject* module, PyType_Spec* spec) {
  PyObject* made = PyType_FromModuleAndSpec(module, spec, nullptr);
  if (!made) return nullptr;
  auto* type = reinterpret_cast<PyTypeObject*>(made);
  // tp_name is only read: the interpreter frees the heap copy of a type's name through a field
  // of its own, and the spec's name is a literal that lives as long as the module's code.
  const char* dot = strrchr(spec->name, '.');
  if (dot) type->tp_name = dot + 1;
  return type;
}
