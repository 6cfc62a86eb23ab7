"""Compares tokens and logical line ends with `tokenize` over the standard library: a sample of
files by default, every file with --full-stdlib. Each of the reader's own rules adjusts what
`tokenize` gives in one place below."""

import bisect
import io
import os
import re
import sys
import token
import tokenize

import pytest

import logicalline

ROOT = os.path.dirname(os.__file__)
SAMPLE_SIZE = 80
SKIPPED = {token.ENCODING, token.NEWLINE, token.NL, token.INDENT, token.DEDENT, token.ENDMARKER}
# Newer versions split f-strings (and t-strings) into parts; the reader keeps one string token.
STRING_STARTS = {getattr(token, n) for n in ("FSTRING_START", "TSTRING_START") if hasattr(token, n)}
STRING_ENDS = {getattr(token, n) for n in ("FSTRING_END", "TSTRING_END") if hasattr(token, n)}
# A number runs on over dots, hex letters and suffixes without checking its form: "1.5e100."
# in "1.5e100.__format__" is one number.
NUMBER_RUN = re.compile(rb"[0-9.](?:[0-9a-fA-F.jJlLoOxX]|(?<=[eE])[+-]"
                        rb"|(?<=[0-9a-fA-FoOxX])_(?=[0-9a-fA-F]))*")
# First tokens of a physical line that the reader takes for a new statement inside brackets.
STATEMENT_STARTS = {"@", "if", "else", "for", "assert", "break", "class", "continue", "def", "del",
                    "elif", "except", "exec", "finally", "from", "global", "import", "pass",
                    "raise", "return", "try", "while"}
# Before 3.12 tokenize ends a name before U+E0100, which continues identifiers.
TOKENIZE_FALLS_SHORT = {"test/test_unicode_identifiers.py"} if sys.version_info < (3, 12) else set()


def library_files():
    files = []
    for folder, subfolders, names in os.walk(ROOT):
        subfolders[:] = sorted(d for d in subfolders if d not in ("site-packages", "__pycache__"))
        files += [os.path.relpath(os.path.join(folder, n), ROOT) for n in sorted(names)
                  if n.endswith(".py")]
    return files


def pytest_generate_tests(metafunc):
    if "path" in metafunc.fixturenames:
        files = library_files()
        if not metafunc.config.getoption("--full-stdlib"):
            files = files[::max(1, len(files) // SAMPLE_SIZE)]
        metafunc.parametrize("path", files)


def expected_tokens(source):
    """Returns tokenize's tokens as the reader lists them, and the rows where NEWLINEs stand."""
    rows = io.BytesIO(source).readlines()
    starts = [0]
    for row in rows:
        starts.append(starts[-1] + len(row))

    def offset(row, col):  # tokenize counts columns in characters, the reader in bytes
        return starts[row - 1] + len(rows[row - 1].decode()[:col].encode()) if row <= len(rows) \
            else starts[-1]

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
        # Backslash continuations are listed as tokens of their own.
        tokens += [("\\", place(i)) for i in range(done, start) if source[i] == ord("\\")]
        done = end
        text = tok.string
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
        elif text == "<" and source[end:end + 1] == b">":  # "<>" is listed as "!="
            text, absorbed = "!=", end + 1
        elif tok.type == token.NAME and not text.isidentifier() or \
                tok.type == token.ERRORTOKEN and text != "`":
            # "`" is an operator to the reader; newer tokenize calls "€" a name
            text = "<errortoken> " + text
        if text == "@=":  # no such operator: "@" and then "="
            tokens += [("@", place(start)), ("=", place(start + 1))]
            continue
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

    got = [(text, (line.fFirstLine + row, col))
           for line in lines for text, (row, col) in line.fTokens]
    assert got == expected

    # Logical lines end where tokenize puts a NEWLINE. The only other ends come from a physical
    # line that begins a statement inside open brackets: the reader hands it back and ends the
    # open line there, incomplete; lines after it may end early until the NEWLINE is reached.
    lines = [line for line in lines if any(text[0] != "#" for text, _ in line.fTokens)]
    ends = [line.fFirstLine + line.fLineCount - 1 for line in lines]
    assert newline_rows <= set(ends)
    for i, line in enumerate(lines):
        if ends[i] in newline_rows or (i and ends[i - 1] not in newline_rows):
            continue
        successor = lines[i + 1]
        assert line.fIncomplete and successor.fFirstLine == ends[i] + 1, ends[i]
        assert successor.fTokens[0][0] in STATEMENT_STARTS, ends[i]
