// The module: its functions, their table, and initialisation. Each interpreter that imports it
// gets a module of its own, whose state holds everything the module makes: its types, its
// constants, the create hook and the tables that reads share.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/construction.h"
#include "lines/line_state.h"
#include "lines/tokens_tuple.h"
#include "logicalline_direct.h"
#include "module/constants.h"
#include "module/direct_table.h"
#include "module/line_surface.h"
#include "module/method_cast.h"
#include "module/module_state.h"
#include "module/parser.h"
#include "tokenizer/code_units.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/token_start.h"

namespace {

PyDoc_STRVAR(kCreateLogicalLineParserDoc,
             "Create a logical parser object.  Arguments set fields that set \n"
             "parser's behavior for its lifetime.  Signature is:\n"
             " def CreateLogicalLineParser(copy_strings = 1, \n"
             "                  skip_whitespace_lines = 1, remove_comments = 1) \n"
             " where copy_strings is a boolean which controls whether string \n"
             "          tokens are copied or if standard common string object is \n"
             "          used, \n"
             "       skip_whitespace_lines is a boolean that controls whether \n"
             "          whitespace lines are skipped, \n"
             "       removed_comments is a boolean that controls whether all comment \n"
             "          tokens are removed from returned logical lines. \n"
             "       include_line_text isa boolean that controls whether to include \n"
             "          copies of logical line original text as the fLineText \n"
             "          attribute in the logical line objects. \n"
             "       feature_version, keyword only, is a (major, minor) tuple as \n"
             "          ast.parse takes it: code is read as that version of \n"
             "          Python reads it, f-strings with nested fields from (3, 12), \n"
             "          t-strings from (3, 14), lazy imports from (3, 15); by default \n"
             "          as Python 3.10 does");
PyObject* CreateLogicalLineParser(PyObject* module, PyObject* args, PyObject* kwargs) {
  static const char* keywords[] = {"copy_strings", "skip_whitespace_lines", "remove_comments",
                                   "include_line_text", "feature_version", nullptr};
  PyObject* copyStrings = Py_True;
  PyObject* skipWhitespaceLines = Py_True;
  PyObject* removeComments = Py_True;
  PyObject* includeLineText = Py_True;
  PyObject* featureVersion = Py_None;
  if (!PyArg_ParseTupleAndKeywords(args, kwargs, "|OOOO$O", const_cast<char**>(keywords),
                                   &copyStrings, &skipWhitespaceLines, &removeComments,
                                   &includeLineText, &featureVersion))
    return nullptr;
  return NewParser(StateOf(module), copyStrings, skipWhitespaceLines, removeComments,
                   includeLineText, featureVersion);
}

PyDoc_STRVAR(kGetDirectLogicalLineFunctionTableDoc,
             "Return direct C callable function table for logical line");
PyObject* GetDirectLogicalLineFunctionTable(PyObject*, PyObject*) {
  return PyCapsule_New(const_cast<void**>(kLogicalLineFunctionTable), LOGICALLINE_CAPSULE_NAME,
                       nullptr);
}

PyDoc_STRVAR(kGetIdForTokenStartDoc,
             "Get token id for start of string; does not verify that token is complete or valid");
PyObject* GetIdForTokenStart(PyObject*, PyObject* args) {
  const char* text = nullptr;
  Py_ssize_t length = 0;
  if (!PyArg_ParseTuple(args, "s#", &text, &length)) return nullptr;
  return PyLong_FromLong(TokenIdForStart(&kOperatorTable, text, text + length));
}

PyObject* GetFirstCodeUnit(PyObject*, PyObject* args) {
  const char* text = nullptr;
  Py_ssize_t length = 0;
  if (!PyArg_ParseTuple(args, "s#", &text, &length)) return nullptr;
  const Py_UCS4 unit = FirstCodeUnit(text, text + length);
  // A unit in the surrogate range becomes a str holding that lone surrogate.
  return PyUnicode_FromKindAndData(PyUnicode_4BYTE_KIND, &unit, 1);
}

PyObject* SetLogicalCreateFunction(PyObject* module, PyObject* args) {
  PyObject* hook = nullptr;
  if (!PyArg_ParseTuple(args, "O", &hook)) return nullptr;
  SetCreateHook(StateOf(module)->fShared, hook);
  Py_RETURN_NONE;
}

PyDoc_STRVAR(kReleaseSharedTablesDoc,
             "Empty the tables of token texts and fTokens entries that reads share, as when the "
             "module is freed.  For leak checks: what reading holds can then be counted.");
PyObject* ReleaseSharedTablesFunction(PyObject* module, PyObject*) {
  ReleaseSharedTables(StateOf(module)->fShared);
  Py_RETURN_NONE;
}

PyMethodDef kModuleFunctions[] = {
    {"CreateLogicalLineParser", AsMethod(CreateLogicalLineParser), METH_VARARGS | METH_KEYWORDS,
     kCreateLogicalLineParserDoc},
    {"GetDirectLogicalLineFunctionTable", GetDirectLogicalLineFunctionTable, METH_VARARGS,
     kGetDirectLogicalLineFunctionTableDoc},
    {"GetIdForTokenStart", GetIdForTokenStart, METH_VARARGS, kGetIdForTokenStartDoc},
    {"_GetFirstCodeUnit", GetFirstCodeUnit, METH_VARARGS, nullptr},
    {"SetLogicalCreateFunction", SetLogicalCreateFunction, METH_VARARGS, nullptr},
    {"_ReleaseSharedTables", ReleaseSharedTablesFunction, METH_NOARGS, kReleaseSharedTablesDoc},
    {nullptr, nullptr, 0, nullptr},
};

// Makes everything the state holds, then publishes the constants. Returns 0, or -1 with an
// exception set.
int FillModule(PyObject* module) {
  ModuleState* state = StateOf(module);
  state->fShared = NewLineState(module, kLineMethods, kLineAttributes);
  if (!state->fShared) return -1;
  state->fParserType = NewParserType(module);
  if (!state->fParserType || AddModuleConstants(module, state) != 0) return -1;
  return MakeCurrent(module) == 0 && DropCreateHookAtExit(module) == 0 ? 0 : -1;
}

// A failure ends the process: there is no partly initialised module.
int ExecModule(PyObject* module) {
  if (FillModule(module) != 0 || PyErr_Occurred())
    _Py_FatalErrorFunc("PyInit_logicalline", "can't initialize logicalline module.");
  return 0;
}

int TraverseModule(PyObject* module, visitproc visit, void* arg) {
  return VisitState(StateOf(module), visit, arg);
}

int ClearModule(PyObject* module) {
  ClearState(StateOf(module));
  return 0;
}

void FreeModule(void* module) { FreeState(StateOf(static_cast<PyObject*>(module))); }

// Every interpreter may import the module, even one with a lock of its own: all that an import
// makes is its own. No Py_mod_gil slot: a build without the lock takes it back on import, since
// the state has not been shown safe without it.
PyModuleDef_Slot kModuleSlots[] = {
    {Py_mod_exec, reinterpret_cast<void*>(ExecModule)},
#ifdef Py_mod_multiple_interpreters
    {Py_mod_multiple_interpreters, Py_MOD_PER_INTERPRETER_GIL_SUPPORTED},
#endif
    {0, nullptr},
};

PyModuleDef kModuleDef = {
    PyModuleDef_HEAD_INIT, "logicalline", nullptr, sizeof(ModuleState), kModuleFunctions,
    kModuleSlots, TraverseModule, ClearModule, FreeModule,
};

}  // namespace

PyMODINIT_FUNC PyInit_logicalline() { return PyModuleDef_Init(&kModuleDef); }
