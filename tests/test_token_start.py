import random

import pytest

import logicalline
from model import first_code_unit, token_id_for_start


def assert_module_matches_model(inputs):
    ids = map(logicalline.GetIdForTokenStart, inputs)
    units = map(logicalline._GetFirstCodeUnit, inputs)
    for data, token_id, unit in zip(inputs, ids, units):
        assert (token_id, ord(unit)) == (token_id_for_start(data), first_code_unit(data)), data


@pytest.mark.parametrize("text, token_id", [
    ("<>", 29), ("!=", 29), ("!", 201), ("@=", 50), (":=", 53), ("->", 51), ("...", 52),
    ("..", 23), ("**=", 47), ("<<=", 45), ("//=", 49), ("/=", 40), ("`", 25), ("\\", 203),
    (".5", 2), ("5", 2), (".a", 23), ("_x", 1), ("x", 1), ("é", 1), ("²", 201), ("٣", 201),
    ("\U000E0041", 1),      # only the low 16 bits, U+0041, are classified
    ("\U00020000", 201),    # a letter whose low 16 bits are U+0000
    ("r'x'", 3), ("RB''", 3), ("br''", 3), ("Ur''", 3), ("fR''", 3), ("f'", 3), ("'", 3),
    ('"""', 3), ("bu''", 1), ("rr''", 1), ("rx", 1), ("bar'", 1), ("fr ", 1),
    ("#", 202), ("\n", 4), ("\r\n", 4), ("\r", 4),
    ("", 201), (" x", 201), ("\tx", 201), ("\0", 201), ("$", 201), ("?", 201),
])
def test_token_id_for_start(text, token_id):
    assert logicalline.GetIdForTokenStart(text) == token_id
    assert logicalline.GetIdForTokenStart(text.encode()) == token_id
    assert token_id_for_start(text.encode()) == token_id


@pytest.mark.parametrize("data, unit", [
    (b"abc", 0x61), (b"", 0), ("é".encode(), 0xE9), ("€".encode(), 0x20AC),
    ("😀".encode(), 0xF600), ("𝐀".encode(), 0xD400), (b"\x80", 0), (b"\xc3", 0),
    (b"\xc3A", 0), (b"\xe2\x82", 0), (b"\xf0\x9f\x98", 0), (b"\xf8\x80\x80\x80", 0),
    (b"\xff", 0), (b"\xc1\x81", 0x41), (b"\xed\xa0\x80", 0xD800),
    ("€uro", 0x20AC), ("", 0),  # str arguments are read as UTF-8
])
def test_first_code_unit(data, unit):
    result = logicalline._GetFirstCodeUnit(data)
    assert type(result) is str and len(result) == 1 and ord(result) == unit
    assert first_code_unit(data.encode() if isinstance(data, str) else data) == unit


@pytest.mark.parametrize("function", [logicalline.GetIdForTokenStart,
                                      logicalline._GetFirstCodeUnit])
@pytest.mark.parametrize("args, error", [
    ((), TypeError), ((b"a", b"b"), TypeError), ((None,), TypeError), ((7,), TypeError),
    ((bytearray(b"a"),), TypeError), (("\ud800",), UnicodeEncodeError),
])
def test_argument_errors(function, args, error):
    with pytest.raises(error):
        function(*args)


def test_every_short_input_matches_model():
    assert_module_matches_model([bytes([a]) for a in range(256)]
                                + [bytes([a, b]) for a in range(256) for b in range(256)])


def test_random_longer_inputs_match_model():
    rng = random.Random(20240607)
    pieces = [bytes([c]) for c in b"'\"rBuFx_1.#<=>*/!-\\\n\r \x80\xc3\xff"] + [
        b"\xe2\x82", b"\xf0\x9f", b"\xf3\xa0\x81", "é".encode(), "²".encode()]
    inputs = [b"".join(rng.choices(pieces, k=rng.randint(2, 6))) for _ in range(4000)]
    assert_module_matches_model(inputs + [rng.randbytes(rng.randint(3, 8)) for _ in range(2000)])


def test_every_three_byte_input_matches_model(request):
    if not request.config.getoption("--exhaustive"):
        pytest.skip("16.7M inputs; run with --exhaustive")
    for a in range(256):
        assert_module_matches_model([bytes([a, b, c]) for b in range(256) for c in range(256)])
