"""The direct function table, called through its function pointers (fuzz/direct_table.py)."""
import os
import sys

import pytest

import logicalline
from test_model_agreement import read

sys.path.insert(0, os.path.join(os.path.dirname(__file__), "..", "fuzz"))
import direct_table  # noqa: E402

DIRECT = direct_table.LoadTable()


def test_capsules_and_the_empty_record():
    a, b = (logicalline.GetDirectLogicalLineFunctionTable() for _ in range(2))
    assert a is not b and direct_table.TableAddress(a) == direct_table.TableAddress(b)
    assert DIRECT.GetLogicalTypeObject() is logicalline.LogicalLineType
    line = DIRECT.CreateEmptyLogical()
    objects = (line, read(b"x = 1\n")[0], "x", None, logicalline.CreateLogicalLineParser(),
               logicalline.LogicalLineType)
    assert [DIRECT.IsLogical(obj) for obj in objects] == [1, 1, 0, 0, 0, 0]
    assert (line.fType, line.fTokens, line.fLineText, line.fScopeName, line.fLocalScopeName,
            line.fFirstLine, line.fLineCount, line.fIndentLevel, line.fTokenCount, line.fParsed,
            line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete) == (
        logicalline.kUnknown, (), None, None, None, 0, 0, 0, 0, False, False, False, False)
    pytest.raises(SystemError, line.Copy)  # a line count of 0 cannot be constructed
    pytest.raises(IndexError, line.GetTokenType, 0)
    assert DIRECT.GetArgNameCount(line) == 0
    with pytest.raises(ValueError, match="^Tried to get argument name from a non-function def line$"):
        DIRECT.GetArgName(line, 0)
    assert [DIRECT.AppendAttribDirect(line, entry) for entry in (("x", object()), "y", ())] == [0] * 3
    assert DIRECT.GetNamesDefined(line) == line.fNamesDefined == ("x", "y", ())
    assert DIRECT.GetArgNameCount(line) == 0  # attributes are no argument names


def test_function_def_entries():
    (line,), a, b = read(b"def f(a, b): pass\n"), object(), ("x", "y")
    before = sys.getrefcount(a)
    DIRECT.AppendArgNameDirect(line, a)
    line.AppendArgName(b)  # the method and the entry write one list
    line.AppendTypeEquiv(a, b)
    DIRECT.AppendArgTypeEquivDirect(line, b, a)
    for _ in range(100):  # lent, not given
        assert DIRECT.GetArgName(line, 0) is a and DIRECT.GetArgName(line, 1) is b
    assert DIRECT.GetArgNameCount(line) == 2 and DIRECT.GetNamesDefined(line) == ("f",)
    for bad in (2, -1):
        pytest.raises(IndexError, DIRECT.GetArgName, line, bad).match("^Invalid arg name index$")
    line.SetScopeName("outer")
    assert DIRECT.ClearAppended(line) == DIRECT.ClearAppended(line) == 0
    assert sys.getrefcount(a) == before and line.fLocalScopeName == "f"
    assert (line.fArgNames, line.fTypeEquivs, line.fArgTypeEquivs, line.fScopeName) == (
        (), (), (), "outer")
    objs = [object() for _ in range(5)]  # storage starts afresh
    assert [DIRECT.AppendArgNameDirect(line, o) for o in objs] == [0] * 5 and line.fArgNames == tuple(objs)


def test_token_type_entries():
    (line,) = read(b"s = 'abc\n")
    assert [DIRECT.GetTokenTypeDirect(line, 2, skip) for skip in (0, 1)] == [201, 3]
    assert [DIRECT.GetStringTokenTypeDirect(text, skip) for text, skip in [
        (b"42", 0), ("\u00e9t\u00e9", 0), ("<errortoken> 'abc", 1), (b"<errortoken> ", 1),
        (b"<errortoken>", 1)]] == [2, 1, 3, 201, 20]  # a bare prefix leaves nothing; too short
    pytest.raises(IndexError, DIRECT.GetTokenTypeDirect, line, 3, 0).match("^Invalid token index$")
    with pytest.raises(TypeError, match="^String must be a bytes or unicode instance$"):
        DIRECT.GetStringTokenTypeDirect(bytearray(b"x"), 0)
    pytest.raises(UnicodeEncodeError, DIRECT.GetStringTokenTypeDirect, "\ud800", 1)
