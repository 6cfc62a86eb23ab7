/* native_host: an example host extension that annotates logicalline's lines from C, through the
 * module's table of native functions (logicalline_direct.h) instead of Python method calls.
 * Its rules for finding parameters, base classes and assignment targets are plain token walks,
 * stated where they are applied; a real tool would bring its own parser. */
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "logicalline_direct.h"

/* Entries 7, 8 and 9 share this shape, so one helper can feed any of them. */
typedef int (*AppendEntry)(PyObject* line, PyObject* object);

/* What module init obtains once. The table is static data of logicalline, valid for as long as
 * that module lives, so the module is held here for the life of the process. */
static struct {
  PyObject* fLogicalLine;
  void** fTable;  /* NULL until init has obtained everything below */
  LLIsLogical fIsLogical;
  LLGetArgName fGetArgName;
  LLGetArgNameCount fGetArgNameCount;
  LLAppendAttribDirect fAppendAttrib;
  LLAppendArgNameDirect fAppendArgName;
  LLAppendBaseClassNameDirect fAppendBaseClassName;
  LLGetNamesDefined fGetNamesDefined;
  LLClearAppended fClearAppended;
  LLGetTokenTypeDirect fGetTokenType;
  LLGetStringTokenTypeDirect fGetStringTokenType;
  PyObject* fFunctionDef;  /* a line's fType is one of these very objects */
  PyObject* fClassDef;
  PyObject* fAssignment;
} gHost;

/* Token ids. The module publishes none but COMMENT_TOKEN, so init asks it for the id of each
 * sample text below; keywords share the name id. */
static struct {
  int fName, fComma, fEqual, fColon, fDot, fStar, fDoubleStar;
  int fOpen[3], fClose[3];  /* "(", "[", "{" and their closing partners */
} gIds;

static const struct {
  const char* fSample;
  int* fId;
} kSamples[] = {
    {"x", &gIds.fName},     {",", &gIds.fComma},    {"=", &gIds.fEqual},
    {":", &gIds.fColon},    {".", &gIds.fDot},      {"*", &gIds.fStar},
    {"**", &gIds.fDoubleStar},
    {"(", &gIds.fOpen[0]},  {"[", &gIds.fOpen[1]},  {"{", &gIds.fOpen[2]},
    {")", &gIds.fClose[0]}, {"]", &gIds.fClose[1]}, {"}", &gIds.fClose[2]},
};

static const struct {
  const char* fName;
  PyObject** fType;
} kLineTypes[] = {
    {"kFunctionDef", &gHost.fFunctionDef},
    {"kClassDef", &gHost.fClassDef},
    {"kAssignment", &gHost.fAssignment},
};

/* Imports logicalline and keeps the entries this file calls, each cast to its own type. */
static int LoadTable(void) {
  gHost.fLogicalLine = PyImport_ImportModule("logicalline");
  if (!gHost.fLogicalLine) return -1;
  PyObject* capsule =
      PyObject_CallMethod(gHost.fLogicalLine, "GetDirectLogicalLineFunctionTable", NULL);
  if (!capsule) return -1;
  void** table = (void**)PyCapsule_GetPointer(capsule, LOGICALLINE_CAPSULE_NAME);
  Py_DECREF(capsule);  /* the capsule only carries the pointer; the table stays */
  if (!table) return -1;
  gHost.fIsLogical = (LLIsLogical)table[LL_IS_LOGICAL];
  gHost.fGetArgName = (LLGetArgName)table[LL_GET_ARG_NAME];
  gHost.fGetArgNameCount = (LLGetArgNameCount)table[LL_GET_ARG_NAME_COUNT];
  gHost.fAppendAttrib = (LLAppendAttribDirect)table[LL_APPEND_ATTRIB_DIRECT];
  gHost.fAppendArgName = (LLAppendArgNameDirect)table[LL_APPEND_ARG_NAME_DIRECT];
  gHost.fAppendBaseClassName = (LLAppendBaseClassNameDirect)table[LL_APPEND_BASE_CLASS_NAME_DIRECT];
  gHost.fGetNamesDefined = (LLGetNamesDefined)table[LL_GET_NAMES_DEFINED];
  gHost.fClearAppended = (LLClearAppended)table[LL_CLEAR_APPENDED];
  gHost.fGetTokenType = (LLGetTokenTypeDirect)table[LL_GET_TOKEN_TYPE_DIRECT];
  gHost.fGetStringTokenType = (LLGetStringTokenTypeDirect)table[LL_GET_STRING_TOKEN_TYPE_DIRECT];
  gHost.fTable = table;
  return 0;
}

