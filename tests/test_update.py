"""UpdateLogicalLineList: after any sequence of edits the list is what a full read of the text
gives, and every line outside the replaced slice is the same object, annotations and all; or
the update is refused and the list stays as it was, which happens exactly when the host's
description of the edit is wrong or the list is not as the module left it."""
import contextlib
import gc
import io
import os
import random

import pytest
from hypothesis import given, settings, strategies as st

import logicalline
from test_model_agreement import STDLIB

PARSER = logicalline.CreateLogicalLineParser()
# Lines that open and close strings and brackets, join, hand back, and a byte-order mark.
PIECES = [b"x = 1\n", b"def f(a,\n", b"  b):\n", b"    return a\n", b"'''\n", b"s = '''doc\n",
          b")\n", b"]\n", b"\n", b"   \n", b"# c\n", b"y = (1 \\\n", b"if x:\n", b"else: y\n",
          b"@d\n", b"class C:\n", b"z = [i for i in y\n", b"    if i]\n", b"\xef\xbb\xbfq\n",
          b"t = 'open\n", b"u = 'a\\\n", b"\tpass\n"]


def view(lines):
    return [(x.fType, x.fFirstLine, x.fLineCount, x.fIndentLevel, x.fTabsInIndent,
             x.fSpacesInIndent, x.fIncomplete, x.fLocalScopeName, x.fTokens, x.fLineText)
            for x in lines]


def edited(doc, first, old_count, new, open_end=False):
    """Replaces doc[first:first + old_count] by `new`; the last line loses its line break when
    open_end is set. Returns the new doc and the edit as UpdateLogicalLineList takes it."""
    raw = doc[:first] + new + doc[first + old_count:]
    text = [line.rstrip(b"\n") + b"\n" for line in raw]
    if raw and (open_end or not raw[-1].endswith(b"\n")):  # only the last line may lack it
        text[-1:] = [text[-1][:-1]] if text[-1] != b"\n" else []
    # A line whose line break came or went is edited too: widen the range to every change.
    first = min(first, next((i for i, (a, b) in enumerate(zip(doc, text)) if a != b),
                            min(len(doc), len(text))))
    tail = min(len(doc) - first, len(text) - first, next(
        (i for i, (a, b) in enumerate(zip(doc[::-1], text[::-1])) if a != b), len(text)))
    end = max(first + old_count, len(doc) - tail)
    return text, (first, end - first, end - first + len(text) - len(doc))


def right(old, new, first, old_count, new_count):
    """Whether the edit describes the change: outside the lines it names, the texts are the same
    lines, cut as BytesIO.readline cuts them."""
    a, b = io.BytesIO(old).readlines(), io.BytesIO(new).readlines()
    return (first + old_count <= len(a) and first + new_count <= len(b) and a[:first] == b[:first]
            and a[first + old_count:] == b[first + new_count:])


def edit(doc, lines, first, old_count, new, open_end=False, told=True):
    """Edits doc as `edited` does and updates `lines` to match, telling the edit or leaving the
    module to find it. Checks the contract; returns the new doc."""
    text, arguments = edited(doc, first, old_count, new, open_end)
    for line in (before := list(lines)):
        line.SetScopeName(line)  # an annotation that must stay with the object
    index, removed, added = PARSER.UpdateLogicalLineList(lines, b"".join(text),
                                                         *arguments[:3 * told])
    assert view(lines) == view(PARSER.GetLogicalLineListFromBuffer(b"".join(text)))
    assert lines[index:index + len(added)] == added and len(lines) == len(before) - removed + len(added)
    kept = before[:index] + before[index + removed:]
    assert all(a is b and a.fScopeName is a for a, b in zip(lines[:index] + lines[index + len(added):], kept))
    return text


@settings(max_examples=150, deadline=None)
@given(st.lists(st.sampled_from(PIECES), max_size=12),
       st.lists(st.tuples(st.floats(0, 1), st.integers(0, 3),
                          st.lists(st.sampled_from(PIECES), max_size=3), st.booleans()),
                max_size=8))
def test_random_edits(doc, edits):
    lines = PARSER.GetLogicalLineListFromBuffer(b"".join(doc))
    for step, (where, old_count, new, open_end) in enumerate(edits):
        first = int(where * len(doc))
        doc = edit(doc, lines, first, min(old_count, len(doc) - first), new, open_end, step % 2)
    doc = edit(doc, lines, 0, len(doc), [])  # the whole text deleted, then written again
    edit(doc, lines, 0, 0, PIECES)


