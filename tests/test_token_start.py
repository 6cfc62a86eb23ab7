import random

import pytest

import logicalline

# A small stand-alone model of how a token start and a first code unit are decided,
# written from the rules rather than from the C++ code, to compare the module against.
OPERATORS = {text.encode(): token_id for token_id, text in enumerate(
    "( ) [ ] : , ; + - * / | & < > = . % ` { } == != <= >= ~ ^ << >> ** += -= *= /= "
    "%= &= |= ^= <<= >>= **= // //= @ -> ... :=".split(), start=7)}
OPERATORS.update({b"<>": 29, b"\\": 203})
STRING_PREFIXES = {b"", b"r", b"b", b"u", b"f", b"rb", b"ru", b"rf", b"br", b"ur", b"fr"}
UTF8_LEADS = ((0xC0, 0xDF, 0x1F, 2), (0xE0, 0xEF, 0x0F, 3), (0xF0, 0xF7, 0x07, 4))


def first_code_unit(data):
    if not data or data[0] < 0x80:
        return data[0] if data else 0
    for low, high, mask, length in UTF8_LEADS:
        if low <= data[0] <= high:
            break
    else:
        return 0  # a continuation byte or F8..FF
    if len(data) < length:
        return 0
    value = data[0] & mask
    for byte in data[1:length]:
        if byte & 0xC0 != 0x80:
            return 0
        value = value << 6 | byte & 0x3F
    return value & 0xFFFF  # astral characters keep their low 16 bits


def token_id_for_start(data):
    for n, byte in enumerate(data[:3]):
        if byte in b"'\"":  # a prefix is whatever precedes the first quote
            if data[:n].lower() in STRING_PREFIXES:
                return 3
            break
    if not data:
        return 201
    b0 = data[0]
    if b0 == 0x5F or chr(b0 if b0 < 0x80 else first_code_unit(data)).isalpha():
        return 1
    if b0 in b"\r\n":
        return 4
    if data[:1].isdigit() or (b0 == 0x2E and data[1:2].isdigit()):
        return 2
    if b0 == 0x23:
        return 202
    for n in (3, 2, 1):
        if len(data) >= n and data[:n] in OPERATORS:
            return OPERATORS[data[:n]]
    return 201


def assert_module_matches_model(inputs):
    ids = list(map(logicalline.GetIdForTokenStart, inputs))
    units = [ord(unit) for unit in map(logicalline._GetFirstCodeUnit, inputs)]
    for data, token_id, unit in zip(inputs, ids, units):
        assert (token_id, unit) == (token_id_for_start(data), first_code_unit(data)), data


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
])
def test_first_code_unit(data, unit):
    result = logicalline._GetFirstCodeUnit(data)
    assert type(result) is str and len(result) == 1 and ord(result) == unit
    assert first_code_unit(data) == unit


def test_str_arguments_are_read_as_utf8():
    assert logicalline._GetFirstCodeUnit("€uro") == "€"
    assert logicalline._GetFirstCodeUnit("") == "\0"


@pytest.mark.parametrize("function", [logicalline.GetIdForTokenStart,
                                      logicalline._GetFirstCodeUnit])
@pytest.mark.parametrize("args, kwargs, error", [
    ((), {}, TypeError), ((b"a", b"b"), {}, TypeError), ((None,), {}, TypeError),
    ((7,), {}, TypeError), ((bytearray(b"a"),), {}, TypeError),
    ((), {"text": b"a"}, TypeError), (("\ud800",), {}, UnicodeEncodeError),
])
def test_argument_errors(function, args, kwargs, error):
    with pytest.raises(error):
        function(*args, **kwargs)


def test_every_short_input_matches_model():
    assert_module_matches_model([bytes([a]) for a in range(256)])
    assert_module_matches_model([bytes([a, b]) for a in range(256) for b in range(256)])


def test_random_longer_inputs_match_model():
    rng = random.Random(20240607)
    pieces = [b"'", b'"', b"r", b"B", b"u", b"F", b"x", b"_", b"1", b".", b"#", b"<", b"=",
              b">", b"*", b"/", b"!", b"-", b"\\", b"\n", b"\r", b" ", b"\x80", b"\xc3",
              b"\xe2\x82", b"\xf0\x9f", b"\xf3\xa0\x81", b"\xff", "é".encode(), "²".encode()]
    inputs = [b"".join(rng.choices(pieces, k=rng.randint(2, 6))) for _ in range(4000)]
    inputs += [rng.randbytes(rng.randint(3, 8)) for _ in range(2000)]
    assert_module_matches_model(inputs)


def test_every_three_byte_input_matches_model(request):
    if not request.config.getoption("--exhaustive"):
        pytest.skip("16.7M inputs; run with --exhaustive")
    for a in range(256):
        assert_module_matches_model([bytes([a, b, c]) for b in range(256) for c in range(256)])
