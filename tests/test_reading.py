"""Reading source into logical lines: token cutting, joining and hand-back, positions,
indentation, line breaks, windows and limits. Every read is checked against the model too."""
import io
import subprocess
import sys

import pytest

import logicalline
from test_model_agreement import read

KEEP = {"skip_whitespace_lines": False, "remove_comments": False}


def texts(line):
    return [text for text, _ in line.fTokens]


@pytest.mark.parametrize("source, tokens", [
    (b"a<>b x->y a:=1\n", ["a", "!=", "b", "x", "->", "y", "a", ":=", "1"]),
    (b"0x1F 1E-5 1_000 0x_FF 1.2.3 5j 10L 0x1e+5\n",
     ["0x1F", "1E-5", "1_000", "0x_FF", "1.2.3", "5j", "10L", "0x1e+5"]),
    ("été x² a\U0001F600\n".encode(), ["été", "x²", "a", "<errortoken> \U0001F600"]),
    (b"'a\\'b' '\\\\'\n", ["'a\\'b'", "'\\\\'"]),                # escaped and escaping backslashes
    (b"'abc\\\ndef'\n", ["'abc\\\ndef'"]),                       # backslash-newline inside a string
    (b"s = 'x\\\ny\n", ["s", "=", "<errortoken> 'x\\\ny"]),
    (b"x = 1 + '''abc\ndef\n", ["x", "=", "1", "+", "<errortoken> '''abc\ndef\n"]),
    (b"x\r\ny\rz\n", ["x", "y", "z"]),                          # a lone CR ends no physical line
])
def test_tokens_are_cut_and_listed(source, tokens):
    assert [text for line in read(source, **KEEP) for text in texts(line)] == tokens


JOINED, HANDED_BACK = [(0, 2, 0)], [(0, 1, 1), (1, 1, 0)]


@pytest.mark.parametrize("source, ranges", [  # (first line, line count, incomplete) per line
    *[(source, JOINED) for source in [
        b"x = (1,\n     2)\n", b"y = 1 \\\n  + 2\n", b"s = '''a\n  z'''\n",
        b"x = (" + b"1," * 23 + b"1\nelse)\n",  # 50 tokens before the "else"
        b"x = (" + b"1," * 22 + b"\nif a)\n",   # 50 tokens with the "if" line
        b"x = a \\\nelse\n", b"x = \\\nimport y\n", b"x = (a if b\nelse c)\n",
        b"x = [a for a in b\nif a]\n"]],
    *[(source, HANDED_BACK) for source in [
        b"f(a,\ndef g(): pass\n", b"x = (1,\n@dec\n", b"f(a,\nexec)\n", b"x = (a,\nif b)\n",
        b"x = 1 + \\\n@dec\n", b"(a, \\\nreturn)\n", b"x = (a,\nelse c)\n",
        b"x = (" + b"1," * 23 + b"\nelse)\n",      # 49 tokens before the "else"
        b"x = (" + b"1," * 21 + b"1\nif a)\n"]],   # 49 tokens with the "if" line
    (b"x = (1,\n\n# c\n 2)\ny = 2\n", [(0, 4, 0), (4, 1, 0)]),
    (b"f(a", [(0, 1, 1)]), (b"x = 1 + '''abc\ndef\n", [(0, 2, 1)]),  # input ends inside
    (b"a = (1,\ndef f(): '''x\ny'''\n", [(0, 1, 1), (1, 2, 0)]),  # the next line's string
    (b"x = (1,\nif a) \\\n+ 2\n", [(0, 3, 0)]),                # "if" line ends in a backslash
    ([b"  ", b"x = (1,\n", b"2)\n"], [(1, 2, 0)]),              # blanks alone give nothing
    ([b"s = 'ab", b"cd'\n"], JOINED),                          # an unterminated chunk runs on
])
def test_logical_line_ranges(source, ranges):
    assert [(ln.fFirstLine, ln.fLineCount, ln.fIncomplete) for ln in read(source, **KEEP)] == ranges


