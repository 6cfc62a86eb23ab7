"""The host's annotations: appends by line type, line range, parsed flag and scope name."""

import io
import sys

import pytest

import logicalline


def line_of(source, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


SOURCES = {
    "class": b"class C(B): pass\n",
    "function": b"def f(a): pass\n",
    "nameless def": b"def (a): pass\n",  # no name: not a function definition
    "assignment": b"x = 1\n",
    "import": b"import os\n",
    "from import": b"from a import b\n",
    "comment": b"# note\n",
}

REFUSALS = {
    "AppendAttrib": "Cannot append attrib name type to a class or function def line",
    "AppendArgName": "Cannot append arg name to a non-function def line",
    "AppendBaseClassName": "Cannot append base class name to a non-class def line",
    "AppendArgTypeEquiv": "Cannot append arg name type equiv to a non-function def line",
    "AppendTypeEquiv": None,
}
ANY_LINE = {"AppendAttrib", "AppendTypeEquiv"}


def kind_line(kind):
    return line_of(SOURCES[kind], remove_comments=False, skip_whitespace_lines=False)


@pytest.mark.parametrize("kind, accepted", [
    ("class", {"AppendBaseClassName", "AppendTypeEquiv"}),
    ("function", {"AppendArgName", "AppendTypeEquiv", "AppendArgTypeEquiv"}),
] + [(kind, ANY_LINE) for kind in ("nameless def", "assignment", "import", "from import", "comment")])
@pytest.mark.parametrize("method", sorted(REFUSALS))
def test_append_by_line_type(kind, accepted, method):
    line, obj = kind_line(kind), object()
    kind_before = line.fType
    args = [obj] * (2 if method.endswith("Equiv") else 1)
    before = sys.getrefcount(obj)
    if method in accepted:
        assert getattr(line, method)(*args) is None
        assert sys.getrefcount(obj) == before + len(args)
    else:
        for _ in range(1000):  # a refusal takes no reference
            with pytest.raises(ValueError, match="^%s$" % REFUSALS[method]):
                getattr(line, method)(*args)
        assert sys.getrefcount(obj) == before
    assert line.fType is kind_before


@pytest.mark.parametrize("call, error", [
    (lambda line: line.AppendArgName(), TypeError),
    (lambda line: line.AppendAttrib(x=1), TypeError),
    (lambda line: line.AppendArgTypeEquiv(1), TypeError),
    (lambda line: line.SetLineRange("1", 2), TypeError),
    (lambda line: line.SetLineRange(2 ** 40, 1), OverflowError),
    (lambda line: line.SetScopeName("a", "b"), TypeError),
])
def test_argument_errors_come_before_the_type_test(call, error):
    line = kind_line("class")  # refuses every single-object append but the base class one
    with pytest.raises(error):
        call(line)
    assert line.fNamesDefined == ("C",) and line.fBaseClassNames == ()


def test_function_def_lists_keep_order_and_identity():
    line = kind_line("function")
    names = [object(), ("a", "b"), None, "x", "x"] + [object() for _ in range(6)]
    pairs = [(object(), object()) for _ in range(7)]
    for name in names:
        line.AppendArgName(name)
    for a, b in pairs:
        line.AppendArgTypeEquiv(a, b)
        line.AppendTypeEquiv(b, a)
    assert [id(name) for name in line.fArgNames] == [id(name) for name in names]
    assert line.fArgTypeEquivs == tuple(pairs) and line.fTypeEquivs == tuple((b, a) for a, b in pairs)
    assert line.fBaseClassNames == line.fImportRefs == () and line.fNamesDefined == ("f",)


def test_name_views_by_line_type():
    entries = [("os", object()), "path", (), ("sys",)] * 3
    klass, imports = kind_line("class"), kind_line("from import")
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
    line = kind_line("assignment")
    assert line.SetLineRange(first, count) is None
    assert (line.fFirstLine, line.fLineCount) == read_back


@pytest.mark.parametrize("value, parsed", [
    (0, False), ("", False), ([], False), (None, False), ("x", True), (1, True), ([0], True),
])
def test_set_parsed_truth_value_leaves_other_flags(value, parsed):
    line = line_of(b"\tx = (1,\n")  # tab indent, ended while open
    flags = (line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete)
    assert flags == (True, False, True)
    line.SetParsed(not parsed)
    line.SetParsed(value)
    assert line.fParsed is parsed
    assert (line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete) == flags


class FailingTruth:
    def __bool__(self):
        raise RuntimeError("no truth")


@pytest.mark.parametrize("initial", [False, True])
def test_set_parsed_failing_truth_test_keeps_flag(initial):
    line = kind_line("assignment")
    line.SetParsed(initial)
    with pytest.raises(RuntimeError, match="no truth"):
        line.SetParsed(FailingTruth())
    assert line.fParsed is initial


def test_set_scope_name_replaces_and_releases():
    line, first, second = kind_line("assignment"), object(), object()
    base = sys.getrefcount(first), sys.getrefcount(second)
    line.SetScopeName(first)
    line.SetScopeName(second)
    held = sys.getrefcount(first), sys.getrefcount(second)
    assert held == (base[0], base[1] + 1) and line.fScopeName is second
    line.SetScopeName(None)
    assert line.fScopeName is None and sys.getrefcount(second) == base[1]


def test_releasing_a_line_releases_its_annotations():
    obj = object()
    before = sys.getrefcount(obj)
    function, assignment = kind_line("function"), kind_line("assignment")
    for _ in range(5):
        function.AppendArgName(obj)
        function.AppendArgTypeEquiv(obj, obj)
        assignment.AppendAttrib(obj)
        assignment.AppendTypeEquiv(obj, obj)
    del function, assignment
    assert sys.getrefcount(obj) == before
