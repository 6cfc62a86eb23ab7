"""The direct function table, called from a small C extension built against the public header."""
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

(CREATE_EMPTY, IS_LOGICAL, TYPE_OBJECT, ARG_NAME, ARG_NAME_COUNT, APPEND_TYPE_EQUIV,
 APPEND_ARG_TYPE_EQUIV, APPEND_ATTRIB, APPEND_ARG_NAME, APPEND_BASE_CLASS_NAME, NAMES_DEFINED,
 CLEAR_APPENDED, TOKEN_TYPE, STRING_TOKEN_TYPE) = range(14)


@pytest.fixture(scope="session")
def call(tmp_path_factory):
    cc, include = shutil.which("cc"), sysconfig.get_paths()["include"]
    if cc is None or not os.path.exists(os.path.join(include, "Python.h")):
        pytest.skip("needs a C compiler (cc) and Python.h")
    out = tmp_path_factory.mktemp("ext") / ("direct_ext" + sysconfig.get_config_var("EXT_SUFFIX"))
    source = os.path.join(os.path.dirname(__file__), "direct_ext", "direct_ext.c")
    build = subprocess.run([cc, "-shared", "-fPIC", "-O1", "-Wall", "-I", include, "-I",
                            logicalline_include(), source, "-o", str(out)],
                           capture_output=True, text=True)
    assert build.returncode == 0, build.stderr
    location = importlib.util.spec_from_file_location("direct_ext", out)
    module = importlib.util.module_from_spec(location)
    location.loader.exec_module(module)
    return module.call  # call(entry, arguments...); call(-1, capsule) gives the table address


def line_of(source):
    return logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(source).readline)[0]


def test_capsules_and_the_empty_record(call):
    a, b = (logicalline.GetDirectLogicalLineFunctionTable() for _ in range(2))
    assert a is not b and call(-1, a) == call(-1, b)
    assert call(TYPE_OBJECT) is logicalline.LogicalLineType
    line = call(CREATE_EMPTY)
    objects = (line, line_of(b"x = 1\n"), "x", None, logicalline.CreateLogicalLineParser(),
               logicalline.LogicalLineType)
    assert [call(IS_LOGICAL, obj) for obj in objects] == [1, 1, 0, 0, 0, 0]
    assert line.fType is logicalline.kUnknown and line.fTokens == () and line.fLineText is None
    assert (line.fFirstLine, line.fLineCount, line.fIndentLevel, line.fTokenCount) == (0, 0, 0, 0)
    assert not (line.fParsed or line.fTabsInIndent or line.fSpacesInIndent or line.fIncomplete)
    assert line.fScopeName is None and line.fLocalScopeName is None
    with pytest.raises(SystemError):
        line.Copy()  # a line count of 0 cannot be constructed
    with pytest.raises(IndexError):
        line.GetTokenType(0)
    assert call(ARG_NAME_COUNT, line) == 0
    with pytest.raises(ValueError) as info:
        call(ARG_NAME, line, 0)
    assert str(info.value) == "Tried to get argument name from a non-function def line"
    assert [call(APPEND_ATTRIB, line, entry) for entry in (("x", object()), "y", ())] == [0] * 3
    assert call(NAMES_DEFINED, line) == line.fNamesDefined == ("x", "y", ())


