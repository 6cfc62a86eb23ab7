"""What a host does with its lines: annotate them, copy them, read them back."""
import copy
import gc
import sys
import weakref

import pytest

import logicalline
from test_direct_table import DIRECT
from test_model_agreement import read

REFUSALS = {
    "AppendAttrib": "Cannot append attrib name type to a class or function def line",
    "AppendArgName": "Cannot append arg name to a non-function def line",
    "AppendBaseClassName": "Cannot append base class name to a non-class def line",
    "AppendArgTypeEquiv": "Cannot append arg name type equiv to a non-function def line",
    "AppendTypeEquiv": None,
}
ANY_LINE = {"AppendAttrib", "AppendTypeEquiv"}


def line_of(source, **options):
    return read(source, skip_whitespace_lines=False, remove_comments=False, **options)[0]


@pytest.mark.parametrize("source, accepted", [
    (b"class C(B): pass\n", {"AppendBaseClassName", "AppendTypeEquiv"}),
    (b"def f(a): pass\n", {"AppendArgName", "AppendTypeEquiv", "AppendArgTypeEquiv"}),
    (b"def (a): pass\n", ANY_LINE), (b"from a import b\n", ANY_LINE), (b"# note\n", ANY_LINE),
])
def test_append_by_line_type(source, accepted):
    for method, message in REFUSALS.items():  # each method, and its entry in the direct table
        for direct in (False, True):
            line, obj = line_of(source), object()
            args, before = [obj] * (2 if method.endswith("Equiv") else 1), sys.getrefcount(obj)
            call = getattr(line, method) if not direct else (
                lambda *args, entry=getattr(DIRECT, method + "Direct"): entry(line, *args) or None)
            pytest.raises(TypeError, getattr(line, method))  # argument errors come first
            if method in accepted:
                assert call(*args) is None and sys.getrefcount(obj) == before + len(args)
            else:
                with pytest.raises(ValueError, match=f"^{message}$"):
                    call(*args)
                assert sys.getrefcount(obj) == before


def test_lists_keep_order_and_identity_and_release_their_objects():
    line = line_of(b"def f(a): pass\n")
    names = [object(), ("a", "b"), None, "x", "x"] + [object() for _ in range(6)]
    pairs = [(object(), object()) for _ in range(7)]
    for name in names:
        line.AppendArgName(name)
    for a, b in pairs:
        line.AppendArgTypeEquiv(a, b)
        line.AppendTypeEquiv(b, a)
    assert line.fArgNames == tuple(names) and line.fArgTypeEquivs == tuple(pairs)
    assert line.fTypeEquivs == tuple((b, a) for a, b in pairs)
    assert line.fBaseClassNames == line.fImportRefs == () and line.fNamesDefined == ("f",)
    entries = [("os", object()), "path", (), ("sys",)]
    klass, imports = line_of(b"class C(B): pass\n"), line_of(b"from a import b\n")
    for entry in entries:
        klass.AppendBaseClassName(entry)
        imports.AppendAttrib(entry)
    assert klass.fBaseClassNames == imports.fImportRefs == tuple(entries) != imports.fArgNames
    assert imports.fNamesDefined == ("os", "path", (), "sys")


def test_setters():
    line, first, second = line_of(b"\tx = (1,\n"), object(), object()  # tabs, ended open
    for start, count, read_back in [(-1, 3, (-1, 3)), (1, 70000, (1, 70000)), (2, 2**31 - 1, (2, 2**31 - 1))]:
        line.SetLineRange(start, count)
        assert (line.fFirstLine, line.fLineCount) == read_back
    for value in ("x", 0, [1], [], None, 1):
        line.SetParsed(value)
        assert line.fParsed is bool(value)
    pytest.raises(ZeroDivisionError, line.SetParsed, type("F", (), {"__bool__": lambda s: 1 / 0})())
    assert line.fParsed is True  # a failing truth test keeps the flag, and no other flag moves
    assert (line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete) == (True, False, True)
    base = sys.getrefcount(first), sys.getrefcount(second)
    for name in (first, second, None):
        line.SetScopeName(name)
        assert line.fScopeName is name
    assert (sys.getrefcount(first), sys.getrefcount(second)) == base