def numbers(lines):
    return [(line, line.fFirstLine, line.fLineCount) for line in lines]


# What a host may do to a list between two updates, with whether the list then still holds
# what the last update left in it. Each takes the list, the doc it was read from and an index.
def swap(lines, doc, i):
    lines[i:i + 2] = lines[i:i + 2][::-1]
    return len(lines[i:i + 2]) < 2


def foreign(lines, doc, i):  # the same line of a read of the text with blank lines in front
    lines[i] = PARSER.GetLogicalLineListFromBuffer(b"\n" * 50 + b"".join(doc))[i]
    return False


def copied(lines, doc, i):
    lines[i] = lines[i].Copy()
    return False


def new_range(lines, doc, i):
    lines[i].SetLineRange(lines[i].fFirstLine, lines[i].fLineCount + 1)
    return False


def same_range(lines, doc, i):
    lines[i].SetLineRange(lines[i].fFirstLine, lines[i].fLineCount)
    return True


def put_back(lines, doc, i):
    lines.insert(i, lines.pop(i))
    return True


def deleted(lines, doc, i):
    del lines[i]
    return False


def reversed_(lines, doc, i):
    lines.reverse()
    return len(lines) < 2


def twice(lines, doc, i):
    lines.insert(i, lines[i])
    return False


def copy_updated(lines, doc, i):  # a copy of the list is another list: it is refused
    with pytest.raises(ValueError, match="read it again"):
        PARSER.UpdateLogicalLineList(lines[:], b"".join(doc), 0, 0, 0)
    return True


def released(lines, doc, i):  # a line freed, and another line made where it was
    lines[i] = None
    lines[i] = PARSER.GetLogicalLineListFromBuffer(b"".join(doc))[i]
    return False


CHANGES = [swap, foreign, copied, new_range, same_range, put_back, deleted, reversed_, twice,
           copy_updated, released]


@settings(max_examples=200, deadline=None)
@given(st.lists(st.sampled_from(PIECES), min_size=1, max_size=12),
       st.lists(st.tuples(st.sampled_from(CHANGES), st.floats(0, 1), st.floats(0, 1),
                          st.integers(0, 2), st.lists(st.sampled_from(PIECES), max_size=2)),
                max_size=6))
def test_host_changes_are_refused_or_read_exactly(doc, steps):
    lines = PARSER.GetLogicalLineListFromBuffer(b"".join(doc))
    for change, at, where, old_count, new in steps:
        if lines:
            kept = change(lines, doc, int(at * len(lines)) % len(lines))
        first = int(where * len(doc))
        text, arguments = edited(doc, first, min(old_count, len(doc) - first), new)
        before = numbers(lines)
        try:
            PARSER.UpdateLogicalLineList(lines, b"".join(text), *arguments)
        except ValueError as refusal:
            assert "read it again" in str(refusal) and numbers(lines) == before
            assert lines and not kept, change  # refused only what was changed
            lines = PARSER.GetLogicalLineListFromBuffer(b"".join(text))
        assert view(lines) == view(PARSER.GetLogicalLineListFromBuffer(b"".join(text)))
        doc = text


@pytest.mark.parametrize("name", ["inspect.py", "tokenize.py", "textwrap.py"])
def test_edits_of_real_files(name):
    with open(os.path.join(STDLIB, name), "rb") as f:
        doc = f.readlines()  # cut at line feeds, as the buffer is
    lines, rng = PARSER.GetLogicalLineListFromBuffer(b"".join(doc)), random.Random(name)
    for i in range(40):  # pastes and cuts too, which split and renumber groups of lines
        first = rng.randrange(len(doc) + 1)
        old_count = min(rng.choice((0, 1, 2, 30)), len(doc) - first)
        doc = edit(doc, lines, first, old_count, rng.sample(doc, rng.choice((0, 1, 2, 70))),
                   told=i % 3 != 0)


