"""Building LogicalLine objects: the create hook, the reading loop and the attributes it leaves."""

import ast
import io
import os
import subprocess
import sys
import textwrap

import pytest

import logicalline

SOURCE = b"def f(a,\n      b):\n\tf(1,\ndef g(): pass\n"


def run_isolated(code):
    """Runs `code` in a fresh interpreter, since a create hook stays for the whole process."""
    env = dict(os.environ)
    env["PYTHONPATH"] = os.pathsep.join(
        [os.path.dirname(logicalline.__file__), env.get("PYTHONPATH", "")])
    prelude = ("import io, logicalline\n"
               "def read(source, *args, **options):\n"
               "    parser = logicalline.CreateLogicalLineParser(**options)\n"
               "    return parser.GetLogicalLineList(io.BytesIO(source).readline, *args)\n"
               "def fails(error, call, *args):\n"
               "    try:\n"
               "        call(*args)\n"
               "    except error:\n"
               "        return True\n")
    done = subprocess.run([sys.executable, "-c", prelude + textwrap.dedent(code)],
                          env=env, capture_output=True, text=True, timeout=60)
    assert done.returncode == 0, done.stderr
    return done.stdout


def read(source, *args, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline, *args)


def test_hook_receives_the_nine_raw_parts():
    out = run_isolated(f"""
        calls = []
        logicalline.SetLogicalCreateFunction(lambda *parts: calls.append(parts) or len(calls))
        result = read({SOURCE!r}, 3)
        exact = all(type(token) is bytes for parts in calls for token in parts[3])
        logicalline.SetLogicalCreateFunction(lambda *parts: [parts[0], parts[8]])
        others = read(b" " * 40000 + b"x\\n", include_line_text=False)
        print(repr((result, calls, exact, others)))
    """)
    result, calls, exact, others = ast.literal_eval(out)
    assert result == [1, 2, 3] and exact
    assert calls == [
        (0, 3, 2, (b"def", b"f", b"(", b"a", b",", b"b", b")", b":"),
         ((0, 0), (0, 4), (0, 5), (0, 6), (0, 7), (1, 6), (1, 7), (1, 8)),
         0, 0, 0, "def f(a,\n      b):\n"),
        (8, 5, 1, (b"f", b"(", b"1", b","), ((0, 1), (0, 2), (0, 3), (0, 4)), 0, 1, 1, "\tf(1,\n"),
        (0, 6, 1, (b"def", b"g", b"(", b")", b":", b"pass"),
         ((0, 0), (0, 4), (0, 5), (0, 6), (0, 7), (0, 9)), 0, 0, 0, "def g(): pass\n"),
    ]
    assert others == [[40000, None]]  # the indent is not cut to 16 bits; no text when off


def test_hook_result_stands_in_for_the_line():
    run_isolated(f"""
        logicalline.SetLogicalCreateFunction(lambda *parts: None)
        assert read({SOURCE!r}) == []
        logicalline.SetLogicalCreateFunction(lambda *parts: 7)
        assert read({SOURCE!r}) == [7, 7, 7]
        marker = object()
        assert logicalline.SetLogicalCreateFunction(lambda *parts: marker) is None
        assert all(item is marker for item in read({SOURCE!r}))
    """)


def test_hook_failures_return_no_list():
    run_isolated(f"""
        calls = []
        def hook(*parts):
            calls.append(parts)
            return parts if len(calls) != 2 else {{}}["refused"]
        logicalline.SetLogicalCreateFunction(hook)
        assert fails(KeyError, read, {SOURCE!r})
        assert fails(UnicodeDecodeError, read, b"x = '\\xff'\\n") and len(calls) == 2
        assert len(read(b"x = '\\xff'\\n", include_line_text=False)) == 1
        for hook in (None, 42):
            logicalline.SetLogicalCreateFunction(hook)
            assert read(b"\\n  \\n") == []  # nothing to construct
            assert fails(TypeError, read, b"x = 1\\n")
    """)


def test_stop_line_completes_the_last_logical_line():
    pieces = [b"a\n", b"b\n", b"c\n", b"d\n", b"f(a,\n", b"b,\n", b"c)\n", b"y = 2\n", b""]
    calls = []

    def readline():
        calls.append(1)
        return pieces[len(calls) - 1]

    lines = logicalline.CreateLogicalLineParser().GetLogicalLineList(readline, 10, 5)
    assert [(ln.fFirstLine, ln.fLineCount) for ln in lines] == [
        (10, 1), (11, 1), (12, 1), (13, 1), (14, 3)]
    assert len(calls) == 7


