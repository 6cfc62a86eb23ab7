/* logicalline_direct.h: the table of native functions that the logicalline module hands out
 * in the capsule "kLogicalLineFunctionTable", for C and C++ extensions of a host.
 *
 *   PyObject* capsule = PyObject_CallMethod(module, "GetDirectLogicalLineFunctionTable", NULL);
 *   void** table = (void**)PyCapsule_GetPointer(capsule, LOGICALLINE_CAPSULE_NAME);
 *   LLAppendAttribDirect append = (LLAppendAttribDirect)table[LL_APPEND_ATTRIB_DIRECT];
 *
 * The order of the entries is the interface. Every entry runs with the interpreter lock held.
 * The table is the same in every interpreter of the process, and each entry works in the
 * interpreter that calls it, on that interpreter's lines: a host module may obtain it once per
 * interpreter, or keep the pointer from the first. Entries 0 and 2 make or return the
 * LogicalLine type of the calling interpreter, that of the logicalline module it imported last.
 * A "line" argument is a borrowed reference to a LogicalLine (check it with LL_IS_LOGICAL).
 * Entries returning int give 0 on success and -1 with a Python exception set on failure, unless
 * noted; entries returning PyObject* give NULL with an exception set on failure. */
#ifndef LOGICALLINE_DIRECT_H
#define LOGICALLINE_DIRECT_H

#include <Python.h>

#ifdef __cplusplus
extern "C" {
#endif

#define LOGICALLINE_CAPSULE_NAME "kLogicalLineFunctionTable"
#define LOGICALLINE_TABLE_SIZE 14

enum LogicalLineTableIndex {
  LL_CREATE_EMPTY_LOGICAL = 0,
  LL_IS_LOGICAL = 1,
  LL_GET_LOGICAL_TYPE_OBJECT = 2,
  LL_GET_ARG_NAME = 3,
  LL_GET_ARG_NAME_COUNT = 4,
  LL_APPEND_TYPE_EQUIV_DIRECT = 5,
  LL_APPEND_ARG_TYPE_EQUIV_DIRECT = 6,
  LL_APPEND_ATTRIB_DIRECT = 7,
  LL_APPEND_ARG_NAME_DIRECT = 8,
  LL_APPEND_BASE_CLASS_NAME_DIRECT = 9,
  LL_GET_NAMES_DEFINED = 10,
  LL_CLEAR_APPENDED = 11,
  LL_GET_TOKEN_TYPE_DIRECT = 12,
  LL_GET_STRING_TOKEN_TYPE_DIRECT = 13
};

/* 0: a new empty LogicalLine of the calling interpreter (type kUnknown, no tokens, line count
 * 0), or NULL (RuntimeError where the interpreter never imported logicalline). */
typedef PyObject* (*LLCreateEmptyLogical)(void);
/* 1: 1 when the object is a LogicalLine (its type is exactly a LogicalLine type), else 0;
 * never fails. */
typedef int (*LLIsLogical)(PyObject* object);
/* 2: a new reference to the calling interpreter's LogicalLine type object, or NULL with
 * RuntimeError where the interpreter never imported logicalline. */
typedef PyObject* (*LLGetLogicalTypeObject)(void);
/* 3: borrowed argument name `index` of a function definition line, or NULL (ValueError on
 * another line type, IndexError for a bad index). */
typedef PyObject* (*LLGetArgName)(PyObject* line, int index);
/* 4: the number of argument names of a function definition line, 0 for other lines. */
typedef int (*LLGetArgNameCount)(PyObject* line);
/* 5: appends the pair (a, b) to the type equivalences. */
typedef int (*LLAppendTypeEquivDirect)(PyObject* line, PyObject* a, PyObject* b);
/* 6: appends the pair (a, b) to the argument type equivalences of a function definition. */
typedef int (*LLAppendArgTypeEquivDirect)(PyObject* line, PyObject* a, PyObject* b);
/* 7: appends an attribute; refused on class and function definitions. */
typedef int (*LLAppendAttribDirect)(PyObject* line, PyObject* object);
/* 8: appends an argument name (a name or a name sequence) to a function definition. */
typedef int (*LLAppendArgNameDirect)(PyObject* line, PyObject* object);
/* 9: appends a base class name to a class definition. */
typedef int (*LLAppendBaseClassNameDirect)(PyObject* line, PyObject* object);
/* 10: a new tuple, the line's fNamesDefined, or NULL. */
typedef PyObject* (*LLGetNamesDefined)(PyObject* line);
/* 11: releases every appended annotation; always 0. */
typedef int (*LLClearAppended)(PyObject* line);
/* 12: the token id of token `index`, or -1 with an exception set. */
typedef int (*LLGetTokenTypeDirect)(PyObject* line, int index, int skip_error_prefix);
/* 13: the token id of a bytes or str token text, or -1 with an exception set. */
typedef int (*LLGetStringTokenTypeDirect)(PyObject* text, int skip_error_prefix);

#ifdef __cplusplus
}
#endif

#endif /* LOGICALLINE_DIRECT_H */
