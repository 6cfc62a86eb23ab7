// The line type constants, the other constants that the module publishes, and its version.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/constants.h"

#include "core/py_ref.h"
#include "core/token_ids.h"
#include "lines/logical_line.h"
#include "module/parser.h"

LineTypeRow LineTypeTable[kLineTypeCount] = {
    {"kUnknown", "unknown", nullptr},
    {"kClassDef", "class definition", nullptr},
    {"kFunctionDef", "function definition", nullptr},
    {"kStringExpression", "string expression", nullptr},
    {"kAssignment", "assignment", nullptr},
    {"kIfBeginning", "if statement start", nullptr},
    {"kElseBeginning", "else statement start", nullptr},
    {"kWhileBeginning", "while statement start", nullptr},
    {"kForBeginning", "for statement start", nullptr},
    {"kPass", "pass", nullptr},
    {"kRaise", "raise", nullptr},
    {"kTry", "try block start", nullptr},
    {"kExcept", "except block start", nullptr},
    {"kFinally", "finally block start", nullptr},
    {"kAssert", "assert", nullptr},
    {"kReturn", "return", nullptr},
    {"kImport", "import", nullptr},
    {"kFromImport", "from import", nullptr},
    {"kPrint", "print", nullptr},
    {"kDelete", "delete", nullptr},
    {"kElifBeginning", "elif block start", nullptr},
    {"kComment", "comment", nullptr},
    {"kBlankLine", "blank line", nullptr},
    {"kBreak", "break", nullptr},
    {"kContinue", "continue", nullptr},
    {"kWith", "with block start", nullptr},
};

namespace {

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

int AddLineTypes(PyObject* dict) {
  for (LineTypeRow& row : LineTypeTable) {
    row.fObject = PyBytes_FromString(row.fDescription);
    if (!row.fObject) return -1;
    if (PyDict_SetItemString(dict, row.fName, row.fObject) != 0) return -1;
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

int AddModuleConstants(PyObject* dict) {
  if (AddLineTypes(dict) != 0 || AddAttribKinds(dict) != 0) return -1;
  if (PyDict_SetItemString(dict, "LogicalLineType", reinterpret_cast<PyObject*>(&LogicalLineType)) != 0)
    return -1;
  PyRef comment = PyRef::Steal(PyLong_FromLong(COMMENT_TOKEN));
  if (!comment || PyDict_SetItemString(dict, "COMMENT_TOKEN", comment.Get()) != 0) return -1;
  PyRef newest = PyRef::Steal(NewestFeatureVersion());
  if (!newest || PyDict_SetItemString(dict, "kNewestFeatureVersion", newest.Get()) != 0) return -1;
  // The build compiles in the version that the package metadata also carries.
  PyRef version = PyRef::Steal(PyUnicode_FromString(LOGICALLINE_VERSION));
  if (!version) return -1;
  return PyDict_SetItemString(dict, "__version__", version.Get());
}
