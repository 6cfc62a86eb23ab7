"""The create hook. It stays for the life of the process, so each script runs in a fresh one."""
import pytest

from test_model_agreement import run_isolated

PRELUDE = r'''
import io, mmap, weakref, logicalline
PARSER = logicalline.CreateLogicalLineParser()
def read(source, *args, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline, *args)
def outcome(call, *args):
    try:
        return call(*args)
    except Exception as e:
        return type(e).__name__
'''
SCRIPTS = {"raw parts and stand-in results": r'''
plain = read(b"def f(a):\n")[0]
plain.AppendArgName("a")
calls = []
logicalline.SetLogicalCreateFunction(lambda *parts: calls.append(parts) or len(calls))
assert read(b"\tf(1,\n", 5) == [1]
assert calls == [(8, 5, 1, (b"f", b"(", b"1", b","), ((0, 1), (0, 2), (0, 3), (0, 4)),
                  0, 1, 1, "\tf(1,\n")], calls
copied = plain.Copy()  # a copy bypasses the hook
assert type(copied) is logicalline.LogicalLineType and copied.fArgNames == ("a",)
logicalline.SetLogicalCreateFunction(lambda *parts: parts[0] if parts[0] else None)
assert read(b" " * 40000 + b"x\ny\n") == [40000]  # None is dropped
''', "failures": r'''
calls = []
def hook(*parts):
    calls.append(parts)
    return parts if len(calls) != 2 else {}["refused"]
logicalline.SetLogicalCreateFunction(hook)
assert outcome(read, b"x\ny\nz\n") == "KeyError"
assert outcome(read, b"x = '\xff'\n") == "UnicodeDecodeError" and len(calls) == 2
assert len(read(b"x = '\xff'\n", include_line_text=False)) == 1
# The lines are the hook's objects now, which no update can know.
assert outcome(PARSER.UpdateLogicalLineList, read(b"x\n"), b"y\n", 0, 1, 1) == "TypeError"
gone = weakref.ref(hook)
logicalline.SetLogicalCreateFunction(42)
del hook
assert gone() is None  # a replaced hook is released
assert read(b"\n  \n") == [] and outcome(read, b"x = 1\n") == "TypeError"
''', "hooks that read, replace themselves or change the buffer being read": r'''
def replacing(*parts):  # drops itself while it runs, then reads with the hook in its place
    logicalline.SetLogicalCreateFunction(lambda *parts: parts[1])
    return read(parts[8].encode(), 7)
logicalline.SetLogicalCreateFunction(replacing)
assert read(b"a\nb\n") == [[7], 1]
data, mapped = bytearray(b"x = 1\ny = (2,\n 3)\n"), mmap.mmap(-1, 8)
mapped.write(b"a\nb\nc\nd\n")
def changing(*parts):
    try:
        change()
        return "changed"
    except BufferError:
        return parts[1]
logicalline.SetLogicalCreateFunction(changing)
change = lambda: data.extend(b"z\n")
assert PARSER.GetLogicalLineListFromBuffer(data) == [0, 1]
change = mapped.close
assert PARSER.GetLogicalLineListFromBuffer(mapped, 7) == [7, 8, 9, 10]
data.extend(b"w\n")  # free again once the call is over
mapped.close()
''', "a hook installed halfway through a read": r'''
source = io.BytesIO(b"x = 1\ny = 2\nz = 3\n")
def readline():
    if source.tell() == 6:  # after the first line: the rest are the hook's
        logicalline.SetLogicalCreateFunction(lambda *parts: parts[1])
    return source.readline()
first, *rest = PARSER.GetLogicalLineList(readline)
assert type(first) is logicalline.LogicalLineType and rest == [1, 2]
assert outcome(PARSER.UpdateLogicalLineList, [first] + rest, b"x\n", 0, 1, 1) == "TypeError"
''', "a hook installed by readline before the first line, returning anything": r'''
other = PARSER.GetLogicalLineListFromBuffer(b"x = 1\ny = (2,\n 3)\n")
results = iter(["host object", other[0], other[1], other[1], None, other[0]])
source = iter([b"a = 1\n", b"b = 2\n", b"c = 3\n", b"d = 4\n", b"e = 5\n", b"f = 6\n", b""])
def readline():
    logicalline.SetLogicalCreateFunction(lambda *parts: next(results))
    return next(source)
read = PARSER.GetLogicalLineList(readline)  # numbers none of them, nor takes them from `other`
assert read == ["host object", other[0], other[1], other[1], other[0]]
assert read[1] is other[0] and read[2] is read[3] is other[1]
assert [(x.fFirstLine, x.fLineCount) for x in other] == [(0, 1), (1, 2)]
assert outcome(PARSER.UpdateLogicalLineList, read, b"x\n") == "TypeError"
'''}


@pytest.mark.parametrize("name", SCRIPTS)
def test_create_hook(name):
    done = run_isolated(PRELUDE + SCRIPTS[name])
    assert done.returncode == 0, done.stderr
