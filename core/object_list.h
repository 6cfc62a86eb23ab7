// ObjectList: a growable array of owned object references. Every annotation of a LogicalLine
// is one: names, and type equivalence pairs stored flat, two entries a pair.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>

struct ObjectList {
  PyObject** fItems;    // fCount owned references, room for fCapacity; null while empty
  Py_ssize_t fCount;
  size_t fCapacity;
};

// Appends new references to the n objects. Returns 0, or -1 with MemoryError set and the list
// unchanged.
int AppendObjects(ObjectList* list, PyObject* const* objects, Py_ssize_t n);

// Fills an empty list with new references to another list's entries, in storage of its own.
// Returns 0, or -1 with MemoryError set and the target still empty.
int CopyObjectList(ObjectList* target, const ObjectList* source);

// Releases every entry and frees the storage; the list is empty afterwards.
void ClearObjectList(ObjectList* list);

// Returns a new tuple of the entries, or nullptr with an exception set.
PyObject* ObjectListTuple(const ObjectList* list);

// Visits every entry, for the cyclic collector; returns the first non-zero visit result.
int VisitObjectList(const ObjectList* list, visitproc visit, void* arg);
