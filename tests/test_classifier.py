import pytest

import logicalline
from test_model_agreement import read

KEYWORD_TYPES = [
    ("if", "kIfBeginning"), ("else", "kElseBeginning"), ("while", "kWhileBeginning"),
    ("for", "kForBeginning"), ("pass", "kPass"), ("raise", "kRaise"), ("break", "kBreak"),
    ("try", "kTry"), ("except", "kExcept"), ("finally", "kFinally"), ("return", "kReturn"),
    ("import", "kImport"), ("assert", "kAssert"), ("from", "kFromImport"), ("print", "kPrint"),
    ("del", "kDelete"), ("elif", "kElifBeginning"), ("continue", "kContinue"), ("with", "kWith"),
]


@pytest.mark.parametrize("source, line_type, name", [
    *[(word.encode() + b" x = (y)\n", kind, None) for word, kind in KEYWORD_TYPES],
    (b"print x = 1\n", "kPrint", None),          # the keyword decides first
    (b"async with a:\n", "kWith", None), (b"Print x\n", "kUnknown", None),  # case-sensitive
    (b"\\\n", "kBlankLine", None), (b"async \\\n async\n", "kBlankLine", None),
    (b"# note\n", "kComment", None), (b"x = 1 # note\n", "kAssignment", None),
    (b"'doc' # note\n", "kUnknown", None),       # a comment after a token is no comment line
    (b"( # note\n x )\n", "kUnknown", None),
    (b"= 1\n", "kAssignment", None), (b"x[i] = 1\n", "kAssignment", None),
    (b"x: int = 1\n", "kAssignment", None), (b"lambda x=1: x\n", "kAssignment", None),
    (b"x == 1\n", "kUnknown", None), (b"x += 1\n", "kUnknown", None), (b"x: int\n", "kUnknown", None),
    (b"f(a=1)\n", "kUnknown", None),             # keyword argument inside brackets
    (b") = 1\n", "kUnknown", None),              # depth -1 at the "="
    (b"'doc'\n", "kStringExpression", None), (b"r'x' u'y' \"z\"\n", "kStringExpression", None),
    (b"'a' \\\n 'b'\n", "kStringExpression", None), (b"'''a\nb'''\n", "kStringExpression", None),
    (b"b'x'\n", "kUnknown", None), (b"rb'x'\n", "kUnknown", None), (b"'a' + 'b'\n", "kUnknown", None),
    (b"class Foo(Bar):\n", "kClassDef", "Foo"), (b"def f(a, b):\n", "kFunctionDef", "f"),
    (b"async def f():\n", "kFunctionDef", "f"), (b"def \\\n f():\n", "kFunctionDef", "f"),
    (b"class \xc3\xa9t\xc3\xa9:\n", "kClassDef", "été"),
    (b"class 1 Foo:\n", "kClassDef", "Foo"),     # anything but a bracket or colon is passed over
    (b"def (x):\n", "kUnknown", None), (b"class:\n", "kUnknown", None), (b"def\n", "kUnknown", None),
    (b"def async():\n", "kUnknown", None),       # "async" is never the name
])
def test_line_type_and_defined_name(source, line_type, name):
    (line,) = read(source, skip_whitespace_lines=False, remove_comments=False)
    assert line.fType is getattr(logicalline, line_type) and line.fLocalScopeName == name
    if line_type in ("kClassDef", "kFunctionDef", "kUnknown"):
        assert line.fNamesDefined == ((name,) if name else ())
