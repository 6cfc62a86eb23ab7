/* Test-only extension: calls any entry of the logicalline direct function table from Python.
 * An int entry that fails without an exception, or succeeds with one pending, raises
 * RuntimeError; the interpreter itself checks the entries that return objects. */
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "logicalline_direct.h"

static void** gTable;

static PyObject* IntResult(int rc) {
  if (rc == -1 ? !PyErr_Occurred() : PyErr_Occurred() != NULL)
    PyErr_SetString(PyExc_RuntimeError, "entry result and exception state disagree");
  return PyErr_Occurred() ? NULL : PyLong_FromLong(rc);
}

/* call(index, a, b, c): the entry's parameters in order; b and c are read as ints where the
 * entry takes ints. call(-1, capsule) gives the table address that a capsule holds. */
static PyObject* Call(PyObject* self, PyObject* args) {
  int n;
  PyObject *a = Py_None, *b = Py_None, *c = Py_None;
  if (!PyArg_ParseTuple(args, "i|OOO", &n, &a, &b, &c)) return NULL;
  int ib = PyLong_Check(b) ? (int)PyLong_AsLong(b) : 0;
  int ic = PyLong_Check(c) ? (int)PyLong_AsLong(c) : 0;
  if (PyErr_Occurred()) return NULL;
  if (n == -1) {
    void* table = PyCapsule_GetPointer(a, LOGICALLINE_CAPSULE_NAME);
    return table ? PyLong_FromVoidPtr(table) : NULL;
  }
#define E(type) ((type)gTable[n])
  switch (n) {
    case LL_CREATE_EMPTY_LOGICAL: return E(LLCreateEmptyLogical)();
    case LL_IS_LOGICAL: return IntResult(E(LLIsLogical)(a));
    case LL_GET_LOGICAL_TYPE_OBJECT: return E(LLGetLogicalTypeObject)();
    case LL_GET_ARG_NAME: {  /* lent: take the reference that Python needs */
      PyObject* name = E(LLGetArgName)(a, ib);
      Py_XINCREF(name);
      return name;
    }
    case LL_GET_ARG_NAME_COUNT: return IntResult(E(LLGetArgNameCount)(a));
    case LL_APPEND_TYPE_EQUIV_DIRECT: return IntResult(E(LLAppendTypeEquivDirect)(a, b, c));
    case LL_APPEND_ARG_TYPE_EQUIV_DIRECT:
      return IntResult(E(LLAppendArgTypeEquivDirect)(a, b, c));
    case LL_APPEND_ATTRIB_DIRECT: return IntResult(E(LLAppendAttribDirect)(a, b));
    case LL_APPEND_ARG_NAME_DIRECT: return IntResult(E(LLAppendArgNameDirect)(a, b));
    case LL_APPEND_BASE_CLASS_NAME_DIRECT: return IntResult(E(LLAppendBaseClassNameDirect)(a, b));
    case LL_GET_NAMES_DEFINED: return E(LLGetNamesDefined)(a);
    case LL_CLEAR_APPENDED: return IntResult(E(LLClearAppended)(a));
    case LL_GET_TOKEN_TYPE_DIRECT: return IntResult(E(LLGetTokenTypeDirect)(a, ib, ic));
    case LL_GET_STRING_TOKEN_TYPE_DIRECT: return IntResult(E(LLGetStringTokenTypeDirect)(a, ib));
  }
#undef E
  PyErr_SetString(PyExc_IndexError, "no such entry");
  return NULL;
}

static PyMethodDef kMethods[] = {
    {"call", Call, METH_VARARGS, NULL},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef kModule = {PyModuleDef_HEAD_INIT, "direct_ext", NULL, -1, kMethods};

PyMODINIT_FUNC PyInit_direct_ext(void) {
  PyObject* capsule = NULL;
  PyObject* logicalline = PyImport_ImportModule("logicalline");
  if (logicalline) {
    capsule = PyObject_CallMethod(logicalline, "GetDirectLogicalLineFunctionTable", NULL);
    Py_DECREF(logicalline);
  }
  if (!capsule) return NULL;
  /* The table lives as long as the logicalline module, which is never unloaded. */
  gTable = (void**)PyCapsule_GetPointer(capsule, LOGICALLINE_CAPSULE_NAME);
  Py_DECREF(capsule);
  return gTable ? PyModule_Create(&kModule) : NULL;
}
