import io
import os
import subprocess
import sys

import pytest

import logicalline

PRELUDE = r'''
import io, logicalline
SOURCE = b"def f(a,\n      b):\n\tf(1,\ndef g(): pass\n"
def read(source, *args, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline, *args)
def fails(error, *args, **options):
    try:
        read(*args, **options)
    except error:
        return True
'''
# A create hook stays for the life of the process, so each script runs in a fresh interpreter.
HOOK_SCRIPTS = {"raw parts": r'''
plain = read(b"def f(a):\n")[0]
plain.AppendArgName("a")
calls = []
logicalline.SetLogicalCreateFunction(lambda *parts: calls.append(parts) or len(calls))
assert read(b"\tf(1,\n", 5) == [1]
assert calls == [(8, 5, 1, (b"f", b"(", b"1", b","), ((0, 1), (0, 2), (0, 3), (0, 4)),
                  0, 1, 1, "\tf(1,\n")], calls
assert all(type(token) is bytes for token in calls[0][3])
copied = plain.Copy()  # a copy bypasses the hook
assert type(copied) is logicalline.LogicalLineType and copied.fArgNames == ("a",)
assert len(calls) == 1
logicalline.SetLogicalCreateFunction(lambda *parts: [parts[0], parts[8]])
assert read(b" " * 40000 + b"x\n", include_line_text=False) == [[40000, None]]
''', "result stands in": r'''
logicalline.SetLogicalCreateFunction(lambda *parts: None)
assert read(SOURCE) == []
logicalline.SetLogicalCreateFunction(lambda *parts: 7)
assert read(SOURCE) == [7, 7, 7]
marker = object()
assert logicalline.SetLogicalCreateFunction(lambda *parts: marker) is None
assert all(item is marker for item in read(SOURCE))
''', "failures": r'''
calls = []
def hook(*parts):
    calls.append(parts)
    return parts if len(calls) != 2 else {}["refused"]
logicalline.SetLogicalCreateFunction(hook)
assert fails(KeyError, SOURCE)
assert fails(UnicodeDecodeError, b"x = '\xff'\n") and len(calls) == 2
assert len(read(b"x = '\xff'\n", include_line_text=False)) == 1
logicalline.SetLogicalCreateFunction(42)
assert read(b"\n  \n") == []  # nothing to construct
assert fails(TypeError, b"x = 1\n")
'''}


@pytest.mark.parametrize("name", HOOK_SCRIPTS)
def test_create_hook(name):
    env = dict(os.environ, PYTHONPATH=os.pathsep.join(
        [os.path.dirname(logicalline.__file__), os.environ.get("PYTHONPATH", "")]))
    done = subprocess.run([sys.executable, "-c", PRELUDE + HOOK_SCRIPTS[name]], env=env,
                          capture_output=True, text=True, timeout=60)
    assert done.returncode == 0, done.stderr


def read(source, *args, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline, *args)


def test_stop_line_completes_the_last_logical_line():
    pieces = iter([b"a\n", b"b\n", b"c\n", b"d\n", b"f(a,\n", b"b,\n", b"c)\n", b"y = 2\n"])
    lines = logicalline.CreateLogicalLineParser().GetLogicalLineList(lambda: next(pieces), 10, 5)
    assert [(ln.fFirstLine, ln.fLineCount) for ln in lines] == [
        (10, 1), (11, 1), (12, 1), (13, 1), (14, 3)]
    assert next(pieces) == b"y = 2\n"  # never read
    parser = logicalline.CreateLogicalLineParser()
    assert parser.GetLogicalLineList(lambda: pytest.fail("readline called"), 0, 0) == []


@pytest.mark.parametrize("bad", ["x = 2\n", bytearray(b"x = 2\n"), object(), b"x\x00y\n"])
def test_refused_readline_results_are_released(bad):
    parser, references = logicalline.CreateLogicalLineParser(), sys.getrefcount(bad)
    for _ in range(100):
        pieces = iter([b"a = 1\n", b"b = (1,\n", bad, b"2)\n"])
        with pytest.raises(ValueError if isinstance(bad, bytes) else TypeError) as failure:
            parser.GetLogicalLineList(lambda: next(pieces, b""), 4)
        if isinstance(bad, bytes):
            assert str(failure.value) == "Binary data encountered at lineno 6 while tokenizing"
    del pieces
    assert sys.getrefcount(bad) == references


@pytest.mark.parametrize("args", [(None,), (b"x = 1\n",), ()])
def test_readline_must_be_callable(args):
    with pytest.raises(TypeError, match=None if not args else "^readline arg must be a callable$"):
        logicalline.CreateLogicalLineParser().GetLogicalLineList(*args)


def test_tokens_tuple_is_built_once():
    (line,) = read(b"x = (1,\n     2)\n")
    assert line.fTokens is line.fTokens and line.fTokenCount == len(line.fTokens) == 7
    assert line.fTokens[5] == ("2", (1, 5))


def test_wide_indent_reads_back_as_16_bits():
    (line,) = read(b" " * 40000 + b"x\n")
    assert line.fIndentLevel == 40000 - 65536 and line.fTokens == (("x", (0, 40000)),)


def test_lines_are_read_only_and_cannot_be_subclassed():
    (line,) = read(b"x = 1\n")
    for name in [n for n in dir(line) if n[0] == "f"] + ["fNewAttribute"]:
        with pytest.raises(AttributeError):
            setattr(line, name, 1)
    with pytest.raises(TypeError):
        type("Sub", (logicalline.LogicalLineType,), {})
