import contextlib
import io
import sys

import pytest

import logicalline


def line_of(source):
    parser = logicalline.CreateLogicalLineParser(True, False, False)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


REFUSALS = {
    "AppendAttrib": "Cannot append attrib name type to a class or function def line",
    "AppendArgName": "Cannot append arg name to a non-function def line",
    "AppendBaseClassName": "Cannot append base class name to a non-class def line",
    "AppendArgTypeEquiv": "Cannot append arg name type equiv to a non-function def line",
    "AppendTypeEquiv": None,
}
ANY_LINE = {"AppendAttrib", "AppendTypeEquiv"}


@pytest.mark.parametrize("source, accepted", [
    (b"class C(B): pass\n", {"AppendBaseClassName", "AppendTypeEquiv"}),
    (b"def f(a): pass\n", {"AppendArgName", "AppendTypeEquiv", "AppendArgTypeEquiv"}),
    (b"def (a): pass\n", ANY_LINE),  # no name: not a function definition
    (b"from a import b\n", ANY_LINE),
    (b"# note\n", ANY_LINE),
])
@pytest.mark.parametrize("method", sorted(REFUSALS))
def test_append_by_line_type(source, accepted, method):
    line, obj = line_of(source), object()
    kind, args = line.fType, [obj] * (2 if method.endswith("Equiv") else 1)
    before = sys.getrefcount(obj)
    if method in accepted:
        assert getattr(line, method)(*args) is None
        assert sys.getrefcount(obj) == before + len(args)
    else:
        for _ in range(1000):  # a refusal takes no reference
            with pytest.raises(ValueError) as info:
                getattr(line, method)(*args)
            assert str(info.value) == REFUSALS[method]
        assert sys.getrefcount(obj) == before
    assert line.fType is kind


@pytest.mark.parametrize("call, error", [
    (lambda line: line.AppendArgName(), TypeError),
    (lambda line: line.AppendAttrib(x=1), TypeError),
    (lambda line: line.AppendArgTypeEquiv(1), TypeError),
    (lambda line: line.SetLineRange(2 ** 40, 1), OverflowError),
])
def test_argument_errors_come_before_the_type_test(call, error):
    line = line_of(b"class C(B): pass\n")  # refuses the arg name and attribute appends
    with pytest.raises(error):
        call(line)
    assert line.fNamesDefined == ("C",) and line.fBaseClassNames == ()


def test_lists_keep_order_and_identity_and_release_their_objects():
    line = line_of(b"def f(a): pass\n")
    names = [object(), ("a", "b"), None, "x", "x"] + [object() for _ in range(6)]
    pairs = [(object(), object()) for _ in range(7)]
    before = [sys.getrefcount(o) for o in (names[0], pairs[0][0])]
    for name in names:
        line.AppendArgName(name)
    for a, b in pairs:
        line.AppendArgTypeEquiv(a, b)
        line.AppendTypeEquiv(b, a)
    assert line.fArgNames == tuple(names) and line.fArgTypeEquivs == tuple(pairs)
    assert line.fTypeEquivs == tuple((b, a) for a, b in pairs)
    assert line.fBaseClassNames == line.fImportRefs == () and line.fNamesDefined == ("f",)
    del line
    assert [sys.getrefcount(o) for o in (names[0], pairs[0][0])] == before


def test_name_views_by_line_type():
    entries = [("os", object()), "path", (), ("sys",)] * 3
    klass, imports = line_of(b"class C(B): pass\n"), line_of(b"from a import b\n")
    for entry in entries:
        klass.AppendBaseClassName(entry)
        imports.AppendAttrib(entry)
    assert klass.fBaseClassNames == imports.fImportRefs == tuple(entries)
    assert klass.fImportRefs == imports.fBaseClassNames == imports.fArgNames == ()
    assert imports.fNamesDefined == ("os", "path", (), "sys") * 3


@pytest.mark.parametrize("first, count, read_back", [
    (5, 0, (5, 0)), (-1, 3, (-1, 3)), (1, 70000, (1, 4464)), (1, 40000, (1, -25536)),
    (2 ** 31 - 1, -1, (2 ** 31 - 1, -1)), (0, 65536, (0, 0)),
])
def test_set_line_range(first, count, read_back):
    line = line_of(b"x = 1\n")
    assert line.SetLineRange(first, count) is None
    assert (line.fFirstLine, line.fLineCount) == read_back


FAILING = type("FailingTruth", (), {"__bool__": lambda self: 1 / 0})()


@pytest.mark.parametrize("initial, value, parsed", [
    (True, 0, False), (True, "", False), (True, [], False), (True, None, False),
    (False, "x", True), (False, 1, True), (False, [0], True),
    (False, FAILING, False), (True, FAILING, True),  # a failure keeps the flag
])
def test_set_parsed_sets_only_its_flag(initial, value, parsed):
    line = line_of(b"\tx = (1,\n")  # tab indent, ended while open
    line.SetParsed(initial)
    with pytest.raises(ZeroDivisionError) if value is FAILING else contextlib.nullcontext():
        line.SetParsed(value)
    assert line.fParsed is parsed
    assert (line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete) == (True, False, True)


def test_set_scope_name_replaces_and_releases():
    line, first, second = line_of(b"x = 1\n"), object(), object()
    base = sys.getrefcount(first), sys.getrefcount(second)
    line.SetScopeName(first)
    line.SetScopeName(second)
    assert (sys.getrefcount(first), sys.getrefcount(second)) == (base[0], base[1] + 1)
    assert line.fScopeName is second
    line.SetScopeName(None)
    assert line.fScopeName is None and sys.getrefcount(second) == base[1]
