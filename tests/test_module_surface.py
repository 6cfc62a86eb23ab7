import io
import itertools

import pytest

import logicalline
from model import LINE_TYPES, OPTIONS

KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
         "kGenericAttribKind": "generic attribute", "kImportedAttribKind": "imported attribute"}


def test_constants():  # the names themselves are checked against the stub by stubtest
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert constants == list(LINE_TYPES.values()) and len(set(map(id, constants))) == 26
    assert {name: getattr(logicalline, name) for name in KINDS} == KINDS
    for name in KINDS.keys() - {"kImportedAttribKind"}:
        info = getattr(logicalline, name[:-4] + "Info")
        assert info == (getattr(logicalline, name), None) and info[0] is getattr(logicalline, name)
    assert logicalline.COMMENT_TOKEN == 202 and not hasattr(logicalline, "kImportedAttribInfo")


class Raising:
    def __init__(self, name):
        self.name = name

    def __bool__(self):
        raise LookupError(self.name)


@pytest.mark.parametrize("number, flags", list(enumerate(itertools.product((0, 1), repeat=4))))
def test_options(number, flags):
    copy_strings, skip_whitespace_lines, remove_comments, include_line_text = flags
    want = [(["s", "=", "'a'" if copy_strings else "'<string>'"] + ["# tail\n"] * (1 - remove_comments),
             "s = 'a'  # tail\n" if include_line_text else None)]
    if not skip_whitespace_lines and not remove_comments:
        want.insert(0, (["# lead\n"], "# lead\n" if include_line_text else None))
    # The first few by position, the others by keyword or left on; any object is a truth value.
    k = number % 5
    keywords = {name: [[], None, ""][number % 3] for name, flag in zip(OPTIONS[k:], flags[k:])
                if not flag}
    parser = logicalline.CreateLogicalLineParser(*[flag and "x" for flag in flags[:k]], **keywords)
    lines = parser.GetLogicalLineList(io.BytesIO(b"# lead\ns = 'a'  # tail\n").readline)
    assert [([text for text, _ in line.fTokens], line.fLineText) for line in lines] == want
    order = ("skip_whitespace_lines", "remove_comments", "copy_strings", "include_line_text")
    with pytest.raises(LookupError) as info:  # the truth tests run in this order
        logicalline.CreateLogicalLineParser(**{name: Raising(name) for name in order[number % 4:]})
    assert info.value.args == (order[number % 4],)
    pytest.raises(TypeError, logicalline.CreateLogicalLineParser, 1, 1, 1, 1, 1)
