// The line type constants, the other constants that the module publishes, and its version.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/constants.h"

#include "core/py_ref.h"
#include "core/token_ids.h"
#include "module/parser.h"

namespace {

struct LineTypeRow {
  const char* fName;         // the module attribute
  const char* fDescription;  // content of the bytes constant
};

constexpr LineTypeRow kLineTypeRows[kLineTypeCount] = {
    {"kUnknown", "unknown"},
    {"kClassDef", "class definition"},
    {"kFunctionDef", "function definition"},
    {"kStringExpression", "string expression"},
    {"kAssignment", "assignment"},
    {"kIfBeginning", "if statement start"},
    {"kElseBeginning", "else statement start"},
    {"kWhileBeginning", "while statement start"},
    {"kForBeginning", "for statement start"},
    {"kPass", "pass"},
    {"kRaise", "raise"},
    {"kTry", "try block start"},
    {"kExcept", "except block start"},
    {"kFinally", "finally block start"},
    {"kAssert", "assert"},
    {"kReturn", "return"},
    {"kImport", "import"},
    {"kFromImport", "from import"},
    {"kPrint", "print"},
    {"kDelete", "delete"},
    {"kElifBeginning", "elif block start"},
    {"kComment", "comment"},
    {"kBlankLine", "blank line"},
    {"kBreak", "break"},
    {"kContinue", "continue"},
    {"kWith", "with block start"},
};

struct AttribKind {
  const char* fKindName;
  const char* fInfoName;  // null: no info tuple is published for this kind
  const char* fText;
};

constexpr AttribKind kAttribKinds[] = {
    {"kClassAttribKind", "kClassAttribInfo", "class def"},
    {"kFunctionAttribKind", "kFunctionAttribInfo", "function def"},
    {"kGenericAttribKind", "kGenericAttribInfo", "generic attribute"},
    {"kImportedAttribKind", nullptr, "imported attribute"},
};

int AddLineTypes(PyObject* dict, ModuleState* state) {
  for (int i = 0; i < kLineTypeCount; i++) {
    PyObject* constant = PyBytes_FromString(kLineTypeRows[i].fDescription);
    if (!constant) return -1;
    state->fLineTypes[i] = constant;  // fType hands out this very object
    if (PyDict_SetItemString(dict, kLineTypeRows[i].fName, constant) != 0) return -1;
  }
  return 0;
}

// Kinds first, then the info tuples, each holding the very kind object.
int AddAttribKinds(PyObject* dict) {
  PyObject* kinds[4] = {};
  for (int i = 0; i < 4; i++) {
    PyRef kind = PyRef::Steal(PyUnicode_FromString(kAttribKinds[i].fText));
    if (!kind || PyDict_SetItemString(dict, kAttribKinds[i].fKindName, kind.Get()) != 0) return -1;
    kinds[i] = kind.Get();  // the dictionary keeps it alive
  }
  for (int i = 0; i < 4; i++) {
    if (!kAttribKinds[i].fInfoName) continue;
    PyRef info = PyRef::Steal(PyTuple_Pack(2, kinds[i], Py_None));
    if (!info || PyDict_SetItemString(dict, kAttribKinds[i].fInfoName, info.Get()) != 0) return -1;
  }
  return 0;
}

}  // namespace

int AddModuleConstants(PyObject* module, ModuleState* state) {
  PyObject* dict = PyModule_GetDict(module);  // borrowed; a module always has one
  if (AddLineTypes(dict, state) != 0 || AddAttribKinds(dict) != 0) return -1;
  PyObject* lineType = reinterpret_cast<PyObject*>(state->fShared->fLineType);
  if (PyDict_SetItemString(dict, "LogicalLineType", lineType) != 0) return -1;
  PyRef comment = PyRef::Steal(PyLong_FromLong(COMMENT_TOKEN));
  if (!comment || PyDict_SetItemString(dict, "COMMENT_TOKEN", comment.Get()) != 0) return -1;
  PyRef newest = PyRef::Steal(NewestFeatureVersion());
  if (!newest || PyDict_SetItemString(dict, "kNewestFeatureVersion", newest.Get()) != 0) return -1;
  // The build compiles in the version that the package metadata also carries.
  PyRef version = PyRef::Steal(PyUnicode_FromString(LOGICALLINE_VERSION));
  if (!version) return -1;
  return PyDict_SetItemString(dict, "__version__", version.Get());
}
