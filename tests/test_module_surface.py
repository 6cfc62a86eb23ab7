import io
import itertools

import pytest

import logicalline
from model import LINE_TYPES, OPTIONS

ATTRIB_KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
                "kGenericAttribKind": "generic attribute",
                "kImportedAttribKind": "imported attribute"}
INFOS = {"kClassAttribInfo", "kFunctionAttribInfo", "kGenericAttribInfo"}
FUNCTIONS = {"CreateLogicalLineParser", "GetDirectLogicalLineFunctionTable",
             "GetIdForTokenStart", "_GetFirstCodeUnit", "SetLogicalCreateFunction"}


def test_constants_and_names():
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert [type(c) for c in constants] == [bytes] * 26 and constants == list(LINE_TYPES.values())
    assert len({id(c) for c in constants}) == 26
    assert {name: getattr(logicalline, name) for name in ATTRIB_KINDS} == ATTRIB_KINDS
    for name in INFOS:
        info, kind = getattr(logicalline, name), getattr(logicalline, name[:-4] + "Kind")
        assert type(info) is tuple and info == (kind, None) and info[0] is kind
    assert type(logicalline.COMMENT_TOKEN) is int and logicalline.COMMENT_TOKEN == 202
    public = {name for name in dir(logicalline) if not name.startswith("__")}
    assert public == (FUNCTIONS | set(LINE_TYPES) | set(ATTRIB_KINDS) | INFOS
                      | {"LogicalLineType", "COMMENT_TOKEN"})
    assert {name for name in public if callable(getattr(logicalline, name))} == (
        FUNCTIONS | {"LogicalLineType"})


def effects(parser):
    lines = parser.GetLogicalLineList(io.BytesIO(b"# lead\ns = 'a'  # tail\n").readline)
    return [([text for text, _ in line.fTokens], line.fLineText) for line in lines]


def expected(copy_strings, skip_whitespace_lines, remove_comments, include_line_text):
    comment = [] if remove_comments else ["# tail\n"]  # a comment keeps its line feed
    lines = [(["s", "=", "'a'" if copy_strings else "'<string>'"] + comment,
              "s = 'a'  # tail\n" if include_line_text else None)]
    if not skip_whitespace_lines and not remove_comments:
        lines.insert(0, (["# lead\n"], "# lead\n" if include_line_text else None))
    return lines


@pytest.mark.parametrize("number, flags", list(enumerate(itertools.product((0, 1), repeat=4))))
def test_options(number, flags):
    # The first few go by position, the others by keyword, or are left to default to on.
    k = number % 5
    keywords = {name: flag for name, flag in zip(OPTIONS[k:], flags[k:]) if not flag}
    assert effects(logicalline.CreateLogicalLineParser(*flags[:k], **keywords)) == expected(*flags)
    truthy = [[], "x", None, object()][number % 4]  # options are taken by their truth
    assert effects(logicalline.CreateLogicalLineParser(truthy, truthy, truthy, truthy)) == \
        expected(*[bool(truthy)] * 4)


class Raising:
    def __init__(self, name):
        self.name = name

    def __bool__(self):
        raise LookupError(self.name)


@pytest.mark.parametrize("first", range(4))
def test_truth_tests_are_made_in_order(first):
    order = ("skip_whitespace_lines", "remove_comments", "copy_strings", "include_line_text")
    with pytest.raises(LookupError) as info:  # every option from `first` on raises
        logicalline.CreateLogicalLineParser(**{name: Raising(name) for name in order[first:]})
    assert info.value.args == (order[first],)
    with pytest.raises(TypeError):
        logicalline.CreateLogicalLineParser(1, 1, 1, 1, 1)
