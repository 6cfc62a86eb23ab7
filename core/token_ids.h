// Token ids: what kind of token a text is. 1 to 50 follow the classic token numbering; the rest
// are this module's own. No id is 0.
#pragma once

constexpr int NAME_TOKEN = 1;
constexpr int NUMBER_TOKEN = 2;
constexpr int STRING_TOKEN = 3;
constexpr int NEWLINE_TOKEN = 4;
constexpr int INDENT_TOKEN = 5;   // only a key of the standard token texts
constexpr int DEDENT_TOKEN = 6;   // only a key of the standard token texts
constexpr int OP_TOKEN = 54;      // only a key of the standard token texts
constexpr int ERROR_TOKEN = 201;
constexpr int COMMENT_TOKEN = 202;
constexpr int BACKSLASH_TOKEN = 203;

constexpr int kTokenIdLimit = 204;  // every id is below this

// Marks the text of an error token; the source bytes follow it.
constexpr char kErrorPrefix[] = "<errortoken> ";
constexpr int kErrorPrefixLength = sizeof(kErrorPrefix) - 1;
