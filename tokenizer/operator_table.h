// Operator table: maps operator texts to token ids and token ids back to canonical texts.
// Kept as data: the scanner, the token list, the token queries and the classifier read the
// same rows.
#pragma once

struct OperatorEntry {
  int fId;
  const char* fSpelling;  // 1 to 3 ASCII characters
};

struct OperatorTable {
  const OperatorEntry* fByText;  // search order: see FindOperator
  int fByTextCount;
  const OperatorEntry* fById;  // increasing id; each text is its id's canonical text
  int fByIdCount;
  const signed char* fGroupStart;  // by first byte: index of the first fByText row, or -1
};

// The module's one operator table.
extern const OperatorTable kOperatorTable;

// Returns the row of the longest operator that is a prefix of [p, end), or nullptr.
const OperatorEntry* FindOperator(const OperatorTable* table, const char* p, const char* end);

// Returns the canonical text of an operator id, or nullptr when the id has no row.
const char* OperatorText(const OperatorTable* table, int id);
