"""Fuzz target: GetLogicalLineList over arbitrary bytes cut into arbitrary readline results, and
GetLogicalLineListFromBuffer over the same bytes, which must read them as the readline of a
BytesIO does.

Input layout: byte 0 the parser options (low 4 bits) and how the source is cut (high bits),
byte 1 the first line, byte 2 the line count (low bits) and the Python version whose strings
are read (high bits), byte 3 what readline does besides handing out bytes, bytes 4.. the source (so a seed is four header bytes and then a source file). With
--hook a create hook is installed for the whole run; byte 3 also picks its behaviour.

Failures: any exception other than the ones the module documents for the input at hand, a
malformed result, or a sanitizer report.
"""
import io
import sys

import atheris

import logicalline

FIRST_LINES = (0, 1, 7, 1000, 65535, 65536, 2**31 - 3, 2**31 - 1, -1)
LINE_COUNTS = (-1, -1, -1, 0, 1, 2, 3, 10, 2**31 - 1, -2)
FEATURE_VERSIONS = (None, (3, 11), (3, 12), (3, 14))


class ReadlineError(Exception):
    pass


class HookError(Exception):
    pass


class Bytes(bytes):
    pass


def CutSource(source, mode, cuts):
    """Splits the source into readline results: at line breaks, at arbitrary points, whole."""
    if mode == 0:
        return source.splitlines(keepends=True)
    if mode == 1:
        return [source] if source else []
    chunks, at = [], 0
    for cut in cuts:
        step = 1 + cut % 17
        chunks.append(source[at:at + step])
        at += step
        if at >= len(source):
            break
    if at < len(source):
        chunks.append(source[at:])
    return [c for c in chunks if c]


def MakeReadline(chunks, action):
    """readline over the chunks; `action` may make its n-th call misbehave."""
    calls = iter(range(1 << 30))
    odd = action >> 4  # which call misbehaves
    kind = action & 7

    def readline():
        n = next(calls)
        if n == odd:
            if kind == 1:
                raise ReadlineError()
            if kind == 2:
                return "text"
            if kind == 3:
                return bytearray(b"x\n")
            if kind == 4:
                return None
            if kind == 5 and n < len(chunks):
                return Bytes(chunks[n])
            if kind == 6:  # a nested read of the rest of the input
                logicalline.CreateLogicalLineParser().GetLogicalLineList(
                    iter(chunks[n:] + [b""]).__next__)
        return chunks[n] if n < len(chunks) else b""
    return readline


HOOK = {"kind": 0, "depth": 0}


def Hook(indent, first, count, tokens, positions, spaces, tabs, incomplete, text):
    assert type(tokens) is tuple and type(positions) is tuple and len(tokens) == len(positions)
    assert all(type(t) is bytes for t in tokens), tokens
    assert all(0 <= line < count and col >= 0 for line, col in positions), positions
    assert indent >= 0 and first >= 0 and count >= 1, (indent, first, count)
    assert text is None or type(text) is str
    kind = HOOK["kind"]
    if kind == 1:
        return None
    if kind == 2:
        raise HookError()
    if kind == 3 and text is not None and HOOK["depth"] < 3:  # a nested read of the text
        HOOK["depth"] += 1
        try:
            return logicalline.CreateLogicalLineParser().GetLogicalLineList(
                io.BytesIO(text.encode()).readline)
        finally:
            HOOK["depth"] -= 1
    if kind == 4:
        logicalline.SetLogicalCreateFunction(Hook)  # replaces itself while running
    return (indent, first, count, tokens)


def CheckLine(line, with_hook):
    if with_hook:
        return
    tokens = line.fTokens
    assert len(tokens) == line.fTokenCount >= 1
    for i, (text, position) in enumerate(tokens):
        assert type(text) is str and 0 <= position[0] < line.fLineCount and position[1] >= 0
        assert 1 <= line.GetTokenType(i) <= 203
    line.fType, line.fNamesDefined, line.fLocalScopeName


def TestOneInput(data, with_hook=False):
    if len(data) < 4:
        return
    options, first_pick, count_pick, action = data[:4]
    source = data[4:]
    chunks = CutSource(source, (options >> 4) % 3, data[4:4 + 64])
    first = FIRST_LINES[first_pick % len(FIRST_LINES)]
    count = LINE_COUNTS[count_pick % len(LINE_COUNTS)]
    HOOK["kind"] = (action >> 3) % 5
    version = FEATURE_VERSIONS[(count_pick >> 4) % len(FEATURE_VERSIONS)]
    parser = logicalline.CreateLogicalLineParser(*(options >> bit & 1 for bit in range(4)),
                                                 feature_version=version)
    readline = MakeReadline(chunks, action)
    try:
        lines = parser.GetLogicalLineList(readline, first, count)
    except ReadlineError:
        assert action & 7 == 1
        return
    except HookError:
        assert with_hook and HOOK["kind"] == 2
        return
    except TypeError as e:  # readline gave a str, bytearray or None
        assert action & 7 in (2, 3, 4), e
        return
    except UnicodeDecodeError:  # the hook's text argument is decoded strictly
        assert with_hook
        return
    except ValueError as e:
        assert (b"\0" in source and "Binary data encountered at lineno" in str(e)) or (
            first < 0 and str(e) == "first line must be >= 0") or (
            count < -1 and str(e) == "line count must be >= 0, or -1 for no limit"), e
        return
    except OverflowError as e:
        assert first > 2**31 - 1000 and "does not fit in 32 bits" in str(e), e
        return
    assert type(lines) is list
    for line in lines:
        CheckLine(line, with_hook)
    if not with_hook:
        CompareBufferPath(parser, source, first, count, bytearray if action & 8 else bytes)


def Outcome(read):
    """Every field of the lines that read() gives, or the error it raises."""
    try:
        return [(line.fType, line.fLocalScopeName, line.fFirstLine, line.fLineCount,
                 line.fIndentLevel, line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete,
                 line.fTokens, Text(line)) for line in read()]
    except (ValueError, OverflowError) as e:
        return type(e).__name__, str(e)


def Text(line):
    try:
        return line.fLineText
    except UnicodeDecodeError as e:
        return e.object


def CompareBufferPath(parser, source, first, count, kind):
    """The buffer path gives what the readline path gives over BytesIO, exceptions included."""
    by_readline = Outcome(lambda: parser.GetLogicalLineList(io.BytesIO(source).readline, first,
                                                            count))
    by_buffer = Outcome(lambda: parser.GetLogicalLineListFromBuffer(kind(source), first, count))
    assert by_buffer == by_readline, (by_buffer, by_readline)


def main():
    with_hook = "--hook" in sys.argv
    if with_hook:
        sys.argv.remove("--hook")
        logicalline.SetLogicalCreateFunction(Hook)
    atheris.Setup(sys.argv, lambda data: TestOneInput(data, with_hook))
    atheris.Fuzz()


if __name__ == "__main__":
    main()
