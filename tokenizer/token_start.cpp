// Token starts, and the opening of a string.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "tokenizer/token_start.h"

#include <cstddef>

#include "core/token_ids.h"
#include "tokenizer/code_units.h"
#include "tokenizer/string_prefixes.h"

namespace {

const char* OpenQuote(const char* p, const char* end, ScanState* state) {
  const char quote = *p;
  state->fTokenId = STRING_TOKEN;
  state->fQuote = quote;
  // Three quotes count as triple only when all three lie on the line.
  if (p + 2 < end && p[1] == quote && p[2] == quote) {
    state->fTriple = 1;
    return p + 3;
  }
  state->fTriple = 0;
  return p + 1;
}

}  // namespace

const char* ScanStringStart(const char* p, const char* end, ScanState* state, StringRules rules) {
  if (p < end && IsQuote(Byte(p))) return OpenQuote(p, end, state);  // most strings: no prefix
  const StringStart start = FindStringStart(p, end, rules);
  if (start.fQuote) return OpenQuote(start.fQuote, end, state);
  state->fTokenId = ERROR_TOKEN;
  state->fQuote = 0;
  state->fTriple = 0;
  return nullptr;
}