def test_zero_lines_or_empty_input_read_nothing():
    parser = logicalline.CreateLogicalLineParser()
    assert parser.GetLogicalLineList(lambda: pytest.fail("readline called"), 0, 0) == []
    assert parser.GetLogicalLineList(lambda: b"") == []


def test_readline_may_nest_calls():
    parser = logicalline.CreateLogicalLineParser()
    outer = iter([b"x = (1,\n", b"2)\n", b""])
    inner = []

    def readline():
        inner.extend(parser.GetLogicalLineList(io.BytesIO(b"def g():\n  pass\n").readline))
        return next(outer)

    (line,) = parser.GetLogicalLineList(readline)
    assert line.fLineCount == 2 and len(inner) == 6


@pytest.mark.parametrize("bad, error, message", [
    (type("Bytes", (bytes,), {})(b"x = (2,\n"), None, None),   # a bytes subclass is read
    ("x = 2\n", TypeError, None),
    (bytearray(b"x = 2\n"), TypeError, None),
    (object(), TypeError, None),
    (b"x\x00y\n", ValueError, "Binary data encountered at lineno 6 while tokenizing"),
    (b"\x00", ValueError, "Binary data encountered at lineno 6 while tokenizing"),
    (KeyError("boom"), KeyError, None),
])
def test_failure_mid_input_returns_no_list(bad, error, message):
    def readline():
        piece = pieces.pop(0)
        if isinstance(piece, Exception):
            raise piece
        return piece

    parser = logicalline.CreateLogicalLineParser()
    references = sys.getrefcount(bad)
    for _ in range(100):  # a refused result must still be released
        pieces = [b"a = 1\n", b"b = (1,\n", bad, b"2)\n", b""]
        if error is None:
            assert [ln.fLineCount for ln in parser.GetLogicalLineList(readline)] == [1, 3]
            continue
        with pytest.raises(error) as failure:
            parser.GetLogicalLineList(readline, 4)
        assert message is None or str(failure.value) == message
    del pieces
    assert isinstance(bad, Exception) or sys.getrefcount(bad) == references


@pytest.mark.parametrize("args", [(None,), (b"x = 1\n",), ()])
def test_readline_must_be_callable(args):
    with pytest.raises(TypeError, match=None if not args else "readline arg must be a callable"):
        logicalline.CreateLogicalLineParser().GetLogicalLineList(*args)


def test_tokens_tuple_is_built_once():
    (line,) = read(b"x = f('\xe9t\xc3\xa9', \x80)  # c\n", remove_comments=False)
    tokens = line.fTokens
    assert tokens is line.fTokens
    assert tokens == (("x", (0, 0)), ("=", (0, 2)), ("f", (0, 4)), ("(", (0, 5)),
                      ("'\ufffdté'", (0, 6)), (",", (0, 12)), ("<errortoken> \ufffd", (0, 14)),
                      (")", (0, 15)), ("# c\n", (0, 18)))
    assert line.fTokenCount == len(tokens)


def test_line_text():
    first, second = read(b"x = (1,\n     2)\ny = 'caf\xc3\xa9'\n")
    assert first.fLineText == "x = (1,\n     2)\n" and second.fLineText == "y = 'café'\n"
    assert read(b"x = 1\n", include_line_text=False)[0].fLineText is None
    (bad,) = read(b"x = '\xff'\n")
    with pytest.raises(UnicodeDecodeError):
        bad.fLineText


def test_wide_indent_reads_back_as_16_bits():
    (line,) = read(b" " * 40000 + b"x\n")
    assert line.fIndentLevel == 40000 - 65536 and line.fTokens == (("x", (0, 40000)),)


@pytest.mark.parametrize("name", [n for n in dir(logicalline.LogicalLineType) if n[0] == "f"]
                         + ["fNewAttribute"])
def test_attributes_are_read_only(name):
    (line,) = read(b"x = 1\n")
    with pytest.raises(AttributeError):
        setattr(line, name, 1)


def test_logical_lines_come_only_from_the_module():
    (line,) = read(b"x = 1\n")
    assert type(line) is logicalline.LogicalLineType
    with pytest.raises(TypeError):
        logicalline.LogicalLineType()
    with pytest.raises(TypeError):
        type("Sub", (logicalline.LogicalLineType,), {})