# How a host gets an edit wrong, each from the true (first, old count, new count) and a number
# from 1 to 3; and how it may widen one, which is still right.
WRONG = {
    "first line later": lambda f, o, n, k: (f + k, o, n),
    "first line earlier": lambda f, o, n, k: (max(f - k, 0), o, n),
    "old count off by one": lambda f, o, n, k: (f, max(o + (1 if k % 2 else -1), 0), n),
    "new count off by one": lambda f, o, n, k: (f, o, max(n + (1 if k % 2 else -1), 0)),
    "insertion told as a replacement": lambda f, o, n, k: (f, o + 1, n),
}
WIDER = lambda f, o, n, k: (max(f - k, 0), o + k + f - max(f - k, 0), n + k + f - max(f - k, 0))
REAL_FILES = ["textwrap.py", "shlex.py", "tokenize.py"]


def outcome(lines, data, arguments):
    """Updates `lines`, or checks that the refusal left them as they were. Returns whether the
    update went through, having checked that the list is then a full read of `data`."""
    before = numbers(lines)
    try:
        PARSER.UpdateLogicalLineList(lines, data, *arguments)
    except ValueError:
        assert numbers(lines) == before
        return False
    assert view(lines) == view(PARSER.GetLogicalLineListFromBuffer(data))
    return True


@settings(max_examples=150, deadline=None)
@given(st.sampled_from(REAL_FILES), st.floats(0, 1), st.integers(0, 3), st.integers(0, 3),
       st.floats(0, 1), st.integers(1, 3), st.sampled_from(sorted(WRONG) + ["two edits as one"]))
def test_a_description_is_refused_exactly_when_it_is_wrong(name, where, old_count, count, other,
                                                           k, kind):
    with open(os.path.join(STDLIB, name), "rb") as f:
        doc = f.readlines()
    first = int(where * len(doc))
    rng = random.Random(first)
    new = rng.sample(doc, count)
    text, true = edited(doc, first, min(old_count, len(doc) - first), new)
    if kind == "two edits as one":  # a second edit elsewhere, left untold
        at = int(other * len(text))
        text, _ = edited(text, at, min(1, len(text) - at), rng.sample(doc, k - 1))
        told = true
    else:
        told = WRONG[kind](*true, k)
    old, data = b"".join(doc), b"".join(text)
    for arguments in (told, WIDER(*true, k), true, ()):
        lines = PARSER.GetLogicalLineListFromBuffer(old)
        assert outcome(lines, data, arguments) == (arguments == () or right(old, data, *arguments))


@pytest.mark.parametrize("options, base", [
    (dict(copy_strings=False), {}), (dict(skip_whitespace_lines=False), {}),
    (dict(remove_comments=False), {}), (dict(include_line_text=False), {}),
    (dict(feature_version=(3, 12)), {}), (dict(feature_version=(3, 14)), {}),
    (dict(feature_version=(3, 15)), dict(feature_version=(3, 14))),  # lazy imports only
])
def test_an_update_reads_with_the_options_of_the_read(options, base):
    text = b"# c\nx = f'{'a'}'  # b\n"
    parser = logicalline.CreateLogicalLineParser(**base)
    for reader, updater in [(logicalline.CreateLogicalLineParser(**options), parser),
                            (parser, logicalline.CreateLogicalLineParser(**options))]:
        lines = reader.GetLogicalLineListFromBuffer(text)
        with pytest.raises(ValueError, match="other options"):
            updater.UpdateLogicalLineList(lines, text, 1, 1, 1)
        same = logicalline.CreateLogicalLineParser(**(options if reader is not parser else base))
        same.UpdateLogicalLineList(lines, text + b"y\n", 2, 0, 1)  # another parser, same options
        assert view(lines) == view(reader.GetLogicalLineListFromBuffer(text + b"y\n"))


def test_text_after_a_last_line_without_a_line_feed_changes_that_line():
    lines = PARSER.GetLogicalLineListFromBuffer(b"x = 1\ny = 2")
    assert not outcome(lines, b"x = 1\ny = 23\nz\n", (2, 0, 2))
    assert outcome(lines, b"x = 1\ny = 23\nz\n", (1, 1, 2))


def test_the_record_keeps_the_text_as_read():
    data = bytearray(b"x = 1\ny = 2\n")
    lines = PARSER.GetLogicalLineList(io.BytesIO(data).readline)  # kept line by line
    data[4:5] = b"3"  # edited in place: the record's copy is still the old text
    assert not outcome(lines, data, (1, 1, 1)) and outcome(lines, data, (0, 1, 1))
    data[:] = b"x = 3\nz = 2\n"
    lines = PARSER.GetLogicalLineListFromBuffer(b"x = 3\ny = 2\n")
    assert not outcome(lines, data, (0, 1, 1)) and outcome(lines, data, (1, 1, 1))
    for cut in ([b"x = 1\ny = 2\n", b"z = 3\n"], [b"x = 1\ny", b" = 2\n", b"z = 3\n"]):
        lines = PARSER.GetLogicalLineList(iter(cut + [b""]).__next__)  # not cut as BytesIO cuts
        for _ in range(2):  # and never trusted later
            with pytest.raises(ValueError, match="read it again"):
                PARSER.UpdateLogicalLineList(lines, b"x = 1\ny = 2\nz = 4\n", 2, 1, 1)


