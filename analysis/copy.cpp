// Copying a line. The copy gets storage of its own for everything the record owns as storage,
// and new references to the same objects. It is always a native LogicalLine: a create hook
// makes the host's objects from freshly read source, not copies of lines it already holds.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "analysis/copy.h"

#include <cstdlib>
#include <cstring>

#include "module/construction.h"
#include "module/logical_line.h"
#include "module/py_ref.h"

namespace {

// Copies `count` entries of `width` references into new storage whose capacity is the count
// rounded up to an even number, as the append rule expects. Returns 0, or -1 with MemoryError.
int CopyList(PyObject** source, Py_ssize_t count, size_t width, PyObject*** target,
             Py_ssize_t* targetCount) {
  if (count == 0) return 0;
  const size_t entries = static_cast<size_t>(count + (count & 1));
  auto* items = static_cast<PyObject**>(malloc(entries * width * sizeof(PyObject*)));
  if (!items) {
    PyErr_NoMemory();
    return -1;
  }
  const size_t used = static_cast<size_t>(count) * width;
  for (size_t i = 0; i < used; i++) Py_XINCREF(source[i]);
  memcpy(items, source, used * sizeof(PyObject*));
  *target = items;
  *targetCount = count;
  return 0;
}

}  // namespace

PyObject* CopyLogicalLine(PyObject* self, PyObject*) {
  LogicalLine* source = reinterpret_cast<LogicalLine*>(self);
  const char* text = source->fLineText;
  LineParts parts{source->fIndentLevel,
                  source->fFirstLine,
                  source->fLineCount,
                  source->fTokenArray,
                  source->fTokenPositions,
                  source->fTokenCount,
                  (source->fFlags & kSpacesInIndentFlag) != 0,
                  (source->fFlags & kTabsInIndentFlag) != 0,
                  (source->fFlags & kIncompleteFlag) != 0,
                  text,
                  text ? strlen(text) : 0};
  PyRef copy = PyRef::Steal(CreateNativeLogicalLine(parts));
  if (!copy) return nullptr;
  LogicalLine* line = reinterpret_cast<LogicalLine*>(copy.Get());
  Py_XINCREF(source->fScopeName);
  line->fScopeName = source->fScopeName;
  if (CopyList(source->fNames, source->fNameCount, 1, &line->fNames, &line->fNameCount) != 0 ||
      CopyList(source->fTypeEquivs, source->fTypeEquivCount, 2, &line->fTypeEquivs,
               &line->fTypeEquivCount) != 0 ||
      CopyList(source->fArgTypeEquivs, source->fArgTypeEquivCount, 2, &line->fArgTypeEquivs,
               &line->fArgTypeEquivCount) != 0)
    return nullptr;
  return copy.Release();
}
