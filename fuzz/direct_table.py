"""The module's direct function table, called from Python through ctypes.

Each entry is wrapped with its real signature. Object results come back as plain addresses
and are turned into objects here: a new reference is adopted as it is, a borrowed one gets a
reference of its own, so a caller that counts references sees exactly what the entry did.
(ctypes' own py_object result would adopt every result, borrowed or not.) A failing entry
raises the exception that it set.
"""
import ctypes

import logicalline

_PyObject = ctypes.py_object
_Int = ctypes.c_int
_Address = ctypes.c_void_p

_GetPointer = ctypes.pythonapi.PyCapsule_GetPointer
_GetPointer.restype = _Address
_GetPointer.argtypes = [_PyObject, ctypes.c_char_p]
_DecRef = ctypes.pythonapi.Py_DecRef
_DecRef.argtypes = [_PyObject]

_Borrowed = object()  # marks an entry that returns a borrowed reference

# (name, result, parameters), in table order; _Address marks a new reference.
_SIGNATURES = (
    ("CreateEmptyLogical", _Address, ()),
    ("IsLogical", _Int, (_PyObject,)),
    ("GetLogicalTypeObject", _Address, ()),
    ("GetArgName", _Borrowed, (_PyObject, _Int)),
    ("GetArgNameCount", _Int, (_PyObject,)),
    ("AppendTypeEquivDirect", _Int, (_PyObject, _PyObject, _PyObject)),
    ("AppendArgTypeEquivDirect", _Int, (_PyObject, _PyObject, _PyObject)),
    ("AppendAttribDirect", _Int, (_PyObject, _PyObject)),
    ("AppendArgNameDirect", _Int, (_PyObject, _PyObject)),
    ("AppendBaseClassNameDirect", _Int, (_PyObject, _PyObject)),
    ("GetNamesDefined", _Address, (_PyObject,)),
    ("ClearAppended", _Int, (_PyObject,)),
    ("GetTokenTypeDirect", _Int, (_PyObject, _Int, _Int)),
    ("GetStringTokenTypeDirect", _Int, (_PyObject, _Int)),
)


def _Borrow(address):
    return ctypes.cast(_Address(address), _PyObject).value  # takes a reference of its own


def _Steal(address):
    obj = _Borrow(address)
    _DecRef(obj)  # the entry's new reference now belongs to `obj`
    return obj


def _Wrap(address, result, parameters):
    if result is _Borrowed:
        function = ctypes.PYFUNCTYPE(_Address, *parameters)(address)
        return lambda *args: _Borrow(function(*args))
    function = ctypes.PYFUNCTYPE(result, *parameters)(address)  # raises any exception set
    if result is _Address:
        return lambda *args: _Steal(function(*args))
    return function


def TableAddress(capsule):
    """The address of the table that a capsule holds."""
    return _GetPointer(capsule, b"kLogicalLineFunctionTable")


def LoadTable():
    """Returns a namespace of the 14 entries, callable as direct.GetArgName(line, 0)."""
    pointer = TableAddress(logicalline.GetDirectLogicalLineFunctionTable())
    addresses = (_Address * len(_SIGNATURES)).from_address(pointer)
    table = type("DirectTable", (), {})()
    for (name, result, parameters), address in zip(_SIGNATURES, addresses):
        setattr(table, name, _Wrap(address, result, parameters))
    return table
