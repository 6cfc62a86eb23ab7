"""Hostile input: huge, malformed and misbehaving sources, readline callables and create hooks.
Every case expects its documented result, and the module must still work afterwards."""

import copy
import io
import pickle
import subprocess
import sys

import pytest

import logicalline


def read(chunks, *limits, **options):
    """Parses readline results given as a list; bytes are cut after each line feed."""
    if isinstance(chunks, bytes):
        chunks = io.BytesIO(chunks).readlines()
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(iter(list(chunks) + [b""]).__next__, *limits)


def texts(line):
    return [text for text, _ in line.fTokens]


@pytest.fixture(autouse=True)
def module_still_works():
    yield
    (line,) = read(b"x = (1,\n  2)\n")
    assert line.fType is logicalline.kAssignment and line.fTokenCount == 7


@pytest.mark.parametrize("physical, copyable", [(40000, False), (70000, True)])
def test_huge_lines_keep_positions_and_counts_in_16_bits(physical, copyable):
    (wide,) = read(b"a = " + b"b" * 100000 + b" + c\n")
    assert wide.fTokens[2:] == (("b" * 100000, (0, 4)), ("+", (0, 100005 % 65536)),
                                ("c", (0, 100007 % 65536)))
    (tall,) = read([b"x = (\n"] + [b"1,\n"] * (physical - 2) + [b")\n"])
    assert tall.fLineCount == physical - 65536 and tall.fTokenCount == 2 * physical
    assert tall.fTokens[-1] == (")", ((physical - 1) % 65536, 0))
    if copyable:
        assert tall.Copy().fTokens == tall.fTokens
    else:  # 40000 reads back negative: no copy can be built with it
        pytest.raises(SystemError, tall.Copy)


def test_a_million_tokens_and_100000_nested_brackets():
    (many,) = read([b"x = [" + b"1," * 499999 + b"1]\n"])
    assert many.fTokenCount == 1000003 and many.fTokens[-1] == ("]", (0, 1000004 % 65536))
    (deep,) = read(b"x = " + b"(" * 100000 + b")" * 100000 + b"\n")
    assert deep.fTokenCount == 200002 and deep.fType is logicalline.kAssignment
    unclosed, after = read([b"(" * 100000 + b"\n", b"y\n", b"def g(): pass\n"])
    assert (unclosed.fLineCount, unclosed.fIncomplete, after.fType) == (2, True, logicalline.kFunctionDef)


def test_every_byte_value():
    for byte in (bytes([b]) for b in range(1, 256)):
        for source in (byte + b"\n", b"x" + byte + b"y = '" + byte + b"'\n", b"#" + byte):
            for line in read(source, remove_comments=False, skip_whitespace_lines=False):
                for i in range(line.fTokenCount):
                    line.GetTokenType(i, 1), line.GetTokenString(i, 1)
    assert read([bytes(range(1, 256))])  # a quote early on opens a string to the end
    with pytest.raises(ValueError, match="Binary data encountered at lineno 3 while tokenizing"):
        read(b"a\nb\nc\nd\x00\n")


@pytest.mark.parametrize("source, tokens", [
    (b"caf\xe9 = 1\n", ["caf", "<errortoken> \ufffd", "=", "1"]),  # still an assignment
    (b"f(\x80)\n", ["f", "(", "<errortoken> \ufffd", ")"]),          # the ")" is kept
    (b"x = \xff\n", ["x", "=", "<errortoken> \ufffd"]),              # so is the line feed
    (b"s = '\xff\xfe' # \xc3\n", ["s", "=", "'\ufffd\ufffd'", "# \ufffd\n"]),
])
def test_invalid_utf8_stays_in_its_line(source, tokens):
    line, following = read(source + b"y\n", remove_comments=False)
    assert texts(line) == tokens and line.fLineCount == 1 and texts(following) == ["y"]
    assert (line.fType is logicalline.kAssignment) == (b"=" in source)
    pytest.raises(UnicodeDecodeError, getattr, line, "fLineText")


@pytest.mark.parametrize("chunks, counts, first_tokens", [
    ([b"x = (1,\r", b"2)\r", b"y = 3\r"], [2, 1], ["x", "=", "(", "1", ",", "2", ")"]),
    ([b"a = [\r\n", b"1]\r", b"b\n"], [2, 1], ["a", "=", "[", "1", "]"]),
    ([b"x = 1\ry = 2\r"], [1], ["x", "=", "1", "y", "=", "2"]),  # one readline result
    ([b"x = (1,", b"2)", b"y"], [2, 1], ["x", "=", "(", "1", ",", "2", ")"]),  # no terminators
    ([b"s = 'ab", b"cd'\n"], [2], ["s", "=", "'abcd'"]),  # an unterminated last line runs on
    ([b"s = '''a\r", b"b'''\n"], [2], ["s", "=", "'''a\rb'''"]),
    ([b"   ", b"x\n"], [1], ["x"]),  # leading blanks without a break do not join the next line
])
def test_line_breaks(chunks, counts, first_tokens):
    lines = read(chunks)
    assert [line.fLineCount for line in lines] == counts and texts(lines[0]) == first_tokens


