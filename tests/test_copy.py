import copy
import io
import sys

import pytest

import logicalline


def line_of(source, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


def annotated_def():
    line, names = line_of(b"def f(a, b, c):\n"), [object(), ("b", "b2"), object()]
    for name in names:
        line.AppendArgName(name)
    line.AppendTypeEquiv("T", object())
    line.AppendArgTypeEquiv(object(), "U")
    line.SetScopeName(object())
    return line, names


@pytest.mark.parametrize("make_copy", [
    lambda line: line.Copy(), lambda line: line.Copy(1, 2, 3),
    lambda line: line.__deepcopy__({}), lambda line: copy.deepcopy([line])[0],
])
def test_copy_shares_objects_and_owns_storage(make_copy):
    line, names = annotated_def()
    dup = make_copy(line)
    assert type(dup) is logicalline.LogicalLineType and dup is not line
    assert dup.fType is logicalline.kFunctionDef and dup.fLocalScopeName == "f"
    assert dup.fArgNames == tuple(names) and dup.fScopeName is line.fScopeName
    assert (dup.fTypeEquivs, dup.fArgTypeEquivs) == (line.fTypeEquivs, line.fArgTypeEquivs)
    # Several appends past the copied count must not overrun the copy's storage.
    extra = [object() for _ in range(5)]
    for e in extra:
        dup.AppendArgName(e)
        dup.AppendTypeEquiv(e, e)
    line.AppendArgTypeEquiv("V", "W")
    assert line.fArgNames == tuple(names) and len(line.fTypeEquivs) == 1
    assert dup.fArgNames == tuple(names + extra) and len(dup.fTypeEquivs) == 6
    assert len(dup.fArgTypeEquivs) == 1


def test_copy_carries_tokens_text_and_flags_but_not_parsed():
    line = line_of(b"\tx = (1,\n  '\xc3\xa9'\n")
    line.SetParsed(True)
    dup = line.Copy()
    assert dup.fTokens == line.fTokens and dup.GetTokenType(5) == 3
    assert dup.fLineText == line.fLineText == "\tx = (1,\n  '\u00e9'\n"
    assert (dup.fFirstLine, dup.fLineCount, dup.fIndentLevel) == (0, 2, 8)
    assert (dup.fTabsInIndent, dup.fSpacesInIndent, dup.fIncomplete) == (True, False, True)
    assert dup.fParsed is False and line.fParsed is True
    assert line_of(b"  y\n").Copy().fSpacesInIndent is True
    assert line_of(b"x = 1\n", include_line_text=False).Copy().fLineText is None
    with pytest.raises(TypeError):
        line.Copy(memo={})


@pytest.mark.parametrize("first, count", [(0, 0), (-1, 3), (5, -2), (0, 65536)])
def test_bad_range_is_refused_and_copies_release_their_references(first, count):
    line, names = annotated_def()
    before = sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)
    line.SetLineRange(first, count)
    with pytest.raises(SystemError):
        line.Copy()
    assert line.fArgNames == tuple(names) and line.fFirstLine == first
    line.SetLineRange(7, 3)
    for _ in range(100):
        dup = line.Copy()
    assert (dup.fFirstLine, dup.fLineCount) == (7, 3)
    del dup
    assert (sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)) == before
