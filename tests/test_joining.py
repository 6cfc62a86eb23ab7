"""Reading source into logical lines: token cutting, joining, hand-back, positions, indentation."""
import io

import pytest

import logicalline
from model import OPTIONS
from test_model_agreement import assert_agreement


def read(source, **options):
    """The logical lines of `source`: bytes, or the chunks that readline hands out in turn."""
    options = {"skip_whitespace_lines": False, "remove_comments": False, **options}
    chunks = list(io.BytesIO(source)) if isinstance(source, bytes) else source
    assert_agreement(chunks, [options.get(name, True) for name in OPTIONS])  # the model reads alike
    pieces = iter(chunks)
    return logicalline.CreateLogicalLineParser(**options).GetLogicalLineList(
        lambda: next(pieces, b""))


@pytest.mark.parametrize("source, tokens", [
    (b"a<>b x->y a:=1\n", ["a", "!=", "b", "x", "->", "y", "a", ":=", "1"]),
    (b"a @= b ...\n", ["a", "@", "=", "b", "..."]),              # no "@=" operator
    (b"0x1F 1e-5 1_000 0x_FF 1.2.3 5j 10L 0x1e+5\n",
     ["0x1F", "1e-5", "1_000", "0x_FF", "1.2.3", "5j", "10L", "0x1e+5"]),
    (b"1__0 1if .5 x.y\n", ["1", "__0", "1", "if", ".5", "x", ".", "y"]),
    (b"rb'x' bu'x' Rb'' fR'y'\n", ["rb'x'", "bu", "'x'", "Rb''", "fR'y'"]),
    ("été x² a\U0001F600\n".encode(), ["été", "x²", "a", "<errortoken> \U0001F600"]),
    (b"\x0c\x0bx $ ? !\n", ["x", "<errortoken> $", "<errortoken> ?", "<errortoken> !"]),
    (b"a \xe2\x82 b\n", ["a", "<errortoken> \ufffd", "b"]),
    (b'"""""""\n', ['""""""', '<errortoken> "']),
    (b"'a\\'b' '\\\\' \"\"\n", ["'a\\'b'", "'\\\\'", '""']),      # escaped and escaping backslashes
    (b"x = '''a\\'''\n'''\n", ["x", "=", "'''a\\'''\n'''"]),     # an escaped quote closes nothing
    (b"'abc\\\ndef'\n", ["'abc\\\ndef'"]),                       # backslash-newline inside a string
    (b"s = 'x\\\ny\n", ["s", "=", "<errortoken> 'x\\\ny"]),
    (b"x = 1 + '''abc\ndef\n", ["x", "=", "1", "+", "<errortoken> '''abc\ndef\n"]),
    (b"x = 1 + \\\n  2\n", ["x", "=", "1", "+", "\\", "2"]),
    (b"x\r\ny\rz\n", ["x", "y", "z"]),                          # lone CR ends no physical line
])
def test_tokens_are_cut_and_listed(source, tokens):
    assert [text for line in read(source) for text, _ in line.fTokens] == tokens


@pytest.mark.parametrize("source", [
    b"x = (1,\n     2)\n", b"y = 1 \\\n  + 2\n", b"s = '''a\n  z'''\n",
    b"x = ((((((((((1\n))))))))))\n", b"f(a,\nprint, with, Def, if_)\n",  # no statement words
    b"x = [a\nfor a in b]\n", b"x = (a if b\nelse c)\n", b"x = (a\nif b else c)\n",
    b"x = [a for a in b\nif a]\n",
    b"x = (" + b"1," * 23 + b"1\nelse)\n",  # 50 tokens before the "else"
    b"x = (" + b"1," * 22 + b"\nif a)\n",   # 50 tokens with the "if" line
    b"x = 1 \\\nfor\n", b"x = a \\\nif b\n", b"x = a \\\nelse\n", b"x = \\\nimport y\n",
])
def test_two_physical_lines_join(source):
    assert [(ln.fLineCount, ln.fIncomplete) for ln in read(source)] == [(2, 0)]


# A physical line that starts a statement is handed back: it begins the next logical line.
@pytest.mark.parametrize("source", [
    b"f(a,\ndef g(): pass\n", b"x = (1,\n@dec\n", b"f(a,\nexec)\n", b"x = (a,\nelse c)\n",
    b"x = (a,\nif b)\n",
    b"x = 1 + \\\n@dec\n",                     # "@" even after a backslash
    b"(a, \\\nreturn)\n",                      # inside brackets a backslash won't keep it
    b"x = (" + b"1," * 23 + b"\nelse)\n",      # 49 tokens before the "else"
    b"x = (" + b"1," * 21 + b"1\nif a)\n",     # 49 tokens with the "if" line
])
def test_statement_start_is_handed_back(source):
    assert [(ln.fFirstLine, ln.fLineCount, ln.fIncomplete) for ln in read(source)] == [
        (0, 1, 1), (1, 1, 0)]


