/* direct_ext.c: test-only extension that calls every entry of the logicalline direct function
 * table through thin Python wrappers. Entries that return -1 must leave an exception set; the
 * wrappers turn that into a raise, and report an entry that fails silently as RuntimeError. */
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "logicalline_direct.h"

static void** gTable;

#define ENTRY(type, index) ((type)gTable[index])

/* Converts an int entry's result: -1 raises the pending exception, anything else is returned. */
static PyObject* IntResult(int rc) {
  if (rc == -1) {
    if (!PyErr_Occurred())
      PyErr_SetString(PyExc_RuntimeError, "entry returned -1 without an exception");
    return NULL;
  }
  if (PyErr_Occurred()) {
    PyErr_Clear();
    PyErr_SetString(PyExc_RuntimeError, "entry succeeded with an exception pending");
    return NULL;
  }
  return PyLong_FromLong(rc);
}

static PyObject* CreateEmpty(PyObject* self, PyObject* args) {
  return ENTRY(LLCreateEmptyLogical, LL_CREATE_EMPTY_LOGICAL)();
}

static PyObject* IsLogical(PyObject* self, PyObject* object) {
  return IntResult(ENTRY(LLIsLogical, LL_IS_LOGICAL)(object));
}

static PyObject* TypeObject(PyObject* self, PyObject* args) {
  return ENTRY(LLGetLogicalTypeObject, LL_GET_LOGICAL_TYPE_OBJECT)();
}

/* The entry lends its result; the wrapper takes the reference Python needs. */
static PyObject* GetArgName(PyObject* self, PyObject* args) {
  PyObject* line;
  int index;
  if (!PyArg_ParseTuple(args, "Oi", &line, &index)) return NULL;
  PyObject* name = ENTRY(LLGetArgName, LL_GET_ARG_NAME)(line, index);
  Py_XINCREF(name);
  return name;
}

static PyObject* GetArgNameCount(PyObject* self, PyObject* line) {
  return IntResult(ENTRY(LLGetArgNameCount, LL_GET_ARG_NAME_COUNT)(line));
}

static PyObject* AppendPair(PyObject* args, int index) {
  PyObject *line, *a, *b;
  if (!PyArg_ParseTuple(args, "OOO", &line, &a, &b)) return NULL;
  return IntResult(((LLAppendTypeEquivDirect)gTable[index])(line, a, b));
}

static PyObject* AppendOne(PyObject* args, int index) {
  PyObject *line, *object;
  if (!PyArg_ParseTuple(args, "OO", &line, &object)) return NULL;
  return IntResult(((LLAppendAttribDirect)gTable[index])(line, object));
}

static PyObject* AppendTypeEquiv(PyObject* self, PyObject* args) {
  return AppendPair(args, LL_APPEND_TYPE_EQUIV_DIRECT);
}
static PyObject* AppendArgTypeEquiv(PyObject* self, PyObject* args) {
  return AppendPair(args, LL_APPEND_ARG_TYPE_EQUIV_DIRECT);
}
static PyObject* AppendAttrib(PyObject* self, PyObject* args) {
  return AppendOne(args, LL_APPEND_ATTRIB_DIRECT);
}
static PyObject* AppendArgName(PyObject* self, PyObject* args) {
  return AppendOne(args, LL_APPEND_ARG_NAME_DIRECT);
}
static PyObject* AppendBaseClassName(PyObject* self, PyObject* args) {
  return AppendOne(args, LL_APPEND_BASE_CLASS_NAME_DIRECT);
}

static PyObject* GetNamesDefined(PyObject* self, PyObject* line) {
  return ENTRY(LLGetNamesDefined, LL_GET_NAMES_DEFINED)(line);
}

static PyObject* ClearAppended(PyObject* self, PyObject* line) {
  return IntResult(ENTRY(LLClearAppended, LL_CLEAR_APPENDED)(line));
}

static PyObject* GetTokenType(PyObject* self, PyObject* args) {
  PyObject* line;
  int index, skip;
  if (!PyArg_ParseTuple(args, "Oii", &line, &index, &skip)) return NULL;
  return IntResult(ENTRY(LLGetTokenTypeDirect, LL_GET_TOKEN_TYPE_DIRECT)(line, index, skip));
}

static PyObject* GetStringTokenType(PyObject* self, PyObject* args) {
  PyObject* text;
  int skip;
  if (!PyArg_ParseTuple(args, "Oi", &text, &skip)) return NULL;
  return IntResult(
      ENTRY(LLGetStringTokenTypeDirect, LL_GET_STRING_TOKEN_TYPE_DIRECT)(text, skip));
}

/* The table address held by a capsule, as an int. */
static PyObject* TableAddress(PyObject* self, PyObject* capsule) {
  void* table = PyCapsule_GetPointer(capsule, LOGICALLINE_CAPSULE_NAME);
  return table ? PyLong_FromVoidPtr(table) : NULL;
}

static PyMethodDef kMethods[] = {
    {"create_empty", CreateEmpty, METH_NOARGS, NULL},
    {"is_logical", IsLogical, METH_O, NULL},
    {"type_object", TypeObject, METH_NOARGS, NULL},
    {"get_arg_name", GetArgName, METH_VARARGS, NULL},
    {"get_arg_name_count", GetArgNameCount, METH_O, NULL},
    {"append_type_equiv", AppendTypeEquiv, METH_VARARGS, NULL},
    {"append_arg_type_equiv", AppendArgTypeEquiv, METH_VARARGS, NULL},
    {"append_attrib", AppendAttrib, METH_VARARGS, NULL},
    {"append_arg_name", AppendArgName, METH_VARARGS, NULL},
    {"append_base_class_name", AppendBaseClassName, METH_VARARGS, NULL},
    {"get_names_defined", GetNamesDefined, METH_O, NULL},
    {"clear_appended", ClearAppended, METH_O, NULL},
    {"get_token_type", GetTokenType, METH_VARARGS, NULL},
    {"get_string_token_type", GetStringTokenType, METH_VARARGS, NULL},
    {"table_address", TableAddress, METH_O, NULL},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef kModule = {PyModuleDef_HEAD_INIT, "direct_ext", NULL, -1, kMethods};

PyMODINIT_FUNC PyInit_direct_ext(void) {
  PyObject* logicalline = PyImport_ImportModule("logicalline");
  if (!logicalline) return NULL;
  PyObject* capsule =
      PyObject_CallMethod(logicalline, "GetDirectLogicalLineFunctionTable", NULL);
  Py_DECREF(logicalline);
  if (!capsule) return NULL;
  /* The table lives as long as the logicalline module, which is never unloaded. */
  gTable = (void**)PyCapsule_GetPointer(capsule, LOGICALLINE_CAPSULE_NAME);
  Py_DECREF(capsule);
  if (!gTable) return NULL;
  return PyModule_Create(&kModule);
}