@pytest.mark.parametrize("chunks, positions", [
    ([b"x = (1,\n", b"     2)\n"], [(0, 0), (0, 2), (0, 4), (0, 5), (0, 6), (1, 5), (1, 6)]),
    ([b"    '''a\n", b"\n", b"b''' + c\n"], [(0, 4), (2, 5), (2, 7)]),
    ([b"x = 1 + '''abc\n", b"def\n"], [(0, 0), (0, 2), (0, 4), (0, 6), (0, 8)]),
])
def test_tokens_are_placed_where_they_begin(chunks, positions):
    for copy_strings in (True, False):
        (line,) = read(chunks, copy_strings=copy_strings)
        assert [position for _, position in line.fTokens] == positions


def test_positions_past_the_shared_ones():  # the first 16 lines and 256 columns share tuples
    source = b"x = (\n" + b"\n" * 14 + b" " * 255 + b"a,\n" + b" " * 256 + b"b)\n"
    assert read(source)[0].fTokens[-4:] == (
        ("a", (15, 255)), (",", (15, 256)), ("b", (16, 256)), (")", (16, 257)))
    source = b"x" + b" " * 255 + b"= (\na)\n"  # column 256 of line 0 would be line 1's column 0
    assert [p for _, p in read(source)[0].fTokens] == [(0, 0), (0, 256), (0, 258), (1, 0), (1, 1)]


def test_shared_texts_turn_over_without_mixing():
    # Far more names than the process keeps, read in two rounds: the first round's token objects
    # are released and their memory taken again, and every entry still shows its own text.
    parser = logicalline.CreateLogicalLineParser()
    for prefix in ("a", "b"):
        names = [f"{prefix}{i}" for i in range(20000)]
        lines = parser.GetLogicalLineListFromBuffer("".join(f"{n} = {n}\n" for n in names).encode())
        assert [line.fTokens for line in lines] == [
            ((n, (0, 0)), ("=", (0, len(n) + 1)), (n, (0, len(n) + 3))) for n in names]
        del lines  # before the next round reads, so that its tokens may take this one's places


@pytest.mark.parametrize("source, indent, tabs, spaces", [
    (b"\t  x\n", 10, True, True), (b" \tx\n", 8, True, True),  # tabs move to the next stop
    (b"\x0cx\n", 0, False, False),                  # a form feed counts nothing
    (b"  f(1,\n\t\t2)\n", 2, False, True),          # only the first physical line counts
    (b"x = (1,\n  return 2\n", 2, False, True),     # a handed-back line is measured afresh
])
def test_indentation_of_the_first_physical_line(source, indent, tabs, spaces):
    line = read(source, **KEEP)[-1]
    assert (line.fIndentLevel, line.fTabsInIndent, line.fSpacesInIndent) == (indent, tabs, spaces)


