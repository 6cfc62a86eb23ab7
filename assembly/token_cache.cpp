// The token text table, and the fixed texts.
#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include "assembly/token_cache.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "core/shared_table.h"
#include "tokenizer/operator_table.h"
#include "tokenizer/token_start.h"
#include "tokenizer/token_text.h"

namespace {

// A text is known by its first eight bytes and its last eight (zero-padded words), and its
// length: that is the whole text up to 16 bytes, and the rest is compared only beyond that.
struct TextSlot {
  PyObject* fBytes;  // owned, or null
  uint64_t fHead;
  uint64_t fTail;
  Py_ssize_t fLength;
  bool Full() const { return fBytes != nullptr; }
  void Release() const { Py_XDECREF(fBytes); }
};

constexpr size_t kTextSets = 4096;  // a power of two: 8,192 texts in 256 KB

size_t TextSetOf(uint64_t head, uint64_t tail, Py_ssize_t n) {
  return HashWords(head, tail, n) & (kTextSets - 1);
}

}  // namespace

struct TokenTexts {
  SharedTable<TextSlot, kTextSets, 2> fNames;
  SharedTable<ObjectSlot, kTokenIdLimit> fFixed;  // by token id
};

// All zero is empty: the pages of a slot that no read reaches are never touched.
TokenTexts* NewTokenTexts() {
  auto* texts = static_cast<TokenTexts*>(calloc(1, sizeof(TokenTexts)));
  if (!texts) PyErr_NoMemory();
  return texts;
}

PyObject* CachedBytes(TokenTexts* texts, const char* p, Py_ssize_t n) {
  if (n > kCachedTextLimit || n <= 1) return PyBytes_FromStringAndSize(p, n);
  const uint64_t head = WordAt(p, n);
  const uint64_t tail = TailWord(p, n);
  const size_t set = TextSetOf(head, tail, n);
  const TextSlot* found = texts->fNames.Find(set, [&](const TextSlot& slot) {
    return slot.fHead == head && slot.fTail == tail && slot.fLength == n &&
           // Through a plain pointer: clang's bounds check takes the bytes object's one-byte
           // array for the bound of the text.
           (n <= 16 || memcmp(TokenText(slot.fBytes).fBytes + 8, p + 8,
                              static_cast<size_t>(n - 16)) == 0);
  });
  if (found) return Py_NewRef(found->fBytes);
  PyObject* bytes = PyBytes_FromStringAndSize(p, n);
  if (!bytes) return nullptr;
  texts->fNames.Store(set, TextSlot{.fBytes = Py_NewRef(bytes), .fHead = head, .fTail = tail,
                                    .fLength = n});
  return bytes;
}

bool IsSharedToken(const TokenTexts* texts, PyObject* token) {
  const TokenText text(token);
  const Py_ssize_t n = text.fLength;
  if (n <= 1) return true;
  if (n > kCachedTextLimit) return false;
  const int id = TokenIdForStart(&kOperatorTable, text.fBytes, text.fBytes + n);
  if (id != NAME_TOKEN) {
    const ObjectSlot* fixed = texts->fFixed.At(static_cast<size_t>(id));
    return fixed && fixed->fObject == token;
  }
  // A token object has nothing readable past its text: its head is read a byte at a time.
  return texts->fNames.Holds(TextSetOf(HeadWord(text.fBytes, n), TailWord(text.fBytes, n), n),
                           [token](const TextSlot& slot) { return slot.fBytes == token; });
}

PyObject* CachedFixedText(const TokenTexts* texts, int id) {
  const ObjectSlot* known = texts->fFixed.At(static_cast<size_t>(id));
  return known ? Py_NewRef(known->fObject) : nullptr;
}

PyObject* StoreFixedText(TokenTexts* texts, int id, const char* text) {
  PyObject* bytes = PyBytes_FromString(text);
  if (!bytes) return nullptr;
  texts->fFixed.Store(static_cast<size_t>(id), ObjectSlot{.fObject = Py_NewRef(bytes)});
  return bytes;
}

void ReleaseTokenTexts(TokenTexts* texts) {
  texts->fNames.Release();
  texts->fFixed.Release();
}

void FreeTokenTexts(TokenTexts* texts) {
  if (!texts) return;
  ReleaseTokenTexts(texts);
  free(texts);
}
