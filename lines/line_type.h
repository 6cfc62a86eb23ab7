// Line types: the 26 kinds of logical line.
#pragma once

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
