// Construction: fills a LogicalLine record and classifies it, or hands the raw parts to the
// host's create hook.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/construction.h"

#include <cstdlib>
#include <cstring>

#include "core/errors.h"
#include "core/py_ref.h"
#include "lines/classifier.h"
#include "lines/logical_line.h"
#include "lines/tokens_tuple.h"

namespace {

bool PartsAreValid(const LineParts& parts) {
  if (parts.fIndentLevel >= 0 && parts.fFirstLine >= 0 && parts.fLineCount >= 1) return true;
  RaiseBadInternalCall(kConstructionCheckLine);
  return false;
}

PyObject* CallCreateHook(LineState* shared, PyObject* hook, const LineParts& parts) {
  PyRef tokens = PyRef::Steal(PyTuple_New(parts.fTokenCount));
  if (!tokens) return nullptr;
  PyRef positions = PyRef::Steal(PyTuple_New(parts.fTokenCount));
  if (!positions) return nullptr;
  for (int i = 0; i < parts.fTokenCount; i++) {
    Py_INCREF(parts.fTokens[i]);
    PyTuple_SET_ITEM(tokens.Get(), i, parts.fTokens[i]);
    PyObject* pair = PositionTuple(shared->fEntries, parts.fPositions[i]);
    if (!pair) return nullptr;
    PyTuple_SET_ITEM(positions.Get(), i, pair);
  }
  PyRef hookArgs = PyRef::Steal(Py_BuildValue(
      "iiiOOiiis", parts.fIndentLevel, parts.fFirstLine, parts.fLineCount, tokens.Get(),
      positions.Get(), parts.fSpacesInIndent, parts.fTabsInIndent, parts.fIncomplete,
      parts.fLineText));
  if (!hookArgs) return nullptr;
  return PyObject_Call(hook, hookArgs.Get(), nullptr);
}

// The storage a line needs after its record: token references, positions, line text.
size_t StorageBytes(const LineParts& parts) {
  const size_t count = static_cast<size_t>(parts.fTokenCount);
  const size_t textBytes = parts.fLineText ? parts.fLineTextLength + 1 : 0;
  return count * (sizeof(PyObject*) + sizeof(TokenPosition)) + textBytes;
}

// Releases the parts' token references that a call took over and passes on to no line.
void ReleaseTokens(const LineParts& parts) {
  for (int i = 0; i < parts.fTokenCount; i++) Py_DECREF(parts.fTokens[i]);
}

// Fills the token references (new ones, or with `take` those of the parts), positions and line
// text into the line's storage, in that order.
void FillStorage(LogicalLine* line, const LineParts& parts, bool take) {
  const size_t count = static_cast<size_t>(parts.fTokenCount);
  const size_t tokenBytes = count * sizeof(PyObject*);
  const size_t positionBytes = count * sizeof(TokenPosition);
  char* block = LineStorage(line);
  line->fTokenArray = reinterpret_cast<PyObject**>(block);
  for (size_t i = 0; i < count; i++) {
    if (!take) Py_INCREF(parts.fTokens[i]);
    line->fTokenArray[i] = parts.fTokens[i];
  }
  line->fTokenCount = parts.fTokenCount;
  line->fTokenPositions = reinterpret_cast<TokenPosition*>(block + tokenBytes);
  if (count) memcpy(line->fTokenPositions, parts.fPositions, positionBytes);
  if (parts.fLineText) {
    line->fLineText = block + tokenBytes + positionBytes;
    memcpy(line->fLineText, parts.fLineText, parts.fLineTextLength);
    line->fLineText[parts.fLineTextLength] = '\0';
  }
}

uint8_t FlagIf(int condition, LineFlag flag) { return condition ? flag : 0; }

}  // namespace

PyObject* CreateNativeLogicalLine(PyTypeObject* lineType, const LineParts& parts, bool take) {
  LogicalLine* line =
      PartsAreValid(parts) ? NewLogicalLine(lineType, StorageBytes(parts)) : nullptr;
  if (!line) {
    if (take) ReleaseTokens(parts);
    return nullptr;
  }
  PyRef owner = PyRef::Steal(reinterpret_cast<PyObject*>(line));  // releases a half-built line
  FillStorage(line, parts, take);
  line->fIndentLevel = parts.fIndentLevel;
  line->fStoredFirstLine = parts.fFirstLine;
  line->fLineCount = parts.fLineCount;
  line->fStoredOffset = parts.fOffset;
  LineType type = kUnknown;
  if (ClassifyLogicalLine(line->fTokenArray, line->fTokenCount, parts.fLazyImports, &type,
                          &line->fLocalScopeName) != 0)
    return nullptr;
  line->fType = type;
  line->fFlags = FlagIf(parts.fSpacesInIndent, kSpacesInIndentFlag) |
                 FlagIf(parts.fTabsInIndent, kTabsInIndentFlag) |
                 FlagIf(parts.fIncomplete, kIncompleteFlag);
  // fTokens is built at its first read: most hosts never look at every line's tokens.
  return owner.Release();
}

PyObject* CreateLogicalLine(LineState* shared, const LineParts& parts, bool take) {
  if (!shared->fCreateHook) return CreateNativeLogicalLine(shared->fLineType, parts, take);
  PyObject* made = nullptr;
  if (PartsAreValid(parts)) {
    // The hook may replace itself while running.
    PyRef hook = PyRef::FromBorrowed(shared->fCreateHook);
    made = CallCreateHook(shared, hook.Get(), parts);
  }
  if (take) ReleaseTokens(parts);  // the hook's arguments hold references of their own
  return made;
}

bool HasCreateHook(const LineState* shared) { return shared->fCreateHook != nullptr; }

void SetCreateHook(LineState* shared, PyObject* hook) {
  // Install before releasing the old hook: its release may run code that installs another.
  Py_INCREF(hook);
  PyObject* old = shared->fCreateHook;
  shared->fCreateHook = hook;
  Py_XDECREF(old);
}

void DropCreateHook(LineState* shared) { Py_CLEAR(shared->fCreateHook); }
