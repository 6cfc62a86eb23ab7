"""The direct function table, exercised from a small C extension built against the public header."""

import importlib.util
import io
import os
import shutil
import subprocess
import sys
import sysconfig

import pytest

import logicalline
from logicalline_dump import logicalline_include

SOURCE = os.path.join(os.path.dirname(__file__), "direct_ext", "direct_ext.c")


@pytest.fixture(scope="session")
def ext(tmp_path_factory):
    cc = shutil.which("cc")
    if cc is None:
        pytest.skip("no C compiler (cc) to build the direct table test extension")
    python_include = sysconfig.get_paths()["include"]
    if not os.path.exists(os.path.join(python_include, "Python.h")):
        pytest.skip("Python.h not installed; cannot build the direct table test extension")
    out = tmp_path_factory.mktemp("direct_ext") / ("direct_ext" + sysconfig.get_config_var("EXT_SUFFIX"))
    build = subprocess.run(
        [cc, "-shared", "-fPIC", "-O1", "-Wall", "-I", python_include, "-I", logicalline_include(),
         SOURCE, "-o", str(out)], capture_output=True, text=True)
    assert build.returncode == 0, build.stderr
    location = importlib.util.spec_from_file_location("direct_ext", out)
    module = importlib.util.module_from_spec(location)
    location.loader.exec_module(module)
    return module


def line_of(source):
    parser = logicalline.CreateLogicalLineParser()
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


def test_capsules_types_and_is_logical(ext):
    a, b = (logicalline.GetDirectLogicalLineFunctionTable() for _ in range(2))
    assert a is not b and ext.table_address(a) == ext.table_address(b)
    assert ext.type_object() is logicalline.LogicalLineType
    assert ext.is_logical(ext.create_empty()) == 1 and ext.is_logical(line_of(b"x = 1\n")) == 1
    others = ("x", None, logicalline.CreateLogicalLineParser(), logicalline.LogicalLineType)
    assert [ext.is_logical(obj) for obj in others] == [0, 0, 0, 0]


def test_empty_record(ext):
    line = ext.create_empty()
    assert line.fType is logicalline.kUnknown and line.fTokens == () and line.fTokens is line.fTokens
    assert (line.fFirstLine, line.fLineCount, line.fIndentLevel, line.fTokenCount) == (0, 0, 0, 0)
    assert not (line.fParsed or line.fTabsInIndent or line.fSpacesInIndent or line.fIncomplete)
    assert line.fScopeName is None and line.fLocalScopeName is None and line.fLineText is None
    with pytest.raises(IndexError, match="Invalid token index"):
        line.GetTokenType(0)
    with pytest.raises(SystemError):
        line.Copy()  # a line count of 0 cannot be constructed
    assert ext.get_arg_name_count(line) == 0
    with pytest.raises(ValueError, match="^Tried to get argument name from a non-function def line$"):
        ext.get_arg_name(line, 0)
    for entry in (("x", object()), "y", ()):
        assert ext.append_attrib(line, entry) == 0
    assert ext.get_names_defined(line) == line.fNamesDefined == ("x", "y", ())


ATTRIB = "Cannot append attrib name type to a class or function def line"


@pytest.mark.parametrize("source, entry, nargs, message", [
    (b"class C: pass\n", "append_attrib", 1, ATTRIB),
    (b"def f(): pass\n", "append_attrib", 1, ATTRIB),
    (b"class C: pass\n", "append_arg_name", 1, "Cannot append arg name to a non-function def line"),
    (b"def f(): pass\n", "append_base_class_name", 1, "Cannot append base class name to a non-class def line"),
    (b"x = 1\n", "append_arg_type_equiv", 2, "Cannot append arg name type equiv to a non-function def line"),
    (b"def f(): pass\n", "append_type_equiv", 2, None),
    (b"class C: pass\n", "append_base_class_name", 1, None),
])
def test_append_entries_by_line_type(ext, source, entry, nargs, message):
    line, args = line_of(source), [object() for _ in range(nargs)]
    before = [sys.getrefcount(a) for a in args]
    if message is None:
        assert getattr(ext, entry)(line, *args) == 0
    else:
        with pytest.raises(ValueError, match="^%s$" % message):
            getattr(ext, entry)(line, *args)
    after = [sys.getrefcount(a) for a in args]
    assert after == [n + (0 if message else 1) for n in before]


