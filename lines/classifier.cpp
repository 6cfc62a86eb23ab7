// The line classifier. No grammar: a table of statement words decides most lines, a few token
// rules decide the rest.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "lines/classifier.h"

#include <cstdint>
#include <string_view>

#include "core/token_ids.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/string_prefixes.h"
#include "tokenizer/token_queries.h"
#include "tokenizer/token_start.h"
#include "tokenizer/token_text.h"

namespace {

struct StatementWord {
  std::string_view fWord;  // empty in the closing row
  LineType fType;
};

// Searched from the first row; the first row whose word the key token is exactly decides.
constexpr StatementWord kStatementKeywordTable[] = {
    {"class", kClassDef},     {"def", kFunctionDef},    {"if", kIfBeginning},
    {"else", kElseBeginning}, {"while", kWhileBeginning}, {"for", kForBeginning},
    {"pass", kPass},          {"raise", kRaise},        {"break", kBreak},
    {"try", kTry},            {"except", kExcept},      {"finally", kFinally},
    {"return", kReturn},      {"import", kImport},      {"assert", kAssert},
    {"from", kFromImport},    {"print", kPrint},        {"del", kDelete},
    {"elif", kElifBeginning}, {"continue", kContinue},  {"with", kWith},
    {"", kUnknown},
};
static_assert(sizeof(kStatementKeywordTable) / sizeof(kStatementKeywordTable[0]) == 22,
              "21 statement words and the closing row");

// For each first byte, the lengths of the statement words that begin with it, as bits: most
// key tokens are names that no statement word could be, and are turned away without a search.
struct WordShapes {
  uint16_t fLengths[256];
  constexpr WordShapes() : fLengths() {
    for (const StatementWord* row = kStatementKeywordTable; !row->fWord.empty(); row++)
      fLengths[static_cast<unsigned char>(row->fWord[0])] |= uint16_t{1} << row->fWord.size();
  }
};
constexpr WordShapes kWordShapes;
static_assert(kWordShapes.fLengths[static_cast<unsigned char>('c')] == (1 << 5 | 1 << 8),
              "class and continue");

const StatementWord* FindStatementWord(const TokenText& text) {
  if (text.fLength >= 16 || !(kWordShapes.fLengths[text.At(0)] >> text.fLength & 1)) return nullptr;
  for (const StatementWord* row = kStatementKeywordTable; !row->fWord.empty(); row++) {
    if (text.Is(row->fWord)) return row;
  }
  return nullptr;
}

bool IsSkippedLeader(const TokenText& text) { return text.Is("\\") || text.Is("async"); }

// Returns the index of the "import" or "from" that a key token "lazy" stands before, past any
// line continuations, or `key` when it stands before neither: then "lazy" is a name.
int KeyAfterLazy(PyObject* const* tokens, int key, int count) {
  int next = key + 1;
  while (next < count && TokenText(tokens[next]).Is("\\")) next++;
  if (next == count) return key;
  const TokenText text(tokens[next]);
  return text.Is("import") || text.Is("from") ? next : key;
}

// Finds the defined name after the key token of a class or function definition; a line with
// no name before its parameter list, base list or colon is no definition.
int ScanDefinedName(PyObject* const* tokens, int key, int count, LineType* type,
                    PyObject** localScopeName) {
  for (int i = key + 1; i < count; i++) {
    const TokenText text(tokens[i]);
    const int id = LineTokenIdForStart(text.fBytes, text.fBytes + text.fLength);
    if (id == NAME_TOKEN && !text.Is("async")) {
      Py_CLEAR(*localScopeName);
      *localScopeName = PyUnicode_DecodeUTF8(text.fBytes, text.fLength, "replace");
      return *localScopeName ? 0 : -1;
    }
    const unsigned first = text.At(0);
    if (first == '(' || first == ')' || first == ':') break;
  }
  *type = kUnknown;
  return 0;
}

// What the first byte of a token says to the assignment and string scan.
enum class Lead : uint8_t {
  kOther,
  kQuote,      // a string literal
  kPrefix,     // the letter of a plain str prefix (r, u): a string literal when a quote follows
  kEquals,     // "=" alone is an assignment at depth 0
  kBackslash,  // "\\" alone is a continuation, passed over
};

struct LeadTable {
  Lead fRows[256];
  constexpr LeadTable() : fRows() {
    for (unsigned char quote : {'"', '\''}) fRows[quote] = Lead::kQuote;
    for (unsigned b = 0; b < 256; b++) {
      if (kPlainStringLetters.Has(b)) fRows[b] = Lead::kPrefix;
    }
    fRows[static_cast<unsigned char>('=')] = Lead::kEquals;
    fRows[static_cast<unsigned char>('\\')] = Lead::kBackslash;
  }
};
constexpr LeadTable kLeads;

// Assignments at bracket depth 0, and lines made only of string literals.
LineType ScanAssignmentOrStrings(PyObject* const* tokens, int count) {
  int depth = 0;
  bool allStrings = true;
  for (int i = 0; i < count; i++) {
    const TokenText text(tokens[i]);
    const unsigned first = text.At(0);
    switch (kLeads.fRows[first]) {
      case Lead::kQuote:
        continue;
      case Lead::kPrefix:
        if (text.At(1) == '"' || text.At(1) == '\'') continue;
        break;
      case Lead::kEquals:
        if (text.fLength == 1 && depth == 0) return kAssignment;
        break;
      case Lead::kBackslash:
        if (text.fLength == 1) continue;
        break;
      case Lead::kOther:
        break;
    }
    depth += BracketStep(first);
    allStrings = false;
  }
  return allStrings ? kStringExpression : kUnknown;
}

}  // namespace

int ClassifyLogicalLine(PyObject* const* tokens, int count, bool lazyImports, LineType* type,
                        PyObject** localScopeName) {
  int key = 0;
  while (key < count && IsSkippedLeader(TokenText(tokens[key]))) key++;
  if (key == count) {  // no tokens, or only continuations and "async"
    *type = kBlankLine;
    return 0;
  }
  if (lazyImports && TokenText(tokens[key]).Is("lazy")) key = KeyAfterLazy(tokens, key, count);
  const TokenText keyText(tokens[key]);
  if (const StatementWord* row = FindStatementWord(keyText)) {
    *type = row->fType;
    if (row->fType != kClassDef && row->fType != kFunctionDef) return 0;
    return ScanDefinedName(tokens, key, count, type, localScopeName);
  }
  *type = count == 1 && keyText.At(0) == '#' ? kComment : ScanAssignmentOrStrings(tokens, count);
  return 0;
}
