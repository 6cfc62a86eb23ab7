import io
import itertools

import pytest

import logicalline
from model import LINE_TYPES, OPTIONS

ATTRIB_KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
                "kGenericAttribKind": "generic attribute",
                "kImportedAttribKind": "imported attribute"}
FUNCTIONS = {"CreateLogicalLineParser", "GetDirectLogicalLineFunctionTable",
             "GetIdForTokenStart", "_GetFirstCodeUnit", "SetLogicalCreateFunction"}


def test_constants_and_names():
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert [type(c) for c in constants] == [bytes] * 26 and constants == list(LINE_TYPES.values())
    assert len({id(c) for c in constants}) == 26
    assert {name: getattr(logicalline, name) for name in ATTRIB_KINDS} == ATTRIB_KINDS
    infos = {name[:-4] + "Info" for name in ATTRIB_KINDS} - {"kImportedAttribInfo"}
    for name in infos:
        info, kind = getattr(logicalline, name), getattr(logicalline, name[:-4] + "Kind")
        assert type(info) is tuple and info == (kind, None) and info[0] is kind
    assert type(logicalline.COMMENT_TOKEN) is int and logicalline.COMMENT_TOKEN == 202
    public = {name for name in dir(logicalline) if not name.startswith("__")}
    assert public == (FUNCTIONS | set(LINE_TYPES) | set(ATTRIB_KINDS) | infos
                      | {"LogicalLineType", "COMMENT_TOKEN"})
    assert {name for name in public if callable(getattr(logicalline, name))} == (
        FUNCTIONS | {"LogicalLineType"})


class Raising:
    def __init__(self, name):
        self.name = name

    def __bool__(self):
        raise LookupError(self.name)


@pytest.mark.parametrize("number, flags", list(enumerate(itertools.product((0, 1), repeat=4))))
def test_options(number, flags):
    copy_strings, skip_whitespace_lines, remove_comments, include_line_text = flags
    comment = [] if remove_comments else ["# tail\n"]  # a comment keeps its line feed
    want = [(["s", "=", "'a'" if copy_strings else "'<string>'"] + comment,
             "s = 'a'  # tail\n" if include_line_text else None)]
    if not skip_whitespace_lines and not remove_comments:
        want.insert(0, (["# lead\n"], "# lead\n" if include_line_text else None))
    # The first few go by position, the others by keyword, or are left to default to on; any
    # object is taken by its truth.
    k = number % 5
    keywords = {name: [[], None, ""][number % 3] for name, flag in zip(OPTIONS[k:], flags[k:])
                if not flag}
    parser = logicalline.CreateLogicalLineParser(*[flag and "x" for flag in flags[:k]], **keywords)
    lines = parser.GetLogicalLineList(io.BytesIO(b"# lead\ns = 'a'  # tail\n").readline)
    assert [([text for text, _ in line.fTokens], line.fLineText) for line in lines] == want
    order = ("skip_whitespace_lines", "remove_comments", "copy_strings", "include_line_text")
    first = number % 4  # truth tests run in this order; every option from `first` on raises
    with pytest.raises(LookupError) as info:
        logicalline.CreateLogicalLineParser(**{name: Raising(name) for name in order[first:]})
    assert info.value.args == (order[first],)
    pytest.raises(TypeError, logicalline.CreateLogicalLineParser, 1, 1, 1, 1, 1)
