"""Token starts, code units, and the token queries of a line."""
import random

import pytest

import logicalline
from model import first_code_unit, token_id_for_start
from test_model_agreement import read


def assert_module_matches_model(inputs):
    for data in inputs:
        assert (logicalline.GetIdForTokenStart(data), ord(logicalline._GetFirstCodeUnit(data))) == (
            token_id_for_start(data), first_code_unit(data)), data


@pytest.mark.parametrize("text, token_id", [
    ("<>", 29), ("!", 201), ("@=", 50), (":=", 53), ("->", 51), ("...", 52), ("..", 23),
    ("**=", 47), ("<<=", 45), ("//=", 49), ("/=", 40), ("`", 25), ("\\", 203), (".5", 2),
    (".a", 23), ("é", 1), ("²", 201), ("٣", 201),
    ("\U000E0041", 1), ("\U00020000", 201),  # only the low 16 bits (A, and NUL) are classified
    ("r'x'", 3), ("RB''", 3), ("Ur''", 3), ("fR''", 3), ("f'", 3), ('"""', 3),
    ("bu''", 1), ("rr''", 1), ("bar'", 1), ("fr ", 1),
    ("#", 202), ("\r\n", 4), ("\r", 4), ("", 201), (" x", 201), ("\0", 201), ("$", 201),
])
def test_token_id_for_start(text, token_id):
    assert logicalline.GetIdForTokenStart(text) == logicalline.GetIdForTokenStart(text.encode())
    assert logicalline.GetIdForTokenStart(text) == token_id == token_id_for_start(text.encode())


def test_first_code_unit_and_argument_errors():
    units = [logicalline._GetFirstCodeUnit(data) for data in (  # str is read as UTF-8
        b"", "😀".encode(), b"\xf0\x9f\x98", b"\xc1\x81", b"\xed\xa0\x80", "€uro")]
    assert units == ["\0", "\uf600", "\0", "A", "\ud800", "€"]
    for args in ((), (None,), (bytearray(b"a"),)):
        pytest.raises(TypeError, logicalline.GetIdForTokenStart, *args)


def test_short_and_random_inputs_match_model(request):
    rng = random.Random(20240607)
    pieces = [bytes([c]) for c in b"'\"rBuFx_1.#<=>*/!-\\\n\r \x80\xc3\xff"] + [
        b"\xe2\x82", b"\xf0\x9f", b"\xf3\xa0\x81", "é".encode(), "²".encode()]
    assert_module_matches_model([bytes([a, b]) for a in range(256) for b in range(256)]
                                + [b"".join(rng.choices(pieces, k=rng.randint(2, 6)))
                                   for _ in range(4000)])
    if request.config.getoption("--exhaustive"):
        for a in range(256):
            assert_module_matches_model([bytes([a, b, c]) for b in range(256) for c in range(256)])


@pytest.mark.parametrize("source, index, kind, kind_skipped, text, text_skipped", [
    (b"x = 1  # note\n", 3, 202, 202, "# note\n", "# note\n"),
    (b"s = 'abc'\n", 2, 3, 3, "'abc'", "'abc'"),
    (b"s = 'abc\n", 2, 201, 3, "<errortoken> 'abc", "'abc"),
    (b"x = $\n", 2, 201, 201, "<errortoken> $", "$"),
    (b"x = \xff\n", 2, 201, 201, "<errortoken> \ufffd", "\ufffd"),
])
def test_token_kind_and_text(source, index, kind, kind_skipped, text, text_skipped):
    (line,) = read(source, remove_comments=False)
    assert (line.GetTokenType(index), line.GetTokenType(i=index, skip_error_prefix=7),
            line.GetTokenString(index), line.GetTokenString(skip_error_prefix=True, i=index)) == (
        kind, kind_skipped, text, text_skipped)


@pytest.mark.parametrize("method", ["GetTokenType", "GetTokenString"])
def test_bad_token_arguments(method):
    call = getattr(read(b"x = 1\n")[0], method)
    for index in (-1, 3):
        pytest.raises(IndexError, call, index).match("^Invalid token index$")
    for args, kwargs, error in [(("0",), {}, TypeError), ((0,), {"skip": 1}, TypeError),
                                ((2 ** 40,), {}, OverflowError)]:
        pytest.raises(error, call, *args, **kwargs)
