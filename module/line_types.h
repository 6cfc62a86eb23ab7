// Line types: the 26 kinds of logical line, and the bytes constants that stand for them.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstdint>

enum LineType : uint8_t {
  kUnknown = 0,
  kClassDef = 1,
  kFunctionDef = 2,
  kStringExpression = 3,
  kAssignment = 4,
  kIfBeginning = 5,
  kElseBeginning = 6,
  kWhileBeginning = 7,
  kForBeginning = 8,
  kPass = 9,
  kRaise = 10,
  kTry = 11,
  kExcept = 12,
  kFinally = 13,
  kAssert = 14,
  kReturn = 15,
  kImport = 16,
  kFromImport = 17,
  kPrint = 18,
  kDelete = 19,
  kElifBeginning = 20,
  kComment = 21,
  kBlankLine = 22,
  kBreak = 23,
  kContinue = 24,
  kWith = 25,
};

constexpr int kLineTypeCount = 26;
constexpr uint8_t kClassifyFailed = 255;

struct LineTypeRow {
  const char* fName;         // the module attribute
  const char* fDescription;  // content of the bytes constant
  PyObject* fObject;         // the constant, set once at import and kept for the process
};

extern LineTypeRow LineTypeTable[kLineTypeCount];

// Fills the line type constants and the other published constants into the module's
// dictionary. Returns 0, or -1 with an exception set.
int AddModuleConstants(PyObject* dict);
