"""Compares tokens and logical line ends with `tokenize` over the standard library (a sample, or
every file with --full-stdlib). Each of the reader's own rules adjusts tokenize's output once."""
import bisect
import glob
import io
import itertools
import os
import re
import sys
import token
import tokenize

import pytest

import logicalline

ROOT = os.path.dirname(os.__file__)
SKIPPED = {token.ENCODING, token.NEWLINE, token.NL, token.INDENT, token.DEDENT, token.ENDMARKER}
# Newer versions split f-strings (and t-strings) into parts; the reader keeps one string token.
STRING_STARTS = {getattr(token, n) for n in ("FSTRING_START", "TSTRING_START") if hasattr(token, n)}
STRING_ENDS = {getattr(token, n) for n in ("FSTRING_END", "TSTRING_END") if hasattr(token, n)}
# A number runs on over dots, hex letters and suffixes: "1.5e100." is one number.
NUMBER_RUN = re.compile(rb"[0-9.](?:[0-9a-fA-F.jJlLoOxX]|(?<=[eE])[+-]"
                        rb"|(?<=[0-9a-fA-FoOxX])_(?=[0-9a-fA-F]))*")
# First tokens of a physical line that the reader takes for a new statement inside brackets.
STATEMENT_STARTS = set("@ if else for assert break class continue def del elif except exec "
                       "finally from global import pass raise return try while".split())
# Before 3.12 tokenize ends a name before U+E0100, which continues identifiers.
TOKENIZE_FALLS_SHORT = {"test/test_unicode_identifiers.py"} if sys.version_info < (3, 12) else set()


def pytest_generate_tests(metafunc):
    if "path" in metafunc.fixturenames:
        files = sorted(os.path.relpath(path, ROOT) for path in
                       glob.glob(os.path.join(ROOT, "**", "*.py"), recursive=True)
                       if "-packages" not in path)
        full = metafunc.config.getoption("--full-stdlib")
        metafunc.parametrize("path", files if full else files[::len(files) // 80])


def expected_tokens(source):
    """tokenize's tokens as the reader lists them, and the rows where NEWLINEs stand."""
    rows = io.BytesIO(source).readlines()
    starts = list(itertools.accumulate(map(len, rows), initial=0))

    def offset(row, col):  # tokenize counts columns in characters, the reader in bytes
        if row > len(rows):
            return starts[-1]
        return starts[row - 1] + len(rows[row - 1].decode()[:col].encode())

    def place(at):
        row = bisect.bisect_right(starts, at)
        return row, (at - starts[row - 1]) % 65536  # columns are kept in 16 bits

    tokens, newline_rows, done, nesting, absorbed = [], set(), 0, 0, 0
    for tok in tokenize.tokenize(io.BytesIO(source).readline):
        if tok.type == token.ENCODING:
            continue
        start, end = offset(*tok.start), offset(*tok.end)
        if nesting:
            nesting += (tok.type in STRING_STARTS) - (tok.type in STRING_ENDS)
            if not nesting:
                text = source[string_start:end].decode()
                prefix = text[:len(text) - len(text.lstrip("rRbBuUfFtT"))]
                body = text[len(prefix):]
                quote = body[:3] if body[:3] == body[0] * 3 and len(body) >= 6 else body[0]
                if quote in re.sub(r"\\.", "", body[len(quote):-len(quote)], flags=re.S):
                    pytest.skip("a quote nested in an f-string ends the reader's string there")
                if "t" in prefix.lower():  # no string prefix: the letters are a name
                    tokens.append((prefix, place(string_start)))
                    string_start += len(prefix.encode())
                tokens.append((source[string_start:end].decode(), place(string_start)))
                done = end
            continue
        if start < absorbed:
            continue
        # Backslash continuations are tokens of their own.
        tokens += [("\\", place(i)) for i in range(done, start) if source[i] == ord("\\")]
        done, text = end, tok.string
        if tok.type in STRING_STARTS:
            nesting, string_start = 1, start
            continue
        if tok.type == token.NEWLINE:
            newline_rows.add(tok.start[0])
        if tok.type in SKIPPED or tok.type == token.ERRORTOKEN and text.isspace():
            continue
        if tok.type == token.COMMENT:  # a comment runs through its line break
            text = rows[tok.start[0] - 1][start - starts[tok.start[0] - 1]:].decode()
        elif tok.type == token.NUMBER:
            absorbed = NUMBER_RUN.match(source, start).end()
            text = source[start:absorbed].decode()
        elif text == "<" and source[end:end + 1] == b">":
            text, absorbed = "!=", end + 1
        elif tok.type == token.NAME and not text.isidentifier() or \
                tok.type == token.ERRORTOKEN and text != "`":  # "`" is an operator here
            text = "<errortoken> " + text
        if text == "@=":  # no such operator: "@" and then "="
            tokens += [("@", place(start)), ("=", place(start + 1))]
        else:
            tokens.append((text, place(start)))
    return tokens, newline_rows


def test_reader_agrees_with_tokenize(path):
    with open(os.path.join(ROOT, path), "rb") as f:
        source = f.read().removeprefix(b"\xef\xbb\xbf")
    parser = logicalline.CreateLogicalLineParser(True, False, False, False)
    if b"\0" in source:
        with pytest.raises(ValueError):
            parser.GetLogicalLineList(io.BytesIO(source).readline)
        pytest.skip("a NUL byte stops the reader")
    lines = parser.GetLogicalLineList(io.BytesIO(source).readline, 1)
    if path in TOKENIZE_FALLS_SHORT:
        pytest.skip("tokenize of this version cuts a name short")
    try:
        if not source.isascii() and tokenize.detect_encoding(io.BytesIO(source).readline)[0] \
                not in ("utf-8", "utf-8-sig"):
            pytest.skip("not UTF-8, the only encoding the reader knows")
        expected, newline_rows = expected_tokens(source)
    except (SyntaxError, tokenize.TokenError, UnicodeDecodeError) as error:
        pytest.skip(f"tokenize cannot read it: {error!r}")
    assert [(text, (line.fFirstLine + row, col))
            for line in lines for text, (row, col) in line.fTokens] == expected

    # Logical lines end where tokenize puts a NEWLINE, or where a physical line that begins a
    # statement inside open brackets is handed back: the open line ends there, incomplete, and
    # lines after it may end early until the NEWLINE is reached.
    lines = [line for line in lines if any(text[0] != "#" for text, _ in line.fTokens)]
    ends = [line.fFirstLine + line.fLineCount - 1 for line in lines]
    assert newline_rows <= set(ends)
    for i, line in enumerate(lines):
        if ends[i] not in newline_rows and (i == 0 or ends[i - 1] in newline_rows):
            assert line.fIncomplete and lines[i + 1].fFirstLine == ends[i] + 1, ends[i]
            assert lines[i + 1].fTokens[0][0] in STATEMENT_STARTS, ends[i]
