"""GetTokenType and GetTokenString over tokens of real lines."""

import io

import pytest

import logicalline


def line_of(source, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


NO_COMMENT_REMOVAL = {"remove_comments": False}
SHARED_STRINGS = {"copy_strings": False}


@pytest.mark.parametrize("source, options, index, kind, kind_skipped, text, text_skipped", [
    (b"foo = 1\n", {}, 0, 1, 1, "foo", "foo"),
    (b"x = 0x1F\n", {}, 2, 2, 2, "0x1F", "0x1F"),
    (b"x = 1.5e3\n", {}, 2, 2, 2, "1.5e3", "1.5e3"),
    (b"x = 1  # note\n", NO_COMMENT_REMOVAL, 3, logicalline.COMMENT_TOKEN, 202, "# note\n", "# note\n"),
    (b"a <> b\n", {}, 1, 29, 29, "!=", "!="),
    (b"s = 'abc'\n", {}, 2, 3, 3, "'abc'", "'abc'"),
    (b"s = 'abc'\n", SHARED_STRINGS, 2, 3, 3, "'<string>'", "'<string>'"),
    (b"s = 'abc\n", {}, 2, 201, 3, "<errortoken> 'abc", "'abc"),
    (b"x = $\n", {}, 2, 201, 201, "<errortoken> $", "$"),
    (b"\xc3\xa9t\xc3\xa9 = 1\n", {}, 0, 1, 1, "\u00e9t\u00e9", "\u00e9t\u00e9"),
    (b"x = \xff\n", {}, 2, 201, 201, "<errortoken> \ufffd", "\ufffd"),
])
def test_token_kind_and_text(source, options, index, kind, kind_skipped, text, text_skipped):
    line = line_of(source, **options)
    assert line.GetTokenType(index) == kind
    assert line.GetTokenType(index, 1) == kind_skipped
    assert line.GetTokenString(index) == text
    assert line.GetTokenString(index, 1) == text_skipped


def test_queries_agree_with_tokens_tuple():
    line = line_of(b"def f(a, *b, **c) -> 'r':\n")
    assert tuple(line.GetTokenString(i) for i in range(line.fTokenCount)) == \
        tuple(text for text, _ in line.fTokens)


@pytest.mark.parametrize("call", [
    lambda line: line.GetTokenType(i=2, skip_error_prefix=1),
    lambda line: line.GetTokenType(2, skip_error_prefix=7),
    lambda line: line.GetTokenType(2, -1),
])
def test_skip_flag_by_keyword_and_any_nonzero_value(call):
    assert call(line_of(b"s = 'abc\n")) == 3


def test_get_token_string_by_keyword():
    line = line_of(b"s = 'abc\n")
    assert line.GetTokenString(skip_error_prefix=True, i=2) == "'abc"
    assert line.GetTokenString(i=2) == "<errortoken> 'abc"


@pytest.mark.parametrize("method", ["GetTokenType", "GetTokenString"])
@pytest.mark.parametrize("index", [-1, 3, 2 ** 31 - 1])
def test_index_out_of_range(method, index):
    line = line_of(b"x = 1\n")
    with pytest.raises(IndexError, match="^Invalid token index$"):
        getattr(line, method)(index)


@pytest.mark.parametrize("method", ["GetTokenType", "GetTokenString"])
@pytest.mark.parametrize("args, kwargs, error", [
    (("0",), {}, TypeError),
    ((0,), {"skip": 1}, TypeError),
    ((2 ** 40,), {}, OverflowError),
])
def test_bad_arguments(method, args, kwargs, error):
    with pytest.raises(error):
        getattr(line_of(b"x = 1\n"), method)(*args, **kwargs)


def test_tokens_tuple_is_built_once():
    line = line_of(b"x = (1,\n     2)\n")
    first = line.fTokens
    assert line.fTokens is first
    assert first[5] == ("2", (1, 5))
