// The parser type.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/parser.h"

#include "core/module_type.h"
#include "module/reading_loop.h"
#include "module/update.h"

namespace {

void ParserDealloc(PyObject* self) {
  PyTypeObject* type = Py_TYPE(self);
  type->tp_free(self);
  Py_DECREF(type);  // a heap type, which the parser holds
}

// Stores the truth value of `option`; returns -1 when its truth test raises.
int StoreTruth(PyObject* option, int* field) {
  const int truth = PyObject_IsTrue(option);
  if (truth < 0) return -1;
  *field = truth;
  return 0;
}

// The first minor version of 3 that reads each way, newest first; earlier ones read as the
// classic rules do, and later ones as the first row.
constexpr struct {
  long fMinor;
  StringRules fRules;
  bool fLazyImports;
} kReadingsByVersion[] = {
    {15, StringRules::kTemplates, true},
    {14, StringRules::kTemplates, false},
    {12, StringRules::kFormatted, false},
};
static_assert(kReadingsByVersion[0].fRules == kNewestRules, "the newest version reads all");

// Returns the minor version of a (3, minor) tuple of ints, or -1 with TypeError or ValueError.
long MinorVersion(PyObject* version) {
  if (!PyTuple_Check(version) || PyTuple_GET_SIZE(version) != 2 ||
      !PyLong_Check(PyTuple_GET_ITEM(version, 0)) || !PyLong_Check(PyTuple_GET_ITEM(version, 1))) {
    PyErr_Format(PyExc_TypeError, "feature_version must be a (major, minor) tuple of ints, not %R",
                 version);
    return -1;
  }
  int overflow = 0;
  const long major = PyLong_AsLongAndOverflow(PyTuple_GET_ITEM(version, 0), &overflow);
  const long minor =
      overflow ? -1 : PyLong_AsLongAndOverflow(PyTuple_GET_ITEM(version, 1), &overflow);
  if (major != 3 || minor < 0 || overflow) {
    PyErr_Format(PyExc_ValueError,
                 "feature_version must be (3, minor) with a minor of 0 or more, not %R", version);
    return -1;
  }
  return minor;
}

// Stores the reading of a feature version; None, the default, reads as the classic rules do.
// Returns -1 with an exception set when the version is refused.
int StoreReading(PyObject* version, LogicalLineParser* parser) {
  parser->fStringRules = StringRules::kClassic;
  parser->fLazyImports = 0;
  if (version == Py_None) return 0;
  const long minor = MinorVersion(version);
  if (minor < 0) return -1;
  for (const auto& row : kReadingsByVersion) {
    if (minor >= row.fMinor) {
      parser->fStringRules = row.fRules;
      parser->fLazyImports = row.fLazyImports;
      break;
    }
  }
  return 0;
}

// Each method is defined, with its docstring, where its work is done.
PyMethodDef kParserMethods[] = {
    kGetLogicalLineListMethod,
    kGetLogicalLineListFromBufferMethod,
    kUpdateLogicalLineListMethod,
    {nullptr, nullptr, 0, nullptr},
};

}  // namespace

PyTypeObject* NewParserType(PyObject* module) {
  PyType_Slot slots[] = {
      {Py_tp_dealloc, reinterpret_cast<void*>(ParserDealloc)},
      {Py_tp_methods, kParserMethods},
      {0, nullptr},
  };
  // No subclassing, no collector, no constructor, no attribute of its own set from Python.
  PyType_Spec spec = {
      .name = "logicalline.LogicalLineParser",
      .basicsize = sizeof(LogicalLineParser),
      .itemsize = 0,
      .flags = Py_TPFLAGS_DEFAULT | Py_TPFLAGS_DISALLOW_INSTANTIATION | Py_TPFLAGS_IMMUTABLETYPE,
      .slots = slots,
  };
  return NewModuleType(module, &spec);
}

PyObject* NewParser(ModuleState* state, PyObject* copyStrings, PyObject* skipWhitespaceLines,
                    PyObject* removeComments, PyObject* includeLineText, PyObject* featureVersion) {
  LogicalLineParser* parser = PyObject_New(LogicalLineParser, state->fParserType);
  if (!parser) return nullptr;
  parser->fShared = state->fShared;
  parser->fOperatorTable = &kOperatorTable;
  if (StoreTruth(skipWhitespaceLines, &parser->fSkipWhitespaceLines) != 0 ||
      StoreTruth(removeComments, &parser->fRemoveComments) != 0 ||
      StoreTruth(copyStrings, &parser->fCopyStrings) != 0 ||
      StoreTruth(includeLineText, &parser->fIncludeLineText) != 0 ||
      StoreReading(featureVersion, parser) != 0) {
    Py_DECREF(parser);
    return nullptr;
  }
  return reinterpret_cast<PyObject*>(parser);
}

ReadOptions ParserOptions(PyObject* self) {
  const LogicalLineParser* parser = reinterpret_cast<const LogicalLineParser*>(self);
  return ReadOptions{.fOperatorTable = parser->fOperatorTable,
                     .fTokenTexts = parser->fShared->fTokenTexts,
                     .fCopyStrings = parser->fCopyStrings != 0,
                     .fSkipWhitespaceLines = parser->fSkipWhitespaceLines != 0,
                     .fRemoveComments = parser->fRemoveComments != 0,
                     .fIncludeLineText = parser->fIncludeLineText != 0,
                     .fStringRules = parser->fStringRules,
                     .fLazyImports = parser->fLazyImports != 0};
}

PyObject* NewestFeatureVersion() { return Py_BuildValue("(il)", 3, kReadingsByVersion[0].fMinor); }