@pytest.mark.parametrize("make_copy", [lambda line: line.Copy(1, 2, 3), copy.deepcopy])
def test_copy_shares_objects_and_owns_storage(make_copy):
    line, names = line_of(b"\tdef f(a, b,\n  c):\n"), [object(), ("b", "b2"), object()]
    for name in names:
        line.AppendArgName(name)
    line.AppendTypeEquiv("T", object())
    line.AppendArgTypeEquiv(object(), "U")
    line.SetScopeName(object())
    line.SetParsed(True)
    before = sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)
    dup = make_copy(line)
    assert type(dup) is logicalline.LogicalLineType and dup is not line and not dup.fParsed
    assert (dup.fType, dup.fLocalScopeName, dup.fTokens, dup.fLineText, dup.fArgNames) == (
        line.fType, "f", line.fTokens, line.fLineText, tuple(names))
    assert (dup.fFirstLine, dup.fLineCount, dup.fIndentLevel, dup.fTabsInIndent,
            dup.fSpacesInIndent, dup.fIncomplete) == (0, 2, 8, True, False, False)
    assert dup.fScopeName is line.fScopeName
    assert (dup.fTypeEquivs, dup.fArgTypeEquivs) == (line.fTypeEquivs, line.fArgTypeEquivs)
    extra = [object() for _ in range(5)]  # appends past the copied count must not overrun
    for e in extra:
        dup.AppendArgName(e)
        dup.AppendTypeEquiv(e, e)
    line.AppendArgTypeEquiv("V", "W")
    assert line.fArgNames == tuple(names) and len(line.fTypeEquivs) == 1
    assert dup.fArgNames == tuple(names + extra) and len(dup.fTypeEquivs) == 6
    assert len(dup.fArgTypeEquivs) == 1 and line_of(b"x\n", include_line_text=0).Copy().fLineText is None
    for first, count in [(0, 0), (-1, 3), (5, -2), (0, -40000)]:
        line.SetLineRange(first, count)  # a range no line can have cannot be copied
        pytest.raises(SystemError, line.Copy)
    del dup, extra
    assert (sys.getrefcount(names[0]), sys.getrefcount(line.fScopeName)) == before


Scope = type("Scope", (), {})  # what a host keeps: it refers to its line and is stored on it


@pytest.mark.parametrize("source, store", [
    (b"x = 1\n", lambda line, o: line.SetScopeName(o)),
    (b"x = 1\n", lambda line, o: line.AppendAttrib([o])),  # through a list in between
    *[(source, lambda line, o, name=name: getattr(line, name)(o)) for source, name in [
        (b"def f(): pass\n", "AppendArgName"), (b"class C: pass\n", "AppendBaseClassName")]],
    (b"x = 1\n", lambda line, o: line.AppendTypeEquiv("T", o)),
    (b"def f(): pass\n", lambda line, o: line.AppendArgTypeEquiv(o, "T")),
    *[(source, lambda line, o, name=name, n=n: getattr(DIRECT, name)(line, *[o] * n)) for source, name, n in [
        (b"x = 1\n", "AppendAttribDirect", 1), (b"def f(): pass\n", "AppendArgNameDirect", 1),
        (b"class C: pass\n", "AppendBaseClassNameDirect", 1), (b"x = 1\n", "AppendTypeEquivDirect", 2),
        (b"def f(): pass\n", "AppendArgTypeEquivDirect", 2)]],
])
def test_cycles_through_annotations_are_collected(source, store):
    for copied in (False, True):
        line, scope = line_of(source), Scope()
        assert not gc.is_tracked(line)  # parsing alone costs the collector nothing
        scope.line = line
        store(line, scope)
        assert gc.is_tracked(line)
        if copied:  # the copy holds the scope too, and the scope holds only the copy
            scope.line = line = line.Copy()
        gone = weakref.ref(scope)
        del line, scope
        gc.collect()
        assert gone() is None
