import io

import pytest

import logicalline

LINE_TYPES = {
    "kUnknown": b"unknown", "kClassDef": b"class definition",
    "kFunctionDef": b"function definition", "kStringExpression": b"string expression",
    "kAssignment": b"assignment", "kIfBeginning": b"if statement start",
    "kElseBeginning": b"else statement start", "kWhileBeginning": b"while statement start",
    "kForBeginning": b"for statement start", "kPass": b"pass", "kRaise": b"raise",
    "kTry": b"try block start", "kExcept": b"except block start",
    "kFinally": b"finally block start", "kAssert": b"assert", "kReturn": b"return",
    "kImport": b"import", "kFromImport": b"from import", "kPrint": b"print",
    "kDelete": b"delete", "kElifBeginning": b"elif block start", "kComment": b"comment",
    "kBlankLine": b"blank line", "kBreak": b"break", "kContinue": b"continue",
    "kWith": b"with block start",
}
ATTRIB_KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
                "kGenericAttribKind": "generic attribute",
                "kImportedAttribKind": "imported attribute"}
FUNCTIONS = {"CreateLogicalLineParser", "GetDirectLogicalLineFunctionTable",
             "GetIdForTokenStart", "_GetFirstCodeUnit", "SetLogicalCreateFunction"}


def parse(source):
    parser = logicalline.CreateLogicalLineParser()
    return parser.GetLogicalLineList(io.BytesIO(source).readline)


def test_line_type_constants_are_distinct_bytes():
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert [type(c) for c in constants] == [bytes] * 26
    assert constants == list(LINE_TYPES.values())
    assert len({id(c) for c in constants}) == 26


def test_attrib_kinds_and_info_tuples():
    for name, text in ATTRIB_KINDS.items():
        kind = getattr(logicalline, name)
        assert type(kind) is str and kind == text
        if name == "kImportedAttribKind":
            assert not hasattr(logicalline, "kImportedAttribInfo")
            continue
        info = getattr(logicalline, name.replace("Kind", "Info"))
        assert type(info) is tuple and len(info) == 2
        assert info[0] is kind and info[1] is None


def test_comment_token_is_the_id_of_a_comment():
    assert type(logicalline.COMMENT_TOKEN) is int and logicalline.COMMENT_TOKEN == 202
    assert logicalline.GetIdForTokenStart(b"# note") == logicalline.COMMENT_TOKEN


@pytest.mark.parametrize("source, name", [
    (b"class A(B):\n", "kClassDef"),
    (b"def f(a):\n", "kFunctionDef"),
    (b"with open(p) as f:\n", "kWith"),
    (b"x = 1\n", "kAssignment"),
])
def test_line_type_is_the_published_object(source, name):
    [line] = parse(source)
    assert type(line) is logicalline.LogicalLineType
    assert line.fType is getattr(logicalline, name)


def test_module_publishes_exactly_its_names():
    public = {name for name in dir(logicalline) if not name.startswith("__")}
    assert public == (FUNCTIONS | set(LINE_TYPES) | set(ATTRIB_KINDS)
                      | {"kClassAttribInfo", "kFunctionAttribInfo", "kGenericAttribInfo",
                         "LogicalLineType", "COMMENT_TOKEN"})
    assert {name for name in public if callable(getattr(logicalline, name))} == (
        FUNCTIONS | {"LogicalLineType"})
    assert logicalline.__doc__ is None
    parser_type = type(logicalline.CreateLogicalLineParser())
    assert parser_type.__name__ == "LogicalLineParser"
    with pytest.raises(TypeError):
        parser_type()


CREATE_DOC = (
    "Create a logical parser object.  Arguments set fields that set \nparser's behavior for "
    "its lifetime.  Signature is:\n def CreateLogicalLineParser(copy_strings = 1, \n"
    "                  skip_whitespace_lines = 1, remove_comments = 1) \n where copy_strings "
    "is a boolean which controls whether string \n          tokens are copied or if standard "
    "common string object is \n          used, \n       skip_whitespace_lines is a boolean "
    "that controls whether \n          whitespace lines are skipped, \n       removed_comments"
    " is a boolean that controls whether all comment \n          tokens are removed from "
    "returned logical lines. \n       include_line_text isa boolean that controls whether to "
    "include \n          copies of logical line original text as the fLineText \n"
    "          attribute in the logical line objects")


@pytest.mark.parametrize("name, doc", [
    ("CreateLogicalLineParser", CREATE_DOC),
    ("GetDirectLogicalLineFunctionTable",
     "Return direct C callable function table for logical line"),
    ("GetIdForTokenStart",
     "Get token id for start of string; does not verify that token is complete or valid"),
    ("_GetFirstCodeUnit", None),
    ("SetLogicalCreateFunction", None),
])
def test_function_docstrings(name, doc):
    assert getattr(logicalline, name).__doc__ == doc
