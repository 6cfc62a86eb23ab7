// Object lists. Most lines never get an annotation, so storage comes only with the first append.
#include "core/object_list.h"

#include <cstdlib>
#include <cstring>

#include "core/growth.h"

int AppendObjects(ObjectList* list, PyObject* const* objects, Py_ssize_t n) {
  const size_t needed = static_cast<size_t>(list->fCount + n);
  if (Grow(&list->fItems, &list->fCapacity, needed, 2) != 0) {
    PyErr_NoMemory();
    return -1;
  }
  for (Py_ssize_t i = 0; i < n; i++) {
    Py_INCREF(objects[i]);
    list->fItems[list->fCount++] = objects[i];
  }
  return 0;
}

int CopyObjectList(ObjectList* target, const ObjectList* source) {
  return source->fCount ? AppendObjects(target, source->fItems, source->fCount) : 0;
}

void ClearObjectList(ObjectList* list) {
  PyObject** items = list->fItems;
  if (!items) return;  // never appended to, as most are
  const Py_ssize_t count = list->fCount;
  // Emptied first: releasing an entry may run code that looks at the list again.
  *list = ObjectList{.fItems = nullptr, .fCount = 0, .fCapacity = 0};
  for (Py_ssize_t i = 0; i < count; i++) Py_DECREF(items[i]);
  free(items);
}

PyObject* ObjectListTuple(const ObjectList* list) {
  PyObject* tuple = PyTuple_New(list->fCount);
  if (!tuple) return nullptr;
  for (Py_ssize_t i = 0; i < list->fCount; i++) {
    Py_INCREF(list->fItems[i]);
    PyTuple_SET_ITEM(tuple, i, list->fItems[i]);
  }
  return tuple;
}

int VisitObjectList(const ObjectList* list, visitproc visit, void* arg) {
  for (Py_ssize_t i = 0; i < list->fCount; i++) Py_VISIT(list->fItems[i]);
  return 0;
}
