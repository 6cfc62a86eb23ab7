import io

import pytest

import logicalline
from model import LINE_TYPES

KINDS = {"kClassAttribKind": "class def", "kFunctionAttribKind": "function def",
         "kGenericAttribKind": "generic attribute", "kImportedAttribKind": "imported attribute"}


def test_constants():  # the names themselves are checked against the stub by stubtest
    constants = [getattr(logicalline, name) for name in LINE_TYPES]
    assert constants == list(LINE_TYPES.values()) and len(set(map(id, constants))) == 26
    for name in KINDS.keys() - {"kImportedAttribKind"}:  # the kinds, and an info for each
        info = getattr(logicalline, name[:-4] + "Info")
        assert info == (KINDS[name], None) and info[0] is getattr(logicalline, name)
    assert logicalline.kImportedAttribKind == KINDS["kImportedAttribKind"] and not hasattr(
        logicalline, "kImportedAttribInfo") and logicalline.COMMENT_TOKEN == 202


def test_options_by_position_keyword_and_truth():  # what each does is read against the model
    order = ("skip_whitespace_lines", "remove_comments", "copy_strings", "include_line_text")
    raising = type("Raising", (), {"__init__": lambda self, name: setattr(self, "name", name),
                                   "__bool__": lambda self: {}[self.name]})
    for first in range(4):  # the truth tests run in this order: the first that raises stops
        options = {name: raising(name) if i >= first else 1 for i, name in enumerate(order)}
        with pytest.raises(KeyError, match=order[first]):
            logicalline.CreateLogicalLineParser(**options)
    pytest.raises(TypeError, logicalline.CreateLogicalLineParser, 1, 1, 1, 1, 1)
    source = io.BytesIO(b"# lead\ns = 'a'  # tail\n").readline
    lines = logicalline.CreateLogicalLineParser("", [], remove_comments=None).GetLogicalLineList(source)
    assert [(t, line.fLineText) for line in lines for t, _ in line.fTokens] == [
        ("# lead\n", "# lead\n"), ("s", "s = 'a'  # tail\n"), ("=", "s = 'a'  # tail\n"),
        ("'<string>'", "s = 'a'  # tail\n"), ("# tail\n", "s = 'a'  # tail\n")]
