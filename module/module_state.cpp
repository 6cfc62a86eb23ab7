// The module's state, and what the module's interpreter does for it. An interpreter keeps a weak
// reference to the module it imported last in its own dictionary: native callers then reach
// that module's state without keeping the module alive.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/module_state.h"

#include "core/py_ref.h"
#include "lines/construction.h"

namespace {

constexpr char kCurrentModuleKey[] = "logicalline.current_module";

// Returns the calling interpreter's dictionary (borrowed), or nullptr with RuntimeError set.
PyObject* InterpreterDict() {
  PyObject* dict = PyInterpreterState_GetDict(PyInterpreterState_Get());
  if (!dict) PyErr_SetString(PyExc_RuntimeError, "the interpreter keeps no dictionary");
  return dict;
}

// Returns a new reference to the object a weak reference names, or None once it is gone.
PyObject* Referent(PyObject* ref) {
#if PY_VERSION_HEX >= 0x030D0000
  PyObject* object = nullptr;
  if (PyWeakref_GetRef(ref, &object) < 0) return nullptr;
  return object ? object : Py_NewRef(Py_None);
#else
  return Py_NewRef(PyWeakref_GetObject(ref));
#endif
}

// Drops the create hook of the module that `ref`, a weak reference, names, if it still lives.
//
// A hook is host code, which reaches the host's globals, where the host keeps its lines and
// parsers. Those hold the module's types, and the types hold the module; but the collector does
// not watch a parser, nor a line that the host never annotated, and so cannot tell that the
// module, its hook and the lines form a cycle and nothing else. Dropped when the interpreter
// shuts down, the hook lets the module go, with everything it holds.
PyObject* DropHookOf(PyObject* ref, PyObject*) {
  PyRef module = PyRef::Steal(Referent(ref));
  if (!module) return nullptr;
  if (module.Get() != Py_None) DropCreateHook(StateOf(module.Get())->fShared);
  Py_RETURN_NONE;
}

PyMethodDef kDropHookMethod = {"_DropCreateHook", DropHookOf, METH_NOARGS, nullptr};

}  // namespace

int DropCreateHookAtExit(PyObject* module) {
  PyRef ref = PyRef::Steal(PyWeakref_NewRef(module, nullptr));
  if (!ref) return -1;
  PyRef drop = PyRef::Steal(PyCFunction_New(&kDropHookMethod, ref.Get()));
  if (!drop) return -1;
  PyRef atexit = PyRef::Steal(PyImport_ImportModule("atexit"));
  if (!atexit) return -1;
  return PyRef::Steal(PyObject_CallMethod(atexit.Get(), "register", "O", drop.Get())) ? 0 : -1;
}

int MakeCurrent(PyObject* module) {
  PyObject* dict = InterpreterDict();
  if (!dict) return -1;
  PyRef ref = PyRef::Steal(PyWeakref_NewRef(module, nullptr));
  if (!ref) return -1;
  return PyDict_SetItemString(dict, kCurrentModuleKey, ref.Get());
}

PyObject* CurrentModule() {
  PyObject* dict = InterpreterDict();
  if (!dict) return nullptr;
  PyObject* ref = PyDict_GetItemString(dict, kCurrentModuleKey);  // borrowed
  PyRef module = PyRef::Steal(ref ? Referent(ref) : Py_NewRef(Py_None));
  if (!module) return nullptr;
  if (module.Get() == Py_None) {
    PyErr_SetString(PyExc_RuntimeError, "logicalline is not imported in this interpreter");
    return nullptr;
  }
  return module.Release();
}

int VisitState(ModuleState* state, visitproc visit, void* arg) {
  Py_VISIT(state->fParserType);
  for (PyObject* constant : state->fLineTypes) Py_VISIT(constant);
  return state->fShared ? VisitLineState(state->fShared, visit, arg) : 0;
}

// The lines' state first, which releases the create hook before anything else.
void ClearState(ModuleState* state) {
  if (state->fShared) ClearLineState(state->fShared);
  Py_CLEAR(state->fParserType);
  for (PyObject*& constant : state->fLineTypes) Py_CLEAR(constant);
}

void FreeState(ModuleState* state) {
  ClearState(state);
  if (state->fShared) FreeLineState(state->fShared);
  state->fShared = nullptr;
}
