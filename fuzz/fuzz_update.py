"""Fuzz target: UpdateLogicalLineList replaying edits on arbitrary bytes.

Input layout: byte 0 the parser options, then the text and a program of edits after a 0xFF
0xFE separator (a seed is an option byte and a source file). Each edit is three program bytes:
where it starts, how many lines it removes, and how many lines it inserts (a few, or 33 to 64
for a byte from 0xC0 on while the text is under 600 lines), which are taken from the text
itself. After every edit the list must be what a full read of the new text gives, and every
line outside the replaced slice must be the same object as before.

Failures: a difference, an unexpected exception, or a sanitizer report.
"""
import io
import sys

import atheris

import logicalline

SEPARATOR = b"\xff\xfe"


def Lines(text):
    return io.BytesIO(text).readlines()  # cut at line feeds only, as the buffer reader cuts


def View(lines):
    return [(x.fType, x.fFirstLine, x.fLineCount, x.fIndentLevel, x.fTabsInIndent,
             x.fSpacesInIndent, x.fIncomplete, x.fLocalScopeName, x.fTokens, Text(x))
            for x in lines]


def Text(line):
    try:
        return line.fLineText
    except UnicodeDecodeError as e:
        return e.object


def Read(parser, doc):
    try:
        return parser.GetLogicalLineListFromBuffer(b"".join(doc))
    except (ValueError, OverflowError):
        return None


def Count(byte):
    """Mostly a few lines; now and then a paste or a cut big enough to split groups of lines."""
    return byte % 4 if byte < 0xC0 else 33 + byte % 32


def TestOneInput(data):
    if len(data) < 2:
        return
    parser = logicalline.CreateLogicalLineParser(*(data[0] >> bit & 1 for bit in range(4)))
    text, _, program = data[1:].partition(SEPARATOR)
    doc = Lines(text)  # physical lines as a BytesIO cuts them: at line feeds only
    pool = doc or [b"x\n"]
    lines = Read(parser, doc)
    if lines is None:
        return
    for at in range(0, len(program) - 2, 3):
        first = program[at] % (len(doc) + 1)
        old_count = Count(program[at + 1]) % (len(doc) - first + 1)
        count = Count(program[at + 2]) if len(doc) < 600 else program[at + 2] % 4
        new = [pool[(program[at + 2] + k) % len(pool)] for k in range(count)]
        edited = doc[:first] + new + doc[first + old_count:]
        edited = [line if line.endswith(b"\n") or i == len(edited) - 1 else line + b"\n"
                  for i, line in enumerate(edited)]
        # A line whose line break came is part of the edit too.
        if 0 < first == len(doc) and doc[-1] != edited[first - 1]:
            first, old_count = first - 1, old_count + 1
        new_count = len(edited) - len(doc) + old_count
        if Read(parser, edited) is None:  # a NUL byte: the update must refuse and keep all
            before = list(lines)
            try:
                parser.UpdateLogicalLineList(lines, b"".join(edited), first, old_count, new_count)
            except ValueError:
                assert lines == before
                continue
            raise AssertionError("an update of a text that cannot be read")
        before = list(lines)
        index, removed, added = parser.UpdateLogicalLineList(lines, b"".join(edited), first,
                                                             old_count, new_count)
        assert View(lines) == View(parser.GetLogicalLineListFromBuffer(b"".join(edited)))
        kept = before[:index] + before[index + removed:]
        assert all(a is b for a, b in zip(lines[:index] + lines[index + len(added):], kept))
        doc = edited


def main():
    atheris.Setup(sys.argv, TestOneInput)
    atheris.Fuzz()


if __name__ == "__main__":
    main()
