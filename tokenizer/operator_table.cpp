// The operator table. The rows are written once, in search order; the rows by id are derived
// from them, so the two orders cannot disagree.
#include "tokenizer/operator_table.h"

#include "core/token_ids.h"

namespace {

// Rows with the same first byte are contiguous, and every row stands after each row whose
// text is a proper prefix of its own, so the last row that matches is the longest operator.
// The first row of an id is its canonical text: "!=" stands before "<>".
constexpr OperatorEntry kOperatorsByText[] = {
    {29, "!="}, {24, "%"},   {41, "%="},  {19, "&"},  {42, "&="},  {7, "("},    {8, ")"},
    {16, "*"},  {36, "**"},  {47, "**="}, {39, "*="}, {14, "+"},   {37, "+="},  {12, ","},
    {15, "-"},  {38, "-="},  {51, "->"},  {23, "."},  {52, "..."}, {17, "/"},   {40, "/="},
    {48, "//"}, {49, "//="}, {11, ":"},   {53, ":="}, {13, ";"},   {20, "<"},   {34, "<<"},
    {45, "<<="}, {30, "<="}, {29, "<>"},  {22, "="},  {28, "=="},  {21, ">"},   {31, ">="},
    {35, ">>"}, {46, ">>="}, {50, "@"},   {9, "["},   {203, "\\"}, {10, "]"},   {33, "^"},
    {44, "^="}, {25, "`"},   {26, "{"},   {18, "|"},  {43, "|="},  {27, "}"},   {32, "~"},
};
constexpr int kByTextCount = sizeof(kOperatorsByText) / sizeof(kOperatorsByText[0]);

constexpr bool StartsWith(const char* text, const char* prefix) {
  for (; *prefix; prefix++, text++) {
    if (*text != *prefix) return false;
  }
  return true;
}

// The two properties that FindOperator relies on, checked row by row.
constexpr bool SearchOrderHolds() {
  for (int i = 0; i < kByTextCount; i++) {
    for (int j = i + 1; j < kByTextCount; j++) {
      const char* earlier = kOperatorsByText[i].fSpelling;
      const char* later = kOperatorsByText[j].fSpelling;
      if (StartsWith(earlier, later)) return false;  // a prefix must come first
      if (earlier[0] == later[0] && kOperatorsByText[j - 1].fSpelling[0] != later[0])
        return false;  // a group of one first byte is broken
    }
  }
  return true;
}
static_assert(SearchOrderHolds(), "operator rows out of search order");

// The scanner steps over an operator by its length, which it reads as 1, 2 or 3.
constexpr bool LengthsHold() {
  for (const OperatorEntry& row : kOperatorsByText) {
    if (row.fSpelling[0] == '\0' || (row.fSpelling[1] != '\0' && row.fSpelling[2] != '\0' &&
                                      row.fSpelling[3] != '\0'))
      return false;
  }
  return true;
}
static_assert(LengthsHold(), "an operator of no byte or of more than three");

constexpr bool IsCanonical(int row) {
  for (int i = 0; i < row; i++) {
    if (kOperatorsByText[i].fId == kOperatorsByText[row].fId) return false;
  }
  return true;
}

constexpr int CountCanonical() {
  int n = 0;
  for (int row = 0; row < kByTextCount; row++) n += IsCanonical(row);
  return n;
}
constexpr int kByIdCount = CountCanonical();
static_assert(kByIdCount == 48, "one canonical text per operator id");

// One row per operator id, in increasing id.
struct IdRows {
  OperatorEntry fRows[kByIdCount];
  constexpr IdRows() : fRows() {
    int n = 0;
    for (int id = 0; id < kTokenIdLimit; id++) {
      for (int row = 0; row < kByTextCount; row++) {
        if (kOperatorsByText[row].fId == id && IsCanonical(row)) fRows[n++] = kOperatorsByText[row];
      }
    }
  }
};
constexpr IdRows kOperatorsById;

// Where each first byte's group of rows begins, so a lookup skips straight to its group.
struct GroupIndex {
  signed char fStart[256];
  constexpr GroupIndex() : fStart() {
    for (signed char& start : fStart) start = -1;
    for (int row = kByTextCount - 1; row >= 0; row--)
      fStart[static_cast<unsigned char>(kOperatorsByText[row].fSpelling[0])] =
          static_cast<signed char>(row);
  }
};
constexpr GroupIndex kGroupIndex;

// True when the whole spelling lies within [p, end) and equals its bytes.
bool SpellingMatches(const char* spelling, const char* p, const char* end) {
  for (; *spelling; spelling++, p++) {
    if (p == end || *p != *spelling) return false;
  }
  return true;
}

}  // namespace

const OperatorTable kOperatorTable = {
    .fByText = kOperatorsByText,
    .fByTextCount = kByTextCount,
    .fById = kOperatorsById.fRows,
    .fByIdCount = kByIdCount,
    .fGroupStart = kGroupIndex.fStart,
};

const OperatorEntry* FindOperator(const OperatorTable* table, const char* p, const char* end) {
  if (p >= end) return nullptr;
  const char first = *p;
  const int start = table->fGroupStart[static_cast<unsigned char>(first)];
  if (start < 0) return nullptr;
  const OperatorEntry* last = table->fByText + table->fByTextCount;
  const OperatorEntry* row = table->fByText + start;
  // Brackets and commas, the most common operators, are one byte that no other operator starts
  // with: their group is that one row.
  if (row->fSpelling[1] == '\0' && (row + 1 == last || row[1].fSpelling[0] != first)) return row;
  const OperatorEntry* found = nullptr;
  for (; row < last && row->fSpelling[0] == first; row++) {
    if (SpellingMatches(row->fSpelling, p, end)) found = row;
  }
  return found;
}

const char* OperatorText(const OperatorTable* table, int id) {
  for (int i = 0; i < table->fByIdCount; i++) {
    if (table->fById[i].fId == id) return table->fById[i].fSpelling;
  }
  return nullptr;
}
