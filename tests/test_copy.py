"""Copy and deepcopy: separate storage, shared objects."""

import copy
import io
import os
import subprocess
import sys
import textwrap

import pytest

import logicalline


def line_of(source, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


def annotated_def():
    line = line_of(b"def f(a, b, c):\n")
    names = [object(), ("b", "b2"), "c"]
    for name in names:
        line.AppendArgName(name)
    line.AppendTypeEquiv("T", object())
    line.AppendArgTypeEquiv(object(), "U")
    line.SetScopeName(object())
    return line, names


def test_copy_shares_objects_and_owns_storage():
    line, names = annotated_def()
    dup = line.Copy()
    assert type(dup) is logicalline.LogicalLineType and dup is not line
    assert dup.fType is logicalline.kFunctionDef and dup.fLocalScopeName == "f"
    assert [id(n) for n in dup.fArgNames] == [id(n) for n in names]
    assert dup.fScopeName is line.fScopeName
    for attr in ("fTypeEquivs", "fArgTypeEquivs"):
        assert [tuple(map(id, p)) for p in getattr(dup, attr)] == \
            [tuple(map(id, p)) for p in getattr(line, attr)]
    # The copy's lists are its own: growing one leaves the other alone, and several appends
    # past the copied count must not overrun the copy's storage.
    extra = [object() for _ in range(5)]
    for e in extra:
        dup.AppendArgName(e)
        dup.AppendTypeEquiv(e, e)
    line.AppendArgTypeEquiv("V", "W")
    assert line.fArgNames == tuple(names) and len(line.fTypeEquivs) == 1
    assert dup.fArgNames == tuple(names + extra) and len(dup.fTypeEquivs) == 6
    assert len(dup.fArgTypeEquivs) == 1
    line.SetScopeName("other")
    assert dup.fScopeName is not line.fScopeName


def test_copy_tokens_and_text():
    line = line_of(b"x = (1,\n  '\xc3\xa9')\n")
    dup = line.Copy()
    assert dup.fTokens == line.fTokens and dup.GetTokenType(5) == 3
    assert dup.fLineText == line.fLineText == "x = (1,\n  '\u00e9')\n"
    assert (dup.fFirstLine, dup.fLineCount, dup.fIndentLevel) == (line.fFirstLine, 2, 0)
    assert line_of(b"x = 1\n", include_line_text=False).Copy().fLineText is None


@pytest.mark.parametrize("source", [b"\tx = (1,\n", b"  y = 2\n", b"z = 3\n"])
def test_copy_carries_flags_but_not_parsed(source):
    line = line_of(source)
    line.SetParsed(True)
    dup = line.Copy()
    assert dup.fParsed is False and line.fParsed is True
    for flag in ("fTabsInIndent", "fSpacesInIndent", "fIncomplete"):
        assert getattr(dup, flag) is getattr(line, flag)


@pytest.mark.parametrize("make_copy", [
    lambda line: line.Copy(1, 2, 3),
    lambda line: line.__deepcopy__({}),
    lambda line: copy.deepcopy([line])[0],
])
def test_copy_entry_points(make_copy):
    line, names = annotated_def()
    dup = make_copy(line)
    assert type(dup) is logicalline.LogicalLineType and dup is not line
    assert dup.fArgNames == tuple(names)
    with pytest.raises(TypeError):
        line.Copy(memo={})


@pytest.mark.parametrize("first, count", [(0, 0), (-1, 3), (5, -2), (0, 65536)])
def test_copy_refuses_bad_range(first, count):
    line, names = annotated_def()
    line.SetLineRange(first, count)
    with pytest.raises(SystemError):
        line.Copy()
    assert line.fArgNames == tuple(names) and line.fFirstLine == first
    line.SetLineRange(7, 3)
    assert (line.Copy().fFirstLine, line.Copy().fLineCount) == (7, 3)


def test_released_copy_releases_its_references():
    line, names = annotated_def()
    before = sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)
    for _ in range(100):
        line.Copy()
    assert (sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)) == before


# A create hook stays for the life of the process, so it is installed in a child interpreter.
HOOK_SCRIPT = textwrap.dedent("""
    import io, logicalline
    parser = logicalline.CreateLogicalLineParser()
    line = parser.GetLogicalLineList(io.BytesIO(b"def f(a):\\n").readline)[0]
    line.AppendArgName("a")
    calls = []
    logicalline.SetLogicalCreateFunction(lambda *parts: calls.append(parts) or "hooked")
    dup = line.Copy()
    assert type(dup) is logicalline.LogicalLineType, dup
    assert dup.fArgNames == ("a",) and dup.fLocalScopeName == "f"
    assert calls == []
    assert parser.GetLogicalLineList(io.BytesIO(b"x = 1\\n").readline) == ["hooked"]
    print("ok")
""")


def test_copy_bypasses_create_hook():
    result = subprocess.run([sys.executable, "-c", HOOK_SCRIPT], capture_output=True,
                            text=True, env=os.environ.copy(), timeout=60)
    assert result.returncode == 0, result.stderr
    assert result.stdout.strip() == "ok"
