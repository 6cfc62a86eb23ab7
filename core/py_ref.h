// Owning reference to a Python object, so that every early return releases what it holds.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

class PyRef {
 public:
  PyRef() = default;
  static PyRef Steal(PyObject* object) { return PyRef(object); }  // takes a new reference
  static PyRef FromBorrowed(PyObject* object) {
    Py_XINCREF(object);
    return PyRef(object);
  }
  PyRef(PyRef&& other) noexcept : fObject(other.Release()) {}  // move-only
  PyRef& operator=(PyRef&& other) noexcept {
    PyObject* old = fObject;
    fObject = other.Release();
    Py_XDECREF(old);
    return *this;
  }
  PyRef(const PyRef&) = delete;
  PyRef& operator=(const PyRef&) = delete;
  ~PyRef() { Py_XDECREF(fObject); }
  PyObject* Get() const { return fObject; }
  PyObject* Release() {
    PyObject* object = fObject;
    fObject = nullptr;
    return object;
  }
  explicit operator bool() const { return fObject != nullptr; }

 private:
  explicit PyRef(PyObject* object) : fObject(object) {}
  PyObject* fObject = nullptr;
};