def test_positions_come_from_the_physical_lines_as_read():
    assert read([b"x = 'ab\rc\n"])[0].fTokens[2] == ("<errortoken> 'ab\rc", (0, 4))
    assert read([b"x = 1; s = '''a\n", b"b'''\n"])[0].fTokens[-1][1] == (0, 11)


@pytest.mark.parametrize("third, error", [
    ("x\n", TypeError), (5, TypeError), (None, TypeError), (bytearray(b"x\n"), TypeError),
    (KeyError("readline"), KeyError), (type("Line", (bytes,), {})(b"y\n"), None),
])
def test_readline_misbehaving_on_its_third_call(third, error):
    results = [b"a = (1,\n", b"2)\n", third, b"b\n", b""]

    def readline():
        if isinstance(results[0], Exception):
            raise results[0]
        return results.pop(0)
    parser = logicalline.CreateLogicalLineParser()
    if error is None:
        assert [texts(line) for line in parser.GetLogicalLineList(readline)][1:] == [["y"], ["b"]]
    else:
        with pytest.raises(error) as caught:
            parser.GetLogicalLineList(readline)
        assert caught.value is third or error is TypeError


def test_readline_that_parses_while_being_read():
    parser = logicalline.CreateLogicalLineParser()
    source, nested = [b"x = (1,\n", b"2)\n", b"y\n"], []

    def readline():
        nested.append(texts(read(b"def f(): pass\n")[0]))
        return source.pop(0) if source else b""
    assert [line.fLineCount for line in parser.GetLogicalLineList(readline)] == [2, 1]
    assert nested == [["def", "f", "(", ")", ":", "pass"]] * 4

    def recursing():
        return parser.GetLogicalLineList(recursing)
    pytest.raises(RecursionError, recursing)


@pytest.mark.parametrize("first_line, line_count, first_lines", [
    (2**31 - 3, 3, [2**31 - 3, 2**31 - 2]),  # the stop line, 2**31, does not wrap around
    (2**31 - 1, 1, [2**31 - 1]),
    (2**31 - 3, -1, OverflowError),
    (2**31 - 2, 2**31 - 1, OverflowError),
])
def test_line_numbers_near_the_32_bit_limit(first_line, line_count, first_lines):
    chunks = [b"x\n", b"y = (\n", b")\n", b"z\n"]
    if first_lines is OverflowError:
        with pytest.raises(OverflowError, match="Line number does not fit in 32 bits"):
            read(chunks, first_line, line_count)
    else:
        assert [line.fFirstLine for line in read(chunks, first_line, line_count)] == first_lines


def test_indentation_past_2_gib_columns_keeps_its_low_16_bits():
    tabs = 2**28 + 5  # 8 columns each
    (line,) = read([b"\t" * tabs + b"x\n"])
    assert texts(line) == ["x"] and line.fIndentLevel == (8 * tabs) % 65536


@pytest.mark.parametrize("make", [
    lambda line, parser: object.__new__(type(line)), lambda line, parser: type(parser)(),
    lambda line, parser: copy.copy(line), lambda line, parser: pickle.dumps(parser),
])
def test_no_way_to_an_uninitialised_object(make):
    with pytest.raises(TypeError):
        make(read(b"x\n")[0], logicalline.CreateLogicalLineParser())


HOOKS = r"""
import io, logicalline
def read(source, first_line=0):
    return logicalline.CreateLogicalLineParser().GetLogicalLineList(
        io.BytesIO(source).readline, first_line)
def outcome(source):
    try:
        return read(source)
    except Exception as e:
        return type(e).__name__
def raising(*parts):
    raise KeyError("hook")
def nesting(*parts):
    return read(parts[8].encode(), parts[1] + 1) if parts[1] < 2 else parts[1]
def replacing(*parts):
    logicalline.SetLogicalCreateFunction(lambda *parts: "second")  # drops the running hook
    return "first"
odd = [None, 7, (), type, b"\xff"]
for hook, source in ((raising, b"x\n"), (lambda *parts: odd.pop(0), b"a\nb\nc\nd\ne\n"),
                     (nesting, b"a\nb\nc\n"), (replacing, b"a\nb\n"), (None, b"\n  \n"),
                     (None, b"x\n")):
    logicalline.SetLogicalCreateFunction(hook)
    del hook
    print(outcome(source))
"""


def test_create_hooks_that_misbehave():
    done = subprocess.run([sys.executable, "-c", HOOKS], capture_output=True, text=True,
                          timeout=120)
    assert done.stdout.splitlines() == [
        "KeyError", r"[7, (), <class 'type'>, b'\xff']", "[[[2]], [2], 2]", "['first', 'second']",
        "[]", "TypeError"], done.stderr


def test_logical_line_over_2_gib_is_refused(request):
    if not request.config.getoption("--huge"):
        pytest.skip("needs --huge: about 3 GB of memory")
    chunk = b"a" * 2**30
    with pytest.raises(ValueError, match="Logical line too long"):
        read([b"s = '''\n", chunk, chunk, b"'''\n"])
