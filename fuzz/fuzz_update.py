"""Fuzz target: UpdateLogicalLineList replaying edits, told truly, widely, wrongly or not at
all, by the parser that read the list or one with other options, and changes a host makes to the
list between them, on arbitrary bytes.

Input layout: byte 0 the parser options, then the text and a program after a 0xFF 0xFE separator
(a seed is an option byte and a source file). The text is cut to TEXT_LIMIT bytes and the
program to STEPS steps, so that each run is small and many runs are made. Each step is five
program bytes: where the edit starts, how many lines it removes, how many lines it inserts (a
few, or 33 to 64 for a byte from 0xC0 on; taken from the text itself), a change of the list made
before the update (most byte values make none), and how the edit is told (truly below 0x80; else
wider, with a line or a count off, or not at all; from 0xC0 by a parser with other options, from
0xE0 as one edit where there are two). After a step the list must be what a full read of the new
text gives, with every line outside the replaced slice the same object as before; or the update
raises ValueError and leaves the list exactly as it was, which it must do exactly when the list
was changed, the parser's options differ, the text cannot be read, or the description is wrong.

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


def Right(old, new, first, old_count, new_count):
    """Whether the edit describes the change: outside the lines it names, the docs agree."""
    return (first + old_count <= len(old) and first + new_count <= len(new) and
            old[:first] == new[:first] and old[first + old_count:] == new[first + new_count:])


def Told(arguments, how):
    """The description of the edit that the host tells: the true one for a byte below 0x80,
    else a wider one, one with a line or a count off, or none."""
    if how < 0x80:
        return arguments
    first, old_count, new_count = arguments
    k, before = 1 + how % 3, min(first, 1 + how % 3)
    return [(first - before, old_count + before + k, new_count + before + k),
            (first + k, old_count, new_count), (first - before, old_count, new_count),
            (first, old_count + 1, new_count), (first, old_count, new_count + 1),
            (first, max(old_count - 1, 0), new_count), (first, old_count, max(new_count - 1, 0)),
            (first, old_count + 1, new_count + 1), ()][how % 9]


def Edit(doc, program, at):
    """The doc after the edit of program[at:at + 3], and the edit's arguments. With a byte
    from 0xE0 on at program[at + 4], the doc is edited twice and only the first is told."""
    pool = doc or [b"x\n"]
    first = program[at] % (len(doc) + 1)
    old_count = Count(program[at + 1]) % (len(doc) - first + 1)
    count = Count(program[at + 2]) if len(doc) < 600 else program[at + 2] % 4
    new = [pool[(program[at + 2] + k) % len(pool)] for k in range(count)]
    if program[at + 4] >= 0xE0 and len(doc) > first + old_count:  # and the last line is lost
        doc = doc[:-1]
    edited = doc[:first] + new + doc[first + old_count:]
    edited = [line if line.endswith(b"\n") or i == len(edited) - 1 else line + b"\n"
              for i, line in enumerate(edited)]
    # A line whose line break came is part of the edit too.
    if 0 < first == len(doc) and doc[-1] != edited[first - 1]:
        first, old_count = first - 1, old_count + 1
    return edited, (first, old_count, len(edited) - len(doc) + old_count)


def Step(parser, lines, doc, program, at):
    """Changes the list as program[at + 3] says, then makes and checks the edit of program[at:],
    told as program[at + 4] says. Returns the new doc, the list to go on with, and the parser
    whose options its record holds."""
    kept = True
    pick = program[at + 3] % (2 * len(CHANGES))
    if lines and pick < len(CHANGES):
        kept = CHANGES[pick](parser, lines, doc, program[at] % len(lines))
    edited, arguments = Edit(doc, program, at)
    told = Told(arguments, program[at + 4])
    updater = parser
    if 0xC0 <= program[at + 4] < 0xE0:  # a parser with one option or more the other way
        flipped = parser.options ^ (1 + program[at + 4] % 15)
        updater = Parser(flipped, None if program[at + 4] % 2 else (3, 12))
    before = [(x, x.fFirstLine, x.fLineCount) for x in lines]
    full = Read(updater, edited)
    try:
        index, removed, added = updater.UpdateLogicalLineList(lines, b"".join(edited), *told)
    except ValueError:
        assert [(x, x.fFirstLine, x.fLineCount) for x in lines] == before
        assert (full is None or not kept or not (told == () or Right(doc, edited, *told)) or
                (lines and updater.key != parser.key)), "a right update was refused"
        return edited, Read(parser, edited), parser
    assert full is not None, "an update of a text that cannot be read"
    # An empty list proves nothing of the text it came from: it is read in full, whatever the
    # description and the options.
    assert not before or told == () or Right(doc, edited, *told), "a wrong description taken"
    assert not before or updater.key == parser.key, "a list was updated with other options"
    assert View(lines) == View(full)
    kept_lines = [x for x, _, _ in before]
    kept_lines = kept_lines[:index] + kept_lines[index + removed:]
    assert all(a is b for a, b in zip(lines[:index] + lines[index + len(added):], kept_lines))
    return edited, lines, updater


class Parser:
    """A parser and the options it was made with, which tell whether two read alike."""

    def __init__(self, options, version=None):
        self.options = options & 15
        self.key = (self.options, version)
        self.parser = logicalline.CreateLogicalLineParser(
            *(options >> bit & 1 for bit in range(4)), feature_version=version)
        self.GetLogicalLineListFromBuffer = self.parser.GetLogicalLineListFromBuffer
        self.UpdateLogicalLineList = self.parser.UpdateLogicalLineList


def TestOneInput(data):
    if len(data) < 2:
        return
    parser = Parser(data[0])
    text, _, program = data[1:].partition(SEPARATOR)
    doc = Lines(text[:TEXT_LIMIT])  # physical lines as a BytesIO cuts them: at line feeds only
    lines = Read(parser, doc)
    if lines is None:
        return
    for at in range(0, min(len(program), 5 * STEPS) - 4, 5):
        doc, lines, parser = Step(parser, lines, doc, program, at)
        if lines is None:
            return


def main():
    atheris.Setup(sys.argv, TestOneInput)
    atheris.Fuzz()


if __name__ == "__main__":
    main()