static int LoadLineTypes(void) {
  for (size_t i = 0; i < sizeof(kLineTypes) / sizeof(kLineTypes[0]); i++) {
    *kLineTypes[i].fType = PyObject_GetAttrString(gHost.fLogicalLine, kLineTypes[i].fName);
    if (!*kLineTypes[i].fType) return -1;
  }
  return 0;
}

static int LearnTokenIds(void) {
  for (size_t i = 0; i < sizeof(kSamples) / sizeof(kSamples[0]); i++) {
    PyObject* sample = PyBytes_FromString(kSamples[i].fSample);
    if (!sample) return -1;
    *kSamples[i].fId = gHost.fGetStringTokenType(sample, 0);
    Py_DECREF(sample);
    if (*kSamples[i].fId == -1) return -1;
  }
  return 0;
}

/* Drops what a failed init obtained, so that a later import starts afresh. */
static void ReleaseHost(void) {
  Py_CLEAR(gHost.fLogicalLine);
  for (size_t i = 0; i < sizeof(kLineTypes) / sizeof(kLineTypes[0]); i++)
    Py_CLEAR(*kLineTypes[i].fType);
  gHost.fTable = NULL;
}

/* +1 for an opening bracket, -1 for a closing one, else 0. */
static int Nesting(int id) {
  for (int k = 0; k < 3; k++) {
    if (id == gIds.fOpen[k]) return 1;
    if (id == gIds.fClose[k]) return -1;
  }
  return 0;
}

/* Returns a PyMem array of the ids of every token of `line` and sets *count, or returns NULL. */
static int* ReadTokenIds(PyObject* line, int* count) {
  PyObject* value = PyObject_GetAttrString(line, "fTokenCount");
  if (!value) return NULL;
  *count = (int)PyLong_AsLong(value);
  Py_DECREF(value);
  if (*count == -1 && PyErr_Occurred()) return NULL;
  int* ids = PyMem_New(int, *count + 1);  /* + 1: an empty line still gets a real block */
  if (!ids) {
    PyErr_NoMemory();
    return NULL;
  }
  for (int i = 0; i < *count; i++) {
    ids[i] = gHost.fGetTokenType(line, i, 0);
    if (ids[i] == -1) {
      PyMem_Free(ids);
      return NULL;
    }
  }
  return ids;
}

/* Returns the texts of tokens [start, end) run together as a new str, or NULL. The table has
 * no entry for token text, so this asks the line's own method. */
static PyObject* TokenRun(PyObject* line, int start, int end) {
  PyObject* text = PyUnicode_FromStringAndSize(NULL, 0);
  for (int i = start; text && i < end; i++) {
    PyObject* piece = PyObject_CallMethod(line, "GetTokenString", "i", i);
    if (!piece) {
      Py_DECREF(text);
      return NULL;
    }
    Py_SETREF(text, PyUnicode_Concat(text, piece));
    Py_DECREF(piece);
  }
  return text;
}

/* Appends the text of tokens [start, end) to `line` through `append`, and to the list `found`
 * when one is given. */
static int AppendRun(PyObject* line, int start, int end, AppendEntry append, PyObject* found) {
  PyObject* text = TokenRun(line, start, end);
  if (!text) return -1;
  int rc = append(line, text);  /* the line takes a reference of its own */
  if (rc == 0 && found) rc = PyList_Append(found, text);
  Py_DECREF(text);
  return rc;
}

/* Parameters are the names at bracket depth 1 that open an entry of the parameter list: right
 * after its "(" or a "," at that depth, with at most a "*" or "**" between. Defaults and
 * annotations never stand there, nor is a bare "*" or "/" a name. A lambda with several
 * parameters as a default value is misread as more parameters. */
