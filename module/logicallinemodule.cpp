// The module: its function table and initialisation. State lives in process-wide variables
// (the line type constants and the create hook), so the module is initialised once per process.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "analysis/direct_table.h"
#include "module/construction.h"
#include "module/line_types.h"
#include "module/logical_line.h"
#include "module/method_cast.h"
#include "module/parser.h"
#include "tokenizer/code_units.h"
#include "tokenizer/token_start.h"

namespace {

PyMethodDef kModuleFunctions[] = {
    {"CreateLogicalLineParser", AsMethod(CreateLogicalLineParser), METH_VARARGS | METH_KEYWORDS,
     kCreateLogicalLineParserDoc},
    {"GetDirectLogicalLineFunctionTable", GetDirectLogicalLineFunctionTable, METH_VARARGS,
     "Return direct C callable function table for logical line"},
    {"GetIdForTokenStart", GetIdForTokenStart, METH_VARARGS,
     "Get token id for start of string; does not verify that token is complete or valid"},
    {"_GetFirstCodeUnit", GetFirstCodeUnit, METH_VARARGS, nullptr},
    {"SetLogicalCreateFunction", SetLogicalCreateFunction, METH_VARARGS, nullptr},
    {nullptr, nullptr, 0, nullptr},
};

PyModuleDef kModuleDef = {
    PyModuleDef_HEAD_INIT, "logicalline", nullptr, -1, kModuleFunctions,
    nullptr, nullptr, nullptr, nullptr,
};

}  // namespace

PyMODINIT_FUNC PyInit_logicalline() {
  if (PyType_Ready(&LogicalLineType) < 0 || PyType_Ready(&LogicalLineParserType) < 0)
    Py_FatalError("can't initialize logicalline module.");
  PyObject* module = PyModule_Create2(&kModuleDef, 1013);
  if (!module || PyErr_Occurred()) Py_FatalError("can't initialize logicalline module.");
  PyObject* dict = PyModule_GetDict(module);
  if (PyErr_Occurred()) Py_FatalError("can't initialize logicalline module.");
  AddModuleConstants(dict);
  if (PyErr_Occurred()) Py_FatalError("can't initialize logicalline module.");
  return module;
}
