"""Fuzz target: UpdateLogicalLineList replaying edits, and changes a host makes to the list
between them, on arbitrary bytes.

Input layout: byte 0 the parser options, then the text and a program after a 0xFF 0xFE
separator (a seed is an option byte and a source file). The text is cut to TEXT_LIMIT bytes and
the program to STEPS steps, so that each run is small and many runs are made. Each step is four
program bytes: where the edit starts, how many lines it removes, how many lines it inserts (a
few, or 33 to 64 for a byte from 0xC0 on; taken from the text itself), and a change of the
list made before the update (most byte values make none). After a step the list must be what a
full read of the new text gives, with every line outside the replaced slice the same object as
before; or, only when the list was changed, the update raises ValueError and leaves the list
exactly as it was.

Failures: a difference, an unexpected exception, or a sanitizer report.
"""
import io
import sys

import atheris

import logicalline

SEPARATOR = b"\xff\xfe"
TEXT_LIMIT = 1536
STEPS = 8


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


# Changes a host may make, each given the parser, the list, the doc it was read from, and an
# index into the list; each returns whether the list still holds what the last update left.
def Swap(parser, lines, doc, i):
    lines[i:i + 2] = lines[i:i + 2][::-1]
    return len(lines[i:i + 2]) < 2


def Foreign(parser, lines, doc, i):
    other = Read(parser, [b"\n"] * 3 + doc)
    lines[i] = other[i % len(other)]
    return False


def Copied(parser, lines, doc, i):
    lines[i] = lines[i].Copy()
    return False


def NewRange(parser, lines, doc, i):
    lines[i].SetLineRange(lines[i].fFirstLine + 1, lines[i].fLineCount)
    return False


def SameRange(parser, lines, doc, i):
    lines[i].SetLineRange(lines[i].fFirstLine, lines[i].fLineCount)
    return True


def Deleted(parser, lines, doc, i):
    del lines[i]
    return False


def PutBack(parser, lines, doc, i):
    lines.insert(i, lines.pop(i))
    return True


def Reversed(parser, lines, doc, i):
    lines.reverse()
    return len(lines) < 2


def Released(parser, lines, doc, i):  # a line freed, and one made where it was
    lines[i] = None
    other = Read(parser, doc)
    lines[i] = other[i % len(other)]
    return False


CHANGES = [Swap, Foreign, Copied, NewRange, SameRange, Deleted, PutBack, Reversed, Released]


def Edit(doc, program, at):
    """The doc after the edit of program[at:at + 3], and the edit's arguments."""
    pool = doc or [b"x\n"]
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
    return edited, (first, old_count, len(edited) - len(doc) + old_count)


def Step(parser, lines, doc, program, at):
    """Changes the list as program[at + 3] says, then makes and checks the edit of program[at:].
    Returns the new doc and the list to go on with."""
    kept = True
    pick = program[at + 3] % (2 * len(CHANGES))
    if lines and pick < len(CHANGES):
        kept = CHANGES[pick](parser, lines, doc, program[at] % len(lines))
    edited, arguments = Edit(doc, program, at)
    before = [(x, x.fFirstLine, x.fLineCount) for x in lines]
    try:
        index, removed, added = parser.UpdateLogicalLineList(lines, b"".join(edited), *arguments)
    except ValueError:
        assert [(x, x.fFirstLine, x.fLineCount) for x in lines] == before
        full = Read(parser, edited)
        assert full is None or not kept, "a list as the last update left it was refused"
        return edited, full
    assert Read(parser, edited) is not None, "an update of a text that cannot be read"
    assert View(lines) == View(parser.GetLogicalLineListFromBuffer(b"".join(edited)))
    kept_lines = [x for x, _, _ in before]
    kept_lines = kept_lines[:index] + kept_lines[index + removed:]
    assert all(a is b for a, b in zip(lines[:index] + lines[index + len(added):], kept_lines))
    return edited, lines


def TestOneInput(data):
    if len(data) < 2:
        return
    parser = logicalline.CreateLogicalLineParser(*(data[0] >> bit & 1 for bit in range(4)))
    text, _, program = data[1:].partition(SEPARATOR)
    doc = Lines(text[:TEXT_LIMIT])  # physical lines as a BytesIO cuts them: at line feeds only
    lines = Read(parser, doc)
    if lines is None:
        return
    for at in range(0, min(len(program), 4 * STEPS) - 3, 4):
        doc, lines = Step(parser, lines, doc, program, at)
        if lines is None:
            return


def main():
    atheris.Setup(sys.argv, TestOneInput)
    atheris.Fuzz()


if __name__ == "__main__":
    main()
