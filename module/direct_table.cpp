// The direct function table. A positional array: its order is the interface. Entries keep
// their real signatures and are cast only where they enter the array.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/direct_table.h"

#include "core/py_ref.h"
#include "lines/editing.h"
#include "lines/line_type.h"
#include "lines/logical_line.h"
#include "logicalline_direct.h"
#include "module/line_surface.h"
#include "module/module_state.h"
#include "tokenizer/token_queries.h"

namespace {

// The entries that make a line or hand out its type take the calling interpreter's type: the
// table is the same in every interpreter, and its callers name no module.
PyObject* CreateEmptyLogical() {
  PyRef module = PyRef::Steal(CurrentModule());  // held while the line is made
  if (!module) return nullptr;
  PyTypeObject* type = StateOf(module.Get())->fShared->fLineType;
  return reinterpret_cast<PyObject*>(NewLogicalLine(type, 0));
}

int IsLogical(PyObject* object) { return IsLogicalLine(object); }

PyObject* GetLogicalTypeObject() {
  PyRef module = PyRef::Steal(CurrentModule());
  if (!module) return nullptr;
  return Py_NewRef(reinterpret_cast<PyObject*>(StateOf(module.Get())->fShared->fLineType));
}

PyObject* GetArgName(PyObject* object, int index) {
  LogicalLine* line = AsLine(object);
  if (line->fType != kFunctionDef) {
    PyErr_SetString(PyExc_ValueError, "Tried to get argument name from a non-function def line");
    return nullptr;
  }
  if (index < 0 || index >= line->fNames.fCount) {
    PyErr_SetString(PyExc_IndexError, "Invalid arg name index");
    return nullptr;
  }
  return line->fNames.fItems[index];
}

int GetArgNameCount(PyObject* object) {
  LogicalLine* line = AsLine(object);
  return line->fType == kFunctionDef ? static_cast<int>(line->fNames.fCount) : 0;
}

int AppendTypeEquivDirect(PyObject* line, PyObject* a, PyObject* b) {
  return AppendTypeEquiv(AsLine(line), a, b);
}
int AppendArgTypeEquivDirect(PyObject* line, PyObject* a, PyObject* b) {
  return AppendArgTypeEquiv(AsLine(line), a, b);
}
int AppendAttribDirect(PyObject* line, PyObject* object) {
  return AppendAttrib(AsLine(line), object);
}
int AppendArgNameDirect(PyObject* line, PyObject* object) {
  return AppendArgName(AsLine(line), object);
}
int AppendBaseClassNameDirect(PyObject* line, PyObject* object) {
  return AppendBaseClassName(AsLine(line), object);
}

PyObject* GetNamesDefinedDirect(PyObject* line) { return NamesDefined(AsLine(line)); }

int ClearAppendedDirect(PyObject* line) {
  ClearAppended(AsLine(line));
  return 0;
}

int GetTokenTypeDirect(PyObject* line, int index, int skip) {
  PyObject* token = TokenAt(AsLine(line), index);
  return token ? TokenTypeOfText(token, skip) : -1;
}

// A bare text, which no reading made: read as the classic rules read it.
int GetStringTokenTypeDirect(PyObject* text, int skip) {
  return TokenTypeOfText(text, skip, /*lineToken=*/false);
}

// Each row keeps its entry's own signature type from the public header.
template <typename Signature>
void* Entry(Signature function) {
  return reinterpret_cast<void*>(function);
}

}  // namespace

void* const kLogicalLineFunctionTable[] = {
    Entry<LLCreateEmptyLogical>(CreateEmptyLogical),                 // 0
    Entry<LLIsLogical>(IsLogical),                                   // 1
    Entry<LLGetLogicalTypeObject>(GetLogicalTypeObject),             // 2
    Entry<LLGetArgName>(GetArgName),                                 // 3
    Entry<LLGetArgNameCount>(GetArgNameCount),                       // 4
    Entry<LLAppendTypeEquivDirect>(AppendTypeEquivDirect),           // 5
    Entry<LLAppendArgTypeEquivDirect>(AppendArgTypeEquivDirect),     // 6
    Entry<LLAppendAttribDirect>(AppendAttribDirect),                 // 7
    Entry<LLAppendArgNameDirect>(AppendArgNameDirect),               // 8
    Entry<LLAppendBaseClassNameDirect>(AppendBaseClassNameDirect),   // 9
    Entry<LLGetNamesDefined>(GetNamesDefinedDirect),                 // 10
    Entry<LLClearAppended>(ClearAppendedDirect),                     // 11
    Entry<LLGetTokenTypeDirect>(GetTokenTypeDirect),                 // 12
    Entry<LLGetStringTokenTypeDirect>(GetStringTokenTypeDirect),     // 13
};
static_assert(sizeof(kLogicalLineFunctionTable) / sizeof(void*) == LOGICALLINE_TABLE_SIZE,
              "the table has exactly its 14 entries");
