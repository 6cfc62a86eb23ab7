// The operator table. "<>" is the one text that is not canonical for its id: it is listed
// under "!=".
#include "tokenizer/operator_table.h"

namespace {

// Rows with the same first byte are contiguous, and every row stands after each row whose
// text is a proper prefix of its own, so the last row that matches is the longest operator.
constexpr OperatorEntry kOperatorsByText[] = {
    {29, "!="}, {24, "%"},   {41, "%="},  {19, "&"},  {42, "&="},  {7, "("},    {8, ")"},
    {16, "*"},  {36, "**"},  {47, "**="}, {39, "*="}, {14, "+"},   {37, "+="},  {12, ","},
    {15, "-"},  {38, "-="},  {51, "->"},  {23, "."},  {52, "..."}, {17, "/"},   {40, "/="},
    {48, "//"}, {49, "//="}, {11, ":"},   {53, ":="}, {13, ";"},   {20, "<"},   {34, "<<"},
    {45, "<<="}, {30, "<="}, {29, "<>"},  {22, "="},  {28, "=="},  {21, ">"},   {31, ">="},
    {35, ">>"}, {46, ">>="}, {50, "@"},   {9, "["},   {203, "\\"}, {10, "]"},   {33, "^"},
    {44, "^="}, {25, "`"},   {26, "{"},   {18, "|"},  {43, "|="},  {27, "}"},   {32, "~"},
};

constexpr OperatorEntry kOperatorsById[] = {
    {7, "("},    {8, ")"},   {9, "["},    {10, "]"},   {11, ":"},   {12, ","},   {13, ";"},
    {14, "+"},   {15, "-"},  {16, "*"},   {17, "/"},   {18, "|"},   {19, "&"},   {20, "<"},
    {21, ">"},   {22, "="},  {23, "."},   {24, "%"},   {25, "`"},   {26, "{"},   {27, "}"},
    {28, "=="},  {29, "!="}, {30, "<="},  {31, ">="},  {32, "~"},   {33, "^"},   {34, "<<"},
    {35, ">>"},  {36, "**"}, {37, "+="},  {38, "-="},  {39, "*="},  {40, "/="},  {41, "%="},
    {42, "&="},  {43, "|="}, {44, "^="},  {45, "<<="}, {46, ">>="}, {47, "**="}, {48, "//"},
    {49, "//="}, {50, "@"},  {51, "->"},  {52, "..."}, {53, ":="},  {203, "\\"},
};

constexpr int kByTextCount = sizeof(kOperatorsByText) / sizeof(kOperatorsByText[0]);
constexpr int kByIdCount = sizeof(kOperatorsById) / sizeof(kOperatorsById[0]);
static_assert(kByTextCount == 49, "every canonical text plus \"<>\"");
static_assert(kByIdCount == 48, "one row per operator id");
static_assert(kByTextCount == kByIdCount + 1, "the tables must list the same operators");

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

const OperatorTable kOperatorTable = {kOperatorsByText, kByTextCount, kOperatorsById, kByIdCount,
                                      kGroupIndex.fStart};

const OperatorEntry* FindOperator(const OperatorTable* table, const char* p, const char* end) {
  if (p >= end) return nullptr;
  const char first = *p;
  const int start = table->fGroupStart[static_cast<unsigned char>(first)];
  if (start < 0) return nullptr;
  const OperatorEntry* last = table->fByText + table->fByTextCount;
  const OperatorEntry* found = nullptr;
  for (const OperatorEntry* row = table->fByText + start; row < last && row->fSpelling[0] == first;
       row++) {
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