# Sizes just past each limit that 16 bits would have set, with the value every field must hold:
# (indent, line count, position of the last token). Too big for the model, which copies text
# per line.
@pytest.mark.parametrize("source, indent, line_count, last", [
    ([b" " * 40000 + b"x = (\n", b"1)\n"], 40000, 2, (")", (1, 1))),           # indentation
    ([b"\t" * 8200 + b"x\n"], 65600, 1, ("x", (0, 8200))),                   # tabs, 8 columns
    ([b"x = 1" + b" " * 70000 + b"+ 2\n"], 0, 1, ("2", (0, 70007))),          # column
    ([b"x = [\n"] + [b"    1,\n"] * 32766 + [b"]\n"], 0, 32768, ("]", (32767, 0))),  # line count
    ([b"x = [\n"] + [b"    1,\n"] * 70000 + [b"]\n"], 0, 70002, ("]", (70001, 0))),  # line index
    ([b"s = '''\n"] + [b"\n"] * 70000 + [b"''' + a\n"], 0, 70002, ("a", (70001, 6))),
    ([b"y = 1 + \\\n"] * 66000 + [b"  2\n"], 0, 66001, ("2", (66000, 2))),  # trailing backslashes
])
def test_sizes_hold_their_true_values(source, indent, line_count, last):
    parser = logicalline.CreateLogicalLineParser()
    data = b"".join(source) + b"z = 0\n"
    lines = parser.GetLogicalLineListFromBuffer(data)
    assert [line.fTokens for line in lines] == [  # the two paths agree on huge lines too
        line.fTokens for line in parser.GetLogicalLineList(io.BytesIO(data).readline)]
    (big, after) = lines
    assert (big.fIndentLevel, big.fLineCount, big.fTokens[-1]) == (indent, line_count, last)
    assert (after.fFirstLine, after.fLineCount) == (line_count, 1)  # no line is read twice
    copied = big.Copy()
    assert (copied.fIndentLevel, copied.fLineCount, copied.fTokens) == (
        indent, line_count, big.fTokens)
    hooked = subprocess.run([sys.executable, "-c", HOOK_SIZES], input=data, capture_output=True)
    assert hooked.stdout.split() == [str(indent).encode(), str(line_count).encode(),
                                     str(last[1]).replace(" ", "").encode()], hooked.stderr


HOOK_SIZES = """
import logicalline, sys
logicalline.SetLogicalCreateFunction(lambda indent, first, count, tokens, positions, *rest:
                                     (indent, count, positions[-1]))
indent, count, position = logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(
    sys.stdin.buffer.read())[0]
print(indent, count, str(position).replace(" ", ""))
"""


def test_deep_brackets_read_as_one_line():
    (deep,) = logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(
        b"x = " + b"(" * 100000 + b")" * 100000 + b"\n")
    assert deep.fTokenCount == 200002 and deep.fType is logicalline.kAssignment


@pytest.mark.parametrize("window, result", [
    ((10, 2), [10, 11]),                      # the line that starts on 11 is still read whole
    ((0, 0), []), ((2**31 - 3, 3), [2**31 - 3, 2**31 - 2]),  # the stop line 2**31 does not wrap
    ((2**31 - 3, -1), "Line number does not fit in 32 bits"), ((-5, -1), "first line must be >= 0"),
    ((1, -2), "line count must be >= 0, or -1 for no limit"),  # only -1 means no limit
    ((0, -2), "line count must be >= 0, or -1 for no limit"),
])
def test_reading_windows(window, result):
    try:
        result_seen = [line.fFirstLine for line in read([b"x\n", b"y = (\n", b")\n", b"z\n"], *window)]
    except (OverflowError, ValueError) as error:
        result_seen = str(error)
    assert result_seen == result
    if window[0] < 0 or window[1] < -1:  # refused before readline is called
        pytest.raises(ValueError, logicalline.CreateLogicalLineParser().GetLogicalLineList,
                      lambda: pytest.fail("readline called"), *window)


@pytest.mark.parametrize("third, error", [
    ("x\n", TypeError), (bytearray(b"x\n"), TypeError), (b"d\x00\n", ValueError),
    (KeyError("readline"), KeyError), (type("Line", (bytes,), {})(b"y\n"), None),
])
def test_readline_misbehaving_on_its_third_call(third, error):
    results, parser = [b"a = (1,\n", b"2)\n", third, b"b\n", b""], logicalline.CreateLogicalLineParser()

    def readline():
        if isinstance(results[0], Exception):
            raise results[0]
        return results.pop(0)
    if error is None:
        assert [texts(line) for line in parser.GetLogicalLineList(readline, 4)][1:] == [["y"], ["b"]]
        return
    with pytest.raises(error, match="lineno 6" if error is ValueError else None) as caught:
        parser.GetLogicalLineList(readline, 4)
    assert caught.value is third or error is not KeyError
    for args in [(None,), (b"x = 1\n",), ()]:
        pytest.raises(TypeError, parser.GetLogicalLineList, *args)