static int AppendParameters(PyObject* line, const int* ids, int count) {
  int depth = 0, opening = 0;
  for (int i = 0; i < count; i++) {
    int id = ids[i], step = Nesting(id);
    if (step < 0 && depth <= 1) break;  /* the list is closed: the rest is no parameter */
    depth += step;
    if (step != 0) {
      opening = step > 0 && depth == 1;
      continue;
    }
    if (depth != 1 || id == gIds.fStar || id == gIds.fDoubleStar) continue;
    if (opening && id == gIds.fName &&
        AppendRun(line, i, i + 1, gHost.fAppendArgName, NULL) < 0)
      return -1;
    opening = id == gIds.fComma;
  }
  return 0;
}

/* Returns the argument names that the line now holds, read back through the table. */
static PyObject* ArgNames(PyObject* line) {
  int count = gHost.fGetArgNameCount(line);
  PyObject* names = PyTuple_New(count);
  for (int i = 0; names && i < count; i++) {
    PyObject* name = gHost.fGetArgName(line, i);  /* lent by the line */
    if (!name) Py_CLEAR(names);
    else PyTuple_SET_ITEM(names, i, Py_NewRef(name));
  }
  return names;
}

/* Base classes are the entries between the brackets after the class name that are a plain or
 * dotted name; keywords (metaclass=M), subscripts (Generic[T]) and starred entries are left
 * out. */
static int AppendBases(PyObject* line, const int* ids, int count, PyObject* found) {
  int depth = 0, start = 0, plain = 0;
  for (int i = 0; i < count; i++) {
    int id = ids[i], step = Nesting(id);
    if (depth == 1 && (id == gIds.fComma || step < 0)) {  /* an entry ends here */
      if (plain && (i - start) % 2 == 1 &&
          AppendRun(line, start, i, gHost.fAppendBaseClassName, found) < 0)
        return -1;
      if (step < 0) break;
      start = i + 1;
      plain = 1;
      continue;
    }
    if (step < 0 && depth == 0) break;
    depth += step;
    if (step > 0 && depth == 1) {
      start = i + 1;
      plain = 1;
    } else if (depth > 0 && (step != 0 || depth > 1 ||
                             id != ((i - start) % 2 ? gIds.fDot : gIds.fName))) {
      plain = 0;
    }
  }
  return 0;
}

/* Targets are the names outside brackets before the last "=" outside brackets, less the
 * annotations and the names that start or end a chain (obj.x, a[i], f().y). Names inside
 * brackets, as in "x, (y, z) = t", are not followed; a lambda with defaults on the right-hand
 * side lets its "lambda" and parameters through, as keywords share the name id. */
static int AppendTargets(PyObject* line, const int* ids, int count) {
  int end = 0, depth = 0;
  for (int i = 0; i < count; i++) {
    depth += Nesting(ids[i]);
    if (depth == 0 && ids[i] == gIds.fEqual) end = i;
  }
  int annotation = 0;
  depth = 0;
  for (int i = 0; i < end; i++) {
    int id = ids[i];
    depth += Nesting(id);
    if (depth != 0) continue;
    if (id == gIds.fEqual || id == gIds.fColon) {
      annotation = id == gIds.fColon;
    } else if (id == gIds.fName && !annotation && (i == 0 || ids[i - 1] != gIds.fDot) &&
               ids[i + 1] != gIds.fDot && ids[i + 1] != gIds.fOpen[0] &&
               ids[i + 1] != gIds.fOpen[1]) {
      if (AppendRun(line, i, i + 1, gHost.fAppendAttrib, NULL) < 0) return -1;
    }
  }
  return 0;
}

/* Annotates one object and returns what its line now holds: the argument names of a function,
 * the base classes found for a class, the names defined by an assignment; else None. */
static PyObject* AnnotateLine(PyObject* object) {
  if (!gHost.fIsLogical(object)) Py_RETURN_NONE;  /* a create hook can put anything in a list */
  PyObject* type = PyObject_GetAttrString(object, "fType");
  if (!type) return NULL;
  int isFunction = type == gHost.fFunctionDef, isClass = type == gHost.fClassDef;
  int isAssignment = type == gHost.fAssignment;
  Py_DECREF(type);
  if (!isFunction && !isClass && !isAssignment) Py_RETURN_NONE;
  int count;
  int* ids = ReadTokenIds(object, &count);
  if (!ids) return NULL;
  PyObject* found = NULL;
  if (isFunction) {
    if (AppendParameters(object, ids, count) == 0) found = ArgNames(object);
  } else if (isClass) {
    found = PyList_New(0);
    if (found && AppendBases(object, ids, count, found) < 0) Py_CLEAR(found);
    if (found) Py_SETREF(found, PyList_AsTuple(found));
  } else {
    if (AppendTargets(object, ids, count) == 0) found = gHost.fGetNamesDefined(object);
  }
  PyMem_Free(ids);
  return found;
}

