import logicalline
from model import LINE_TYPES

ATTRIB_KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
                "kGenericAttribKind": "generic attribute",
                "kImportedAttribKind": "imported attribute"}
INFOS = {"kClassAttribInfo", "kFunctionAttribInfo", "kGenericAttribInfo"}
FUNCTIONS = {"CreateLogicalLineParser", "GetDirectLogicalLineFunctionTable",
             "GetIdForTokenStart", "_GetFirstCodeUnit", "SetLogicalCreateFunction"}


def test_constants():
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert [type(c) for c in constants] == [bytes] * 26 and constants == list(LINE_TYPES.values())
    assert len({id(c) for c in constants}) == 26
    assert {name: getattr(logicalline, name) for name in ATTRIB_KINDS} == ATTRIB_KINDS
    for name in INFOS:
        kind = getattr(logicalline, name[:-4] + "Kind")
        assert type(kind) is str and type(getattr(logicalline, name)) is tuple
        assert getattr(logicalline, name) == (kind, None) and getattr(logicalline, name)[0] is kind
    assert type(logicalline.COMMENT_TOKEN) is int and logicalline.COMMENT_TOKEN == 202


def test_module_publishes_exactly_its_names():
    public = {name for name in dir(logicalline) if not name.startswith("__")}
    assert public == (FUNCTIONS | set(LINE_TYPES) | set(ATTRIB_KINDS) | INFOS
                      | {"LogicalLineType", "COMMENT_TOKEN"})
    assert {name for name in public if callable(getattr(logicalline, name))} == (
        FUNCTIONS | {"LogicalLineType"})
    assert type(logicalline.CreateLogicalLineParser()).__name__ == "LogicalLineParser"


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


def test_docstrings():
    assert [getattr(logicalline, name).__doc__ for name in sorted(FUNCTIONS)] == [
        CREATE_DOC, "Return direct C callable function table for logical line",
        "Get token id for start of string; does not verify that token is complete or valid",
        None, None]
    assert logicalline.__doc__ is None
