import io
import itertools

import pytest

import logicalline
from model import OPTIONS


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


@pytest.mark.parametrize("value", [[], "x", "", None, 0.0, (0,), object(), -1])
def test_options_take_truth_values(value):
    parser = logicalline.CreateLogicalLineParser(value, value, remove_comments=value,
                                                 include_line_text=value)
    assert effects(parser) == expected(*[bool(value)] * 4)


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