@pytest.mark.parametrize("source, lines", [
    (b"x = (1,\n\n# c\n 2)\ny = 2\n", [(0, 4, 0), (4, 1, 0)]),
    (b"a = ')'\nb = '('\n", [(0, 1, 0), (1, 1, 0)]),
    (b"f(a", [(0, 1, 1)]),                                     # input ends inside brackets
    (b"x = 1 + '''abc\ndef\n", [(0, 2, 1)]),                   # input ends inside a string
    (b"x = 1 \\\n", [(0, 1, 1)]),
    (b")\nx = 1\n", [(0, 1, 0), (1, 1, 0)]),                   # negative depth is not open
    (b"f(a,\ndef g(b,\n c): pass\n", [(0, 1, 1), (1, 2, 0)]),
    (b"x = (1,\nreturn '''a\nb'''\n", [(0, 1, 1), (1, 2, 0)]),
    (b"a = (1,\ndef f(): '''x\ny'''\n", [(0, 1, 1), (1, 2, 0)]),  # the next line's string
    (b"x = (a,\nif b,\n c)\n", [(0, 3, 0)]),                   # still open after the "if" line
    (b"x = (1,\nif a) \\\n+ 2\n", [(0, 3, 0)]),                # "if" line ends in a backslash
])
def test_logical_line_ranges(source, lines):
    assert [(ln.fFirstLine, ln.fLineCount, ln.fIncomplete) for ln in read(source)] == lines


def test_handed_back_line_is_not_in_the_line_text():
    lines = read(b"x = (1,\n  return 2\n")
    assert [ln.fLineText for ln in lines] == ["x = (1,\n", "  return 2\n"]
    assert lines[1].fIndentLevel == 2 and lines[1].fSpacesInIndent


@pytest.mark.parametrize("chunks, lines", [
    ([b"  ", b"x = (1,\n", b"2)\n"], [(1, 2)]),
    ([b"\n", b"   \n", b"x\n", b"   "], [(2, 1)]),
    ([], []),
])
def test_blank_lines_give_nothing(chunks, lines):
    assert [(ln.fFirstLine, ln.fLineCount) for ln in read(chunks)] == lines


@pytest.mark.parametrize("chunks, positions", [
    ([b"x = (1,\n", b"     2)\n"], [(0, 0), (0, 2), (0, 4), (0, 5), (0, 6), (1, 5), (1, 6)]),
    ([b"    '''a\n", b"\n", b"b''' + c\n"], [(0, 4), (2, 5), (2, 7)]),
    ([b"x = '''a\rb\n", b"c'''\n"], [(0, 0), (0, 2), (0, 4)]),      # lone CR inside the string
    ([b"a\rx = '''q\n", b"'''\n"], [(0, 0), (0, 2), (0, 4), (0, 6)]),
    ([b"a\rs = 'q\\\n", b"z\n"], [(0, 0), (0, 2), (0, 4), (0, 6)]),  # error token from line 0
    ([b"x = 1 + '''abc\n", b"def\n"], [(0, 0), (0, 2), (0, 4), (0, 6), (0, 8)]),
    ([b"x = (1,\r\n", b" 2)\r\n"], [(0, 0), (0, 2), (0, 4), (0, 5), (0, 6), (1, 1), (1, 2)]),
])
def test_tokens_are_placed_on_the_physical_line_where_they_begin(chunks, positions):
    (line,) = read(chunks)
    assert [position for _, position in line.fTokens] == positions


def test_placeholder_string_stands_where_the_string_begins():
    (line,) = read(b"    '''a\n\nb'''\n", copy_strings=False)
    assert line.fTokens == (("'<string>'", (0, 4)),)


@pytest.mark.parametrize("source, indent, tabs, spaces", [
    (b"x\n", 0, False, False), (b"\t  x\n", 10, True, True),
    (b" \tx\n", 8, True, True), (b"\t\tx\n", 16, True, False),
    (b"\x0cx\n", 0, False, False),                  # a form feed counts nothing
    (b"   # c\n", 3, False, True),                  # comments measure too
    (b"  f(1,\n\t\t2)\n", 2, False, True),          # only the first physical line counts
])
def test_indentation_of_the_first_physical_line(source, indent, tabs, spaces):
    (line,) = read(source)
    assert (line.fIndentLevel, line.fTabsInIndent, line.fSpacesInIndent) == (indent, tabs, spaces)
