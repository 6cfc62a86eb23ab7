// The parser object and CreateLogicalLineParser.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/parser.h"

#include "module/reading_loop.h"

const char kCreateLogicalLineParserDoc[] =
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
    "          attribute in the logical line objects";

namespace {

PyMethodDef kParserMethods[] = {
    {"GetLogicalLineList", GetLogicalLineList, METH_VARARGS, kGetLogicalLineListDoc},
    {nullptr, nullptr, 0, nullptr},
};

void ParserDealloc(PyObject* self) { Py_TYPE(self)->tp_free(self); }

// Stores the truth value of `option`; returns -1 when its truth test raises.
int StoreTruth(PyObject* option, int* field) {
  const int truth = PyObject_IsTrue(option);
  if (truth < 0) return -1;
  *field = truth;
  return 0;
}

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

PyObject* CreateLogicalLineParser(PyObject*, PyObject* args, PyObject* kwargs) {
  static const char* keywords[] = {"copy_strings", "skip_whitespace_lines", "remove_comments",
                                   "include_line_text", nullptr};
  PyObject* copyStrings = Py_True;
  PyObject* skipWhitespaceLines = Py_True;
  PyObject* removeComments = Py_True;
  PyObject* includeLineText = Py_True;
  if (!PyArg_ParseTupleAndKeywords(args, kwargs, "|OOOO", const_cast<char**>(keywords),
                                   &copyStrings, &skipWhitespaceLines, &removeComments,
                                   &includeLineText))
    return nullptr;
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
