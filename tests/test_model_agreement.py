"""Compares every field of the module's logical lines with the model, on standard library
sources and on generated hostile inputs, with every option set and reading window."""
import glob
import io
import itertools
import os
import random
import subprocess
import sys

import pytest

import logicalline
import model

ALL_OPTIONS = list(itertools.product((True, False), repeat=4))
DEFAULTS = (True, True, True, True)
TYPE_INDEX = {getattr(logicalline, name): i for i, name in enumerate(model.LINE_TYPES)}
STDLIB = os.path.dirname(os.__file__)


def pytest_generate_tests(metafunc):
    if "stdlib_case" in metafunc.fixturenames:
        files = sorted(os.path.relpath(path, STDLIB) for path in glob.glob(
            os.path.join(STDLIB, "**", "*.py"), recursive=True) if "-packages" not in path)
        if metafunc.config.getoption("--full-stdlib"):
            cases = [(f, o) for f in files for o in (DEFAULTS, (False, False, False, True))]
        else:
            sample = files[::len(files) // 40]
            cases = [(f, o) for f in sample[:2] for o in ALL_OPTIONS] + [(f, DEFAULTS) for f in sample]
        metafunc.parametrize("stdlib_case", cases)


def outcome(read):
    """The line views that read() gives, or the error it raises."""
    try:
        return read()
    except (ValueError, SystemError, OverflowError) as error:
        return type(error).__name__, "" if isinstance(error, SystemError) else str(error)


def decoded(text):
    try:
        return text()
    except UnicodeDecodeError:
        return "<undecodable>"


def model_view(line):
    text = decoded(lambda: line["line_text"] and line["line_text"].decode())
    return dict(line, tokens=[t.decode("utf-8", "replace") for t in line["tokens"]], line_text=text)


def module_view(line):
    text = decoded(lambda: line.fLineText)
    tokens = [t for t, _ in line.fTokens]
    assert [line.GetTokenString(i) for i in range(line.fTokenCount)] == tokens
    return dict(
        type=TYPE_INDEX[line.fType], local_scope_name=line.fLocalScopeName,
        first_line=line.fFirstLine, line_count=line.fLineCount, indent=line.fIndentLevel,
        tabs=int(line.fTabsInIndent), spaces=int(line.fSpacesInIndent),
        incomplete=int(line.fIncomplete), tokens=tokens, positions=[p for _, p in line.fTokens],
        line_text=text)


def assert_agreement(chunks, opts, first_line=0, line_count=-1, newest=False):
    """Both entry points read as the model does; a buffer is cut where BytesIO.readline cuts.
    With `newest`, both read as the newest Python the module knows."""
    version = logicalline.kNewestFeatureVersion if newest else None
    data = b"".join(chunks)
    parser = logicalline.CreateLogicalLineParser(*opts, feature_version=version)
    lines = io.BytesIO(data).readlines()
    for path, source, read in [
            # A readline call after the final b"" raises StopIteration, which would show here.
            ("readline", chunks, lambda: parser.GetLogicalLineList(
                iter(chunks + [b""]).__next__, first_line, line_count)),
            ("buffer", lines, lambda: parser.GetLogicalLineListFromBuffer(
                data, first_line, line_count))]:
        want = outcome(lambda: [model_view(line) for line in
                                model.model_lines(source, *opts, first_line, line_count,
                                                  newest)])
        got = outcome(lambda: [module_view(line) for line in read()])
        if got == want:
            continue
        where = f"{source!r}"[:400] + f"\n{path}, {opts}, first_line {first_line}, count {line_count}"
        if isinstance(got, list) and isinstance(want, list):
            i = next((i for i, (g, w) in enumerate(zip(got, want)) if g != w), len(got))
            got, want, where = got[i:i + 1], want[i:i + 1], where + f"\nlogical line {i} differs"
        pytest.fail(f"{where}\nmodule: {str(got)[:800]}\nmodel:  {str(want)[:800]}")


def read(source, *window, **options):
    """The lines of `source` (bytes, or the chunks readline gives), once the model agrees."""
    chunks = io.BytesIO(source).readlines() if isinstance(source, bytes) else list(source)
    opts = [options.get(name, True) for name in model.OPTIONS]
    assert_agreement(chunks, opts, *window)
    parser = logicalline.CreateLogicalLineParser(*opts)
    return parser.GetLogicalLineList(iter(chunks + [b""]).__next__, *window)


def test_stdlib_source(stdlib_case):
    path, opts = stdlib_case
    with open(os.path.join(STDLIB, path), "rb") as f:
        assert_agreement(io.BytesIO(f.read()).readlines(), opts)


# Weighted towards what trips a reader: quotes, escapes, every kind of line break, brackets,
# words that end a logical line early, and malformed or non-ASCII UTF-8.
FRAGMENTS = {
    b"'": 6, b'"': 4, b"'''": 4, b'"""': 3, b"\\": 6, b"\\\\": 2, b"(": 4, b")": 4, b"[": 2,
    b"]": 2, b"{": 1, b"}": 1, b"\n": 12, b"\r\n": 4, b"\r": 3, b"\t": 3, b" ": 10, b"    ": 4,
    b"\x0c": 1, b"\x0b": 1, b"def ": 3, b"class ": 2, b"if ": 3, b"else": 3, b"else:": 1,
    b"for ": 3, b"@": 3, b"async ": 1, b"return ": 1, b"import ": 1, b"print ": 1, b"with ": 1,
    b"pass": 1, b"x": 6, b"f": 2, b"y1": 2, b"_a": 1, b"=": 4, b" = ": 3, b"==": 1, b"<>": 1,
    b":": 3, b",": 3, b".": 1, b"...": 1, b"->": 1, b":=": 1, b"**=": 1, b"0x_1F": 1,
    b"1e-5": 1, b"1__0": 1, b".5": 1, b"5j": 1, b"#c": 3, b"r'": 2, b'rb"': 1, b"bu'": 1,
    b"U'": 1, b"$": 1, b"?": 1, b"!": 1, b"`": 1, b"\x80": 3, b"\xff": 2, b"\xc3": 2,
    b"\xc3\xa9": 2, b"\xe2\x82\xac": 1, b"\xf0\x9f\x98\x80": 1, b"\xc2\xb2": 1, b"\xe0\xa5\xa9": 1,
    b"\xef\xbb\xbf": 1}


# The same, but for what the newest Python reads otherwise: lazy imports, and a u and r pair
# before a quote. No f begins a formatted string, which the model leaves to the module's tests.
NEWEST_FRAGMENTS = {**{text: weight for text, weight in FRAGMENTS.items() if text != b"f"},
                    b"lazy ": 2, b"lazy import ": 2, b"lazy from ": 2, b"ur'": 1, b'Ru"': 1}


def hostile_chunks(seed, nul=False, fragments=FRAGMENTS):
    rng = random.Random(seed)
    data = b"".join(rng.choices(list(fragments), list(fragments.values()), k=rng.randint(1, 60)))
    data = (b"\xef\xbb\xbf" if rng.random() < 0.1 else b"") + data  # a byte-order mark
    if nul:
        at = rng.randrange(len(data) + 1)
        data = data[:at] + b"\0" + data[at:]
    # Mostly cut after line feeds, as readline does, but also anywhere, so that chunks end
    # without a terminator or hold several line breaks.
    cuts = {i + 1 for i, c in enumerate(data) if c == 0x0A and rng.random() < 0.8}
    cuts |= {rng.randrange(1, len(data) + 1) for _ in range(rng.randint(0, 4))} | {len(data)}
    bounds = [0] + sorted(cuts)
    return [data[a:b] for a, b in zip(bounds, bounds[1:])]


@pytest.mark.parametrize("block", range(20))
def test_hostile_inputs(block):
    for seed in range(block * 100, block * 100 + 100):
        rng = random.Random(-seed)
        # A negative first line is refused, and so is a count below -1; past the largest line
        # number is refused, never wrapped.
        window = rng.choice([(0, -1)] * 6 + [(7, -1), (0, 0), (3, 1), (0, 2), (5, 4), (0, -5),
                                             (-1, -1), (1, -2), (2**31 - 2, 3)])
        for opts in rng.sample(ALL_OPTIONS, 3):
            assert_agreement(hostile_chunks(seed, nul=seed % 8 == 0), opts, *window)


@pytest.mark.parametrize("block", range(3))
def test_hostile_inputs_read_as_the_newest_python(block):
    for seed in range(block * 100, block * 100 + 100):
        for opts in random.Random(seed).sample(ALL_OPTIONS, 2):
            assert_agreement(hostile_chunks(seed, fragments=NEWEST_FRAGMENTS), opts, newest=True)


def run_isolated(code):
    """Runs code in a fresh interpreter, where a create hook can stay for good."""
    path = [os.path.dirname(logicalline.__file__), os.path.dirname(os.path.abspath(__file__)),
            os.environ.get("PYTHONPATH", "")]
    return subprocess.run([sys.executable, "-c", code], capture_output=True, text=True,
                          errors="replace", timeout=300,
                          env=dict(os.environ, PYTHONPATH=os.pathsep.join(path)))
