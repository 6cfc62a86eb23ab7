// Copying a line. The copy gets storage of its own for everything the record owns as storage,
// and new references to the same objects. It is always a native LogicalLine: a create hook
// makes the host's objects from freshly read source, not copies of lines it already holds.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/copy.h"

#include <cstring>

#include "core/py_ref.h"
#include "lines/construction.h"
#include "lines/line_type.h"

PyObject* CopyLogicalLine(LogicalLine* source) {
  const char* text = source->fLineText;
  // Only a line read with lazy imports can be an import that begins with "lazy"; for any
  // other line the reading changes nothing.
  const bool lazyImports = source->fType == kImport || source->fType == kFromImport;
  const LineParts parts = {.fIndentLevel = source->fIndentLevel,
                           .fFirstLine = static_cast<int>(FirstLineOf(source)),
                           .fLineCount = source->fLineCount,
                           .fTokens = source->fTokenArray,
                           .fPositions = source->fTokenPositions,
                           .fTokenCount = source->fTokenCount,
                           .fSpacesInIndent = (source->fFlags & kSpacesInIndentFlag) != 0,
                           .fTabsInIndent = (source->fFlags & kTabsInIndentFlag) != 0,
                           .fIncomplete = (source->fFlags & kIncompleteFlag) != 0,
                           .fLineText = text,
                           .fLineTextLength = text ? strlen(text) : 0,
                           .fOffset = SourceOffsetOf(source),
                           .fLazyImports = lazyImports};
  PyRef copy = PyRef::Steal(CreateNativeLogicalLine(Py_TYPE(source), parts));
  if (!copy) return nullptr;
  LogicalLine* line = AsLine(copy.Get());
  Py_XINCREF(source->fScopeName);
  line->fScopeName = source->fScopeName;
  if (CopyObjectList(&line->fNames, &source->fNames) != 0 ||
      CopyObjectList(&line->fTypeEquivs, &source->fTypeEquivs) != 0 ||
      CopyObjectList(&line->fArgTypeEquivs, &source->fArgTypeEquivs) != 0)
    return nullptr;
  if (PyObject_GC_IsTracked(reinterpret_cast<PyObject*>(source))) TrackLine(line);  // holds what it held
  return copy.Release();
}
