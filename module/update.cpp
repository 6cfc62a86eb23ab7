// The parser's UpdateLogicalLineList: its arguments, and the conditions under which the update
// runs; the update itself lives with the lines it renumbers.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "module/update.h"

#include "lines/construction.h"
#include "lines/list_update.h"
#include "module/parser.h"

namespace {

// The update must find the list as it left it at every step, so no host code may run inside
// it, and it calls none. Before 3.12, though, an allocation can itself start a collection,
// which may run a host's finalizer that changes the list: there the collector is held off for
// the update. From 3.12 on, an allocation only schedules a collection, which runs when Python
// code next runs or signals are checked, and the update does neither; the collector of the
// interpreter is then left alone.
struct CollectorPause {
#if PY_VERSION_HEX < 0x030C0000
  const int fWasEnabled = PyGC_Disable();
  ~CollectorPause() {
    if (fWasEnabled) PyGC_Enable();
  }
#endif
};

PyDoc_STRVAR(kUpdateLogicalLineListDoc,
             "Update a list of logical lines after an edit of the text it was read from.  "
             "Arguments: the list (read by a parser with this one's options from line 0, maybe "
             "updated before), the whole new text as a bytes-like object, and optionally the "
             "edit: the first edited physical line (from 0), the number of physical lines the "
             "edit replaced, and the number it put in their place.  Without the edit, the "
             "changed lines are found by comparing the new text with the old one, which the "
             "list's record keeps.  Only the lines the edit can affect are read again; every "
             "other line keeps its object, and those after the edit move by the change in the "
             "line count.  The list is changed in place; the result is (index, removed, added): "
             "from index on, removed lines went and the list added took their place.  Raises "
             "ValueError, and leaves the list as it was, for an edit that does not describe the "
             "change from the old text to the new one, a list read with other options, or a "
             "list that is not exactly as the read or the last update left it.");
PyObject* UpdateLogicalLineList(PyObject* self, PyObject* args) {
  PyObject* lines = nullptr;
  Py_buffer view;
  int first = 0;
  int oldCount = 0;
  int newCount = 0;
  if (!PyArg_ParseTuple(args, "O!y*|iii:UpdateLogicalLineList", &PyList_Type, &lines, &view,
                        &first, &oldCount, &newCount))
    return nullptr;
  struct Release {
    Py_buffer* fView;
    ~Release() { PyBuffer_Release(fView); }
  } release{&view};
  const Py_ssize_t given = PyTuple_GET_SIZE(args);
  if (given != 2 && given != 5) {
    PyErr_Format(PyExc_TypeError,
                 "UpdateLogicalLineList() takes the list and the text, and then the edit's "
                 "first line, old count and new count or none of them (%zd given)",
                 given);
    return nullptr;
  }
  if (HasCreateHook(ParserShared(self))) {
    PyErr_SetString(PyExc_TypeError,
                    "UpdateLogicalLineList needs the module's own lines, and a create hook is "
                    "installed");
    return nullptr;
  }
  if (first < 0 || oldCount < 0 || newCount < 0) {
    PyErr_SetString(PyExc_ValueError, "the edit lies outside the text");
    return nullptr;
  }
  const Edit told{.fFirst = first, .fOldCount = oldCount, .fNewCount = newCount};
  [[maybe_unused]] const CollectorPause pause;
  const char* data = static_cast<const char*>(view.buf);
  return UpdateLineList(ParserShared(self), ParserOptions(self), lines,
                        given == 5 ? &told : nullptr, data, data + view.len, view.obj);
}

}  // namespace

const PyMethodDef kUpdateLogicalLineListMethod = {
    "UpdateLogicalLineList", UpdateLogicalLineList, METH_VARARGS, kUpdateLogicalLineListDoc};