@pytest.mark.parametrize("args, error", [
    ((b"x = 1\ny = 2\n", 3, 0, 0), ValueError),  # past the end of the text
    ((b"x = 1\ny = 2\n", 1, 1, 2), ValueError),  # more new lines than the text has
    ((b"x = 1\n", 0, 0, 0), ValueError),         # a line went that the edit does not name
    ((b"x = 1\ny = 2\nz\x00\n", 2, 0, 1), ValueError), ((b"x = 1\ny = 2\n", -1, 0, 0), ValueError),
    (("x = 1\ny = 2\n", 0, 0, 0), TypeError), ((b"x = 1\ny = 2\n", 0), TypeError),  # half an edit
])
def test_refusals_leave_the_list_alone(args, error):
    before = list(lines := PARSER.GetLogicalLineListFromBuffer(b"x = 1\ny = 2\n"))
    pytest.raises(error, PARSER.UpdateLogicalLineList, lines, *args)
    assert lines == before and [line.fFirstLine for line in lines] == [0, 1]
    pytest.raises(TypeError, PARSER.UpdateLogicalLineList, tuple(lines), b"x = 1\ny = 2\n", 0, 0, 0)


def test_finalizers_run_by_an_update():  # set off by its allocations, or by the lines it drops
    junk, pristine = b"not a line " * 9, bytearray(b"not a line " * 9)
    old = [b"x%d = (1,\n" % (i // 2) if i % 2 == 0 else b"  2)\n" for i in range(60)]
    text = b"".join(old[:20] + [b"y = (1,\n0,\n"] + old[21:])
    for threshold in range(1, 40):
        lines = PARSER.GetLogicalLineListFromBuffer(b"".join(old))
        gc.collect()  # the last round's meddlers go, and the count starts from 0
        meddler = type("M", (), {"__del__": lambda _, x=lines: x.__init__([junk] * 30)})
        lines[10].SetScopeName(meddler())  # released when the update replaces line 10
        (lambda cycle: cycle.append(cycle))([meddler()])  # left for the collector
        gc.set_threshold(threshold)
        with contextlib.suppress(ValueError):  # a collection came first: no lines to update
            PARSER.UpdateLogicalLineList(lines, text, 20, 1, 2)
        gc.set_threshold(700)
        assert all(item == pristine for item in lines)  # and not written through


def test_an_edit_inside_a_line_of_many_physical_lines():
    doc = [b"x = [\n"] + [b"    1,\n"] * 40000 + [b"]\n", b"y = 2\n"]
    lines = PARSER.GetLogicalLineListFromBuffer(b"".join(doc))
    doc = edit(doc, lines, 20000, 1, [b"    2,\n", b"    3,\n"])
    assert [(line.fFirstLine, line.fLineCount) for line in lines] == [(0, 40003), (40003, 1)]


def test_an_empty_list_is_read_in_full():  # it proves nothing of the text it came from
    lines, text = [], b"x = 1\ny = (2,\n 3)\n"
    assert PARSER.UpdateLogicalLineList(lines, text, 1, 1, 1)[:2] == (0, 0)
    assert view(lines) == view(PARSER.GetLogicalLineListFromBuffer(text))
    pytest.raises(ValueError, PARSER.UpdateLogicalLineList, [], text, 2, 0, 2)  # past the text


def test_a_byte_order_mark_counts_only_where_it_opens_the_text():
    doc = [b"\xef\xbb\xbfq = 1\n", b"x = 1\n"]
    lines = PARSER.GetLogicalLineListFromBuffer(b"".join(doc))
    doc = edit(doc, lines, 0, 0, [b"y = 0\n"])  # the marked line is read again, mark and all
    assert lines[1].fTokens[0][0].startswith("<errortoken>")
    edit(doc, lines, 0, 1, [])  # and opens the text again
    assert lines[0].fTokens[0] == ("q", (0, 0))
