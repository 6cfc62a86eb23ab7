import io

import pytest

import logicalline


def line_of(source, **options):
    parser = logicalline.CreateLogicalLineParser(**options)
    return parser.GetLogicalLineList(io.BytesIO(source).readline)[0]


@pytest.mark.parametrize("source, options, index, kind, kind_skipped, text, text_skipped", [
    (b"foo = 1\n", {}, 0, 1, 1, "foo", "foo"),
    (b"x = 0x1F\n", {}, 2, 2, 2, "0x1F", "0x1F"),
    (b"x = 1.5e3\n", {}, 2, 2, 2, "1.5e3", "1.5e3"),
    (b"x = 1  # note\n", {"remove_comments": False}, 3, 202, 202, "# note\n", "# note\n"),
    (b"a <> b\n", {}, 1, 29, 29, "!=", "!="),
    (b"s = 'abc'\n", {}, 2, 3, 3, "'abc'", "'abc'"),
    (b"s = 'abc'\n", {"copy_strings": False}, 2, 3, 3, "'<string>'", "'<string>'"),
    (b"s = 'abc\n", {}, 2, 201, 3, "<errortoken> 'abc", "'abc"),
    (b"x = $\n", {}, 2, 201, 201, "<errortoken> $", "$"),
    (b"\xc3\xa9t\xc3\xa9 = 1\n", {}, 0, 1, 1, "\u00e9t\u00e9", "\u00e9t\u00e9"),
    (b"x = \xff\n", {}, 2, 201, 201, "<errortoken> \ufffd", "\ufffd"),
])
def test_token_kind_and_text(source, options, index, kind, kind_skipped, text, text_skipped):
    line = line_of(source, **options)
    assert (line.GetTokenType(index), line.GetTokenType(index, 1)) == (kind, kind_skipped)
    assert (line.GetTokenString(index), line.GetTokenString(index, 1)) == (text, text_skipped)


def test_keywords_and_any_nonzero_skip_flag():
    line = line_of(b"s = 'abc\n")
    assert line.GetTokenType(i=2, skip_error_prefix=1) == line.GetTokenType(2, -1) == 3
    assert line.GetTokenType(2, skip_error_prefix=7) == 3
    assert line.GetTokenString(skip_error_prefix=True, i=2) == "'abc"
    assert line.GetTokenString(i=2) == "<errortoken> 'abc"


@pytest.mark.parametrize("method", ["GetTokenType", "GetTokenString"])
@pytest.mark.parametrize("args, kwargs, error", [
    ((-1,), {}, IndexError), ((3,), {}, IndexError), ((2 ** 31 - 1,), {}, IndexError),
    (("0",), {}, TypeError), ((0,), {"skip": 1}, TypeError), ((2 ** 40,), {}, OverflowError),
])
def test_bad_arguments(method, args, kwargs, error):
    with pytest.raises(error) as info:
        getattr(line_of(b"x = 1\n"), method)(*args, **kwargs)
    assert error is not IndexError or str(info.value) == "Invalid token index"
