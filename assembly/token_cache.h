// Token texts shared by every read of an interpreter: the same name text read again, in this call
// or a later one, hands out the same immutable bytes object instead of a new one. Most names
// recur from file to file, so a table that outlives the call is made once and then only found.
#pragma once

#define PY_SSIZE_T_CLEAN
#include <Python.h>

#include <cstddef>
#include <cstdint>

#include "core/token_ids.h"

constexpr Py_ssize_t kCachedTextLimit = 40;  // longer texts are rarely repeated

// The texts that one interpreter's reads share: a table of names, and the fixed texts
// (operators' canonical texts and the string placeholder), one bytes object per token id (the
// module has one operator table).
struct TokenTexts;

// Returns new empty tables, or nullptr with MemoryError set.
TokenTexts* NewTokenTexts();

// Returns a new reference to a bytes object holding the n bytes at p, which lie in the text of a
// TextBuffer, so that a whole word may be read at p. Shared texts stay in the table until
// another text takes their place.
PyObject* CachedBytes(TokenTexts* texts, const char* p, Py_ssize_t n);

// True when the token is the object that every read hands out for its text, for now: a name
// the table holds, a fixed text, or a text of one byte (the interpreter keeps one object for
// each byte value). Numbers, comments and strings of their own are new objects every time.
bool IsSharedToken(const TokenTexts* texts, PyObject* token);

// Returns a new reference to the fixed text stored for a token id, or nullptr if none is.
PyObject* CachedFixedText(const TokenTexts* texts, int id);

// Stores the fixed text that stands for a token id; returns a new reference to it.
PyObject* StoreFixedText(TokenTexts* texts, int id, const char* text);

// Empties the name table and the fixed texts.
void ReleaseTokenTexts(TokenTexts* texts);

// Empties the tables and frees them.
void FreeTokenTexts(TokenTexts* texts);