@pytest.mark.parametrize("entry, accepted_on, view, refused_on, message", [
    (APPEND_TYPE_EQUIV, b"x = 1\n", "fTypeEquivs", None, None),
    (APPEND_ARG_TYPE_EQUIV, b"def f(): pass\n", "fArgTypeEquivs", b"x = 1\n",
     "Cannot append arg name type equiv to a non-function def line"),
    (APPEND_ATTRIB, b"import os\n", "fImportRefs", b"def f(): pass\n",
     "Cannot append attrib name type to a class or function def line"),
    (APPEND_ARG_NAME, b"def f(): pass\n", "fArgNames", b"class C: pass\n",
     "Cannot append arg name to a non-function def line"),
    (APPEND_BASE_CLASS_NAME, b"class C: pass\n", "fBaseClassNames", b"def f(): pass\n",
     "Cannot append base class name to a non-class def line"),
])
def test_append_entries(call, entry, accepted_on, view, refused_on, message):
    args = [object() for _ in range(1 + (entry in (APPEND_TYPE_EQUIV, APPEND_ARG_TYPE_EQUIV)))]
    before = [sys.getrefcount(a) for a in args]
    if refused_on:
        with pytest.raises(ValueError) as info:
            call(entry, line_of(refused_on), *args)
        assert str(info.value) == message and [sys.getrefcount(a) for a in args] == before
    line = line_of(accepted_on)
    assert call(entry, line, *args) == 0
    assert getattr(line, view) == ((tuple(args) if len(args) == 2 else args[0]),)
    assert [sys.getrefcount(a) for a in args] == [n + 1 for n in before]


def test_function_def_entries(call):
    line, a, b = line_of(b"def f(a, b): pass\n"), object(), ("x", "y")
    before = sys.getrefcount(a)
    call(APPEND_ARG_NAME, line, a)
    line.AppendArgName(b)  # the method and the entry write one list
    line.AppendTypeEquiv(a, b)
    call(APPEND_ARG_TYPE_EQUIV, line, b, a)
    for _ in range(100):  # lent, not given
        assert call(ARG_NAME, line, 0) is a and call(ARG_NAME, line, 1) is b
    assert call(ARG_NAME_COUNT, line) == 2 and call(NAMES_DEFINED, line) == ("f",)
    for bad in (2, -1):
        with pytest.raises(IndexError, match="^Invalid arg name index$"):
            call(ARG_NAME, line, bad)
    line.SetScopeName("outer")
    assert call(CLEAR_APPENDED, line) == call(CLEAR_APPENDED, line) == 0
    assert sys.getrefcount(a) == before and line.fLocalScopeName == "f"
    assert (line.fArgNames, line.fTypeEquivs, line.fArgTypeEquivs, line.fScopeName) == (
        (), (), (), "outer")
    objs = [object() for _ in range(5)]  # storage starts afresh
    for o in objs:
        call(APPEND_ARG_NAME, line, o)
    assert line.fArgNames == tuple(objs) and call(ARG_NAME_COUNT, line_of(b"import f\n")) == 0


ERRORS = {IndexError: "Invalid token index",
          TypeError: "String must be a bytes or unicode instance"}
UNTERMINATED = line_of(b"s = 'abc\n")


@pytest.mark.parametrize("entry, args, expected", [
    (TOKEN_TYPE, (UNTERMINATED, 0, 0), 1), (TOKEN_TYPE, (UNTERMINATED, 2, 0), 201),
    (TOKEN_TYPE, (UNTERMINATED, 2, 1), 3), (TOKEN_TYPE, (UNTERMINATED, 3, 0), IndexError),
    (STRING_TOKEN_TYPE, (b"42", 0), 2), (STRING_TOKEN_TYPE, ("\u00e9t\u00e9", 0), 1),
    (STRING_TOKEN_TYPE, (b"<errortoken> 'abc", 0), 201),
    (STRING_TOKEN_TYPE, ("<errortoken> 'abc", 1), 3),
    (STRING_TOKEN_TYPE, (b"<errortoken>", 1), 20),  # too short to hold the prefix
    (STRING_TOKEN_TYPE, (bytearray(b"x"), 0), TypeError),
    (STRING_TOKEN_TYPE, ("\ud800", 1), UnicodeEncodeError),
])
def test_token_type_entries(call, entry, args, expected):
    if isinstance(expected, int):
        assert call(entry, *args) == expected
        return
    with pytest.raises(expected) as info:
        call(entry, *args)
    assert str(info.value) == ERRORS.get(expected, str(info.value))