PyDoc_STRVAR(kAnnotateDoc,
"annotate(lines) -> list\n\n"
"Appends argument names to function definitions, base classes to class definitions and\n"
"assigned names to assignments. Returns one item per object: the argument names or names\n"
"defined that the line now holds, the base classes found, or None for any other line or\n"
"object. Annotations accumulate; reset(lines) clears them.");

static PyObject* Annotate(PyObject* Py_UNUSED(module), PyObject* lines) {
  PyObject* iterator = PyObject_GetIter(lines);
  if (!iterator) return NULL;
  PyObject* results = PyList_New(0);
  PyObject* item;
  while (results && (item = PyIter_Next(iterator))) {
    PyObject* found = AnnotateLine(item);
    Py_DECREF(item);
    if (!found || PyList_Append(results, found) < 0) Py_CLEAR(results);
    Py_XDECREF(found);
  }
  Py_DECREF(iterator);
  if (PyErr_Occurred()) Py_CLEAR(results);  /* also when the iterator itself failed */
  return results;
}

PyDoc_STRVAR(kResetDoc,
"reset(lines) -> int\n\n"
"Clears every annotation of the LogicalLine objects among lines; returns how many there were.");

static PyObject* Reset(PyObject* Py_UNUSED(module), PyObject* lines) {
  PyObject* iterator = PyObject_GetIter(lines);
  if (!iterator) return NULL;
  long cleared = 0;
  PyObject* item;
  while ((item = PyIter_Next(iterator))) {
    if (gHost.fIsLogical(item)) {
      gHost.fClearAppended(item);  /* cannot fail */
      cleared++;
    }
    Py_DECREF(item);
  }
  Py_DECREF(iterator);
  return PyErr_Occurred() ? NULL : PyLong_FromLong(cleared);
}

PyDoc_STRVAR(kFindTokensDoc,
"find_tokens(line, sample) -> list\n\n"
"Returns the indexes of the tokens of line that are of the same kind as the token text\n"
"sample (bytes or str): find_tokens(line, 'x') finds every name and keyword.");

static PyObject* FindTokens(PyObject* Py_UNUSED(module), PyObject* args) {
  PyObject *line, *sample;
  if (!PyArg_ParseTuple(args, "OO:find_tokens", &line, &sample)) return NULL;
  if (!gHost.fIsLogical(line)) {
    PyErr_Format(PyExc_TypeError, "find_tokens() expects a LogicalLine, not %.100s",
                 Py_TYPE(line)->tp_name);
    return NULL;
  }
  int kind = gHost.fGetStringTokenType(sample, 0);  /* logicalline judges the sample */
  if (kind == -1) return NULL;
  int count;
  int* ids = ReadTokenIds(line, &count);
  if (!ids) return NULL;
  PyObject* found = PyList_New(0);
  for (int i = 0; found && i < count; i++) {
    if (ids[i] != kind) continue;
    PyObject* index = PyLong_FromLong(i);
    if (!index || PyList_Append(found, index) < 0) Py_CLEAR(found);
    Py_XDECREF(index);
  }
  PyMem_Free(ids);
  return found;
}

static PyMethodDef kMethods[] = {
    {"annotate", Annotate, METH_O, kAnnotateDoc},
    {"reset", Reset, METH_O, kResetDoc},
    {"find_tokens", FindTokens, METH_VARARGS, kFindTokensDoc},
    {NULL, NULL, 0, NULL},
};

static struct PyModuleDef kModule = {
    PyModuleDef_HEAD_INIT,
    .m_name = "native_host",
    .m_doc = "Annotates logicalline's lines from C through the module's native function table.",
    .m_size = -1,  /* all state is the process-wide table */
    .m_methods = kMethods,
};

PyMODINIT_FUNC PyInit_native_host(void) {
  if (!gHost.fTable && (LoadTable() < 0 || LoadLineTypes() < 0 || LearnTokenIds() < 0)) {
    ReleaseHost();
    return NULL;
  }
  return PyModule_Create(&kModule);
}
