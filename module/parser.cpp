// The parser type.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/parser.h"

#include "module/reading_loop.h"
#include "module/update.h"

namespace {

void ParserDealloc(PyObject* self) { Py_TYPE(self)->tp_free(self); }

// Stores the truth value of `option`; returns -1 when its truth test raises.
int StoreTruth(PyObject* option, int* field) {
  const int truth = PyObject_IsTrue(option);
  if (truth < 0) return -1;
  *field = truth;
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

// Slots left out stay empty; the interpreter fills them in when the type is readied.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmissing-field-initializers"
PyTypeObject LogicalLineParserType = {
    .ob_base = PyVarObject_HEAD_INIT(nullptr, 0)
    .tp_name = "LogicalLineParser",
    .tp_basicsize = sizeof(LogicalLineParser),
    .tp_dealloc = ParserDealloc,
    .tp_flags = Py_TPFLAGS_DEFAULT,  // no subclassing, no collector, no constructor
    .tp_methods = kParserMethods,
};
#pragma GCC diagnostic pop

PyObject* NewParser(PyObject* copyStrings, PyObject* skipWhitespaceLines, PyObject* removeComments,
                    PyObject* includeLineText) {
  LogicalLineParser* parser = PyObject_New(LogicalLineParser, &LogicalLineParserType);
  if (!parser) return nullptr;
  parser->fOperatorTable = &kOperatorTable;
  if (StoreTruth(skipWhitespaceLines, &parser->fSkipWhitespaceLines) != 0 ||
      StoreTruth(removeComments, &parser->fRemoveComments) != 0 ||
      StoreTruth(copyStrings, &parser->fCopyStrings) != 0 ||
      StoreTruth(includeLineText, &parser->fIncludeLineText) != 0) {
    Py_DECREF(parser);
    return nullptr;
  }
  return reinterpret_cast<PyObject*>(parser);
}

ReadOptions ParserOptions(PyObject* self) {
  const LogicalLineParser* parser = reinterpret_cast<const LogicalLineParser*>(self);
  return ReadOptions{.fOperatorTable = parser->fOperatorTable,
                     .fCopyStrings = parser->fCopyStrings != 0,
                     .fSkipWhitespaceLines = parser->fSkipWhitespaceLines != 0,
                     .fRemoveComments = parser->fRemoveComments != 0,
                     .fIncludeLineText = parser->fIncludeLineText != 0};
}