def test_function_def_entries(ext):
    line = line_of(b"def f(a, b): pass\n")
    a, b, c, d = object(), ("x", "y"), object(), object()
    assert ext.append_arg_name(line, a) == 0
    line.AppendArgName(b)  # the method and the entry write one list
    assert ext.get_arg_name_count(line) == 2 and line.fArgNames == (a, b)
    assert ext.get_arg_name(line, 0) is a and ext.get_arg_name(line, 1) is b
    for bad in (2, -1):
        with pytest.raises(IndexError, match="Invalid arg name index"):
            ext.get_arg_name(line, bad)
    assert ext.append_arg_type_equiv(line, c, d) == 0
    assert line.fArgTypeEquivs == ((c, d),)
    assert ext.get_names_defined(line) == ("f",)
    assert ext.get_arg_name_count(line_of(b"import f\n")) == 0


def test_get_arg_name_lends_its_result(ext):
    line, name = line_of(b"def f(a): pass\n"), object()
    ext.append_arg_name(line, name)
    before = sys.getrefcount(name)
    for _ in range(100):
        ext.get_arg_name(line, 0)
    assert sys.getrefcount(name) == before


def test_clear_appended_releases_and_accepts_again(ext):
    line = line_of(b"def f(a): pass\n")
    objs = [object() for _ in range(5)]
    before = [sys.getrefcount(o) for o in objs]
    line.AppendArgName(objs[0])
    ext.append_arg_name(line, objs[1])
    line.AppendTypeEquiv(objs[2], objs[3])
    ext.append_arg_type_equiv(line, objs[3], objs[4])
    line.SetScopeName("outer")
    assert ext.clear_appended(line) == 0
    assert [sys.getrefcount(o) for o in objs] == before
    assert (line.fArgNames, line.fTypeEquivs, line.fArgTypeEquivs) == ((), (), ())
    assert line.fScopeName == "outer" and line.fLocalScopeName == "f"
    assert ext.clear_appended(line) == 0  # clearing an empty line is fine
    for o in objs:
        ext.append_arg_name(line, o)
    assert line.fArgNames == tuple(objs)


def test_token_type_entry(ext):
    line = line_of(b"s = 'abc\n")
    assert [ext.get_token_type(line, i, 0) for i in range(3)] == [1, 22, 201]
    assert ext.get_token_type(line, 2, 1) == 3
    for bad in (-1, 3):
        with pytest.raises(IndexError, match="Invalid token index"):
            ext.get_token_type(line, bad, 0)


@pytest.mark.parametrize("text, skip, expected", [
    (b"name", 0, 1), ("name", 0, 1), ("\u00e9t\u00e9", 0, 1), (b"42", 0, 2), (b"!=", 0, 29),
    (b"# c", 0, 202), (b"'<string>'", 0, 3), (b"<errortoken> 'abc", 0, 201),
    ("<errortoken> 'abc", 1, 3), (b"<errortoken> ", 1, 201),
    (b"<errortoken>", 1, logicalline.GetIdForTokenStart(b"<")),  # too short to hold the prefix
])
def test_string_token_type_entry(ext, text, skip, expected):
    assert ext.get_string_token_type(text, skip) == expected


@pytest.mark.parametrize("text", [None, 42, bytearray(b"x")])
def test_string_token_type_entry_refuses_other_types(ext, text):
    with pytest.raises(TypeError, match="^String must be a bytes or unicode instance$"):
        ext.get_string_token_type(text, 0)


def test_string_token_type_entry_lone_surrogate(ext):
    with pytest.raises(UnicodeEncodeError):
        ext.get_string_token_type("\ud800", 1)
