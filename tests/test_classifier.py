import pytest

import logicalline
from test_model_agreement import read

KEYWORD_TYPES = {"else": "kElseBeginning", "break": "kBreak", "from": "kFromImport",
                 "print": "kPrint", "del": "kDelete", "continue": "kContinue"}  # the rest alike


@pytest.mark.parametrize("source, line_type, name", [
    *[(word.encode() + b" x = (y)\n", kind, None) for word, kind in KEYWORD_TYPES.items()],
    (b"async \\\n async\n", "kBlankLine", None), (b"# note\n", "kComment", None),
    (b"'doc' # note\n", "kUnknown", None), (b"x[i] = 1\n", "kAssignment", None),
    (b"f(a=1)\n", "kUnknown", None), (b") = 1\n", "kUnknown", None),  # "=" inside brackets
    (b"r'x' u'y' \"z\"\n", "kStringExpression", None), (b"'a' \\\n 'b'\n", "kStringExpression", None),
    (b"b'x'\n", "kUnknown", None), (b"'a' + 'b'\n", "kUnknown", None),
    (b"async def \\\n f():\n", "kFunctionDef", "f"),
    (b"class 1 Foo:\n", "kClassDef", "Foo"),     # anything but a bracket or colon is passed over
    (b"def (x):\n", "kUnknown", None), (b"def async():\n", "kUnknown", None),
])
def test_line_type_and_defined_name(source, line_type, name):
    (line,) = read(source, skip_whitespace_lines=False, remove_comments=False)
    assert line.fType is getattr(logicalline, line_type) and line.fLocalScopeName == name
    if line_type in ("kClassDef", "kFunctionDef", "kUnknown"):
        assert line.fNamesDefined == ((name,) if name else ())
