import io
import itertools

import pytest

import logicalline

OPTIONS = ("copy_strings", "skip_whitespace_lines", "remove_comments", "include_line_text")
# The order in which the parser takes the options' truth values.
TRUTH_ORDER = ("skip_whitespace_lines", "remove_comments", "copy_strings", "include_line_text")
SOURCE = b"# lead\ns = 'a'  # tail\n"


def effects(parser):
    """Returns what the parser makes of SOURCE: the token texts of each line and its text."""
    lines = parser.GetLogicalLineList(io.BytesIO(SOURCE).readline)
    return [([text for text, _ in line.fTokens], line.fLineText) for line in lines]


def expected(copy_strings, skip_whitespace_lines, remove_comments, include_line_text):
    comment = [] if remove_comments else ["# tail\n"]  # a comment keeps its line feed
    lines = [(["s", "=", "'a'" if copy_strings else "'<string>'"] + comment,
              "s = 'a'  # tail\n" if include_line_text else None)]
    if not skip_whitespace_lines and not remove_comments:
        lines.insert(0, (["# lead\n"], "# lead\n" if include_line_text else None))
    return lines


def test_defaults_turn_every_option_on():
    assert effects(logicalline.CreateLogicalLineParser()) == expected(True, True, True, True)


@pytest.mark.parametrize("flags", list(itertools.product((0, 1), repeat=4)))
def test_positional_options(flags):
    assert effects(logicalline.CreateLogicalLineParser(*flags)) == expected(*flags)


@pytest.mark.parametrize("name", OPTIONS)
def test_single_keyword_leaves_the_others_on(name):
    parser = logicalline.CreateLogicalLineParser(**{name: False})
    assert effects(parser) == expected(*(option != name for option in OPTIONS))


@pytest.mark.parametrize("value, truth", [
    ([], False), ("x", True), ("", False), (None, False), (0.0, False), ((0,), True),
    (object(), True), (-1, True),
])
def test_options_take_truth_values(value, truth):
    parser = logicalline.CreateLogicalLineParser(value, value, remove_comments=value,
                                                 include_line_text=value)
    assert effects(parser) == expected(truth, truth, truth, truth)


class Raising:
    def __init__(self, error):
        self.error = error

    def __bool__(self):
        raise self.error


@pytest.mark.parametrize("first", range(4))
def test_first_raising_truth_test_propagates(first):
    # Every option from `first` on raises; the earliest one in truth order must win.
    raising = {name: Raising(LookupError(name)) for name in TRUTH_ORDER[first:]}
    with pytest.raises(LookupError) as info:
        logicalline.CreateLogicalLineParser(**raising)
    assert info.value.args == (TRUTH_ORDER[first],)


@pytest.mark.parametrize("args, kwargs", [
    ((1, 1, 1, 1, 1), {}),
    ((), {"strip_comments": True}),
    ((1,), {"copy_strings": True}),
])
def test_bad_arguments_are_refused(args, kwargs):
    with pytest.raises(TypeError):
        logicalline.CreateLogicalLineParser(*args, **kwargs)
