import io

import pytest

import logicalline
from test_model_agreement import assert_agreement


def only_line(source):
    assert_agreement(list(io.BytesIO(source)), (True, False, False, True))  # the model too
    parser = logicalline.CreateLogicalLineParser(True, False, False)
    (line,) = parser.GetLogicalLineList(io.BytesIO(source).readline)
    return line


KEYWORD_TYPES = [
    ("if", "kIfBeginning"), ("else", "kElseBeginning"), ("while", "kWhileBeginning"),
    ("for", "kForBeginning"), ("pass", "kPass"), ("raise", "kRaise"), ("break", "kBreak"),
    ("try", "kTry"), ("except", "kExcept"), ("finally", "kFinally"), ("return", "kReturn"),
    ("import", "kImport"), ("assert", "kAssert"), ("from", "kFromImport"), ("print", "kPrint"),
    ("del", "kDelete"), ("elif", "kElifBeginning"), ("continue", "kContinue"), ("with", "kWith"),
]


@pytest.mark.parametrize("source, line_type", [
    *[(word.encode() + b" x = (y)\n", name) for word, name in KEYWORD_TYPES],
    (b"print x = 1\n", "kPrint"),                # the keyword decides first
    (b"async with a:\n", "kWith"), (b"Print x\n", "kUnknown"),  # keywords are case-sensitive
    (b"\\\n", "kBlankLine"), (b"async \\\n async\n", "kBlankLine"),  # continuations, "async"
    (b"# note\n", "kComment"), (b"x = 1 # note\n", "kAssignment"),
    (b"'doc' # note\n", "kUnknown"),             # a comment after a token is no comment line
    (b"( # note\n x )\n", "kUnknown"),
    (b"= 1\n", "kAssignment"), (b"x[i] = 1\n", "kAssignment"), (b"x: int = 1\n", "kAssignment"),
    (b"lambda x=1: x\n", "kAssignment"), (b"yield x = 1\n", "kAssignment"),
    (b"x == 1\n", "kUnknown"), (b"x += 1\n", "kUnknown"), (b"x: int\n", "kUnknown"),
    (b"f(a=1)\n", "kUnknown"),                   # keyword argument inside brackets
    (b") = 1\n", "kUnknown"),                    # depth -1 at the "="
    (b"lambda: 0\n", "kUnknown"), (b"x <> y\n", "kUnknown"),
    (b"'doc'\n", "kStringExpression"), (b"r'x' u'y' \"z\"\n", "kStringExpression"),
    (b"'a' \\\n 'b'\n", "kStringExpression"), (b"'''a\nb'''\n", "kStringExpression"),
    (b"b'x'\n", "kUnknown"), (b"f'x'\n", "kUnknown"), (b"rb'x'\n", "kUnknown"),  # only r and u
    (b"'a' + 'b'\n", "kUnknown"),
])
def test_line_type(source, line_type):
    assert only_line(source).fType is getattr(logicalline, line_type)


@pytest.mark.parametrize("source, line_type, name", [
    (b"class Foo(Bar):\n", "kClassDef", "Foo"),
    (b"def f(a, b):\n", "kFunctionDef", "f"),
    (b"async def f():\n", "kFunctionDef", "f"),
    (b"def \\\n f():\n", "kFunctionDef", "f"),
    (b"class \xc3\xa9t\xc3\xa9:\n", "kClassDef", "été"),
    (b"class 1 Foo:\n", "kClassDef", "Foo"),     # anything but a bracket or colon is passed over
    (b"def (x):\n", "kUnknown", None), (b"class:\n", "kUnknown", None),
    (b"def\n", "kUnknown", None),
    (b"def async():\n", "kUnknown", None),       # "async" is never the name
])
def test_defined_name(source, line_type, name):
    line = only_line(source)
    assert line.fType is getattr(logicalline, line_type) and line.fLocalScopeName == name
    assert line.fNamesDefined == ((name,) if name else ())
