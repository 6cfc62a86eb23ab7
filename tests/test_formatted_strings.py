"""Strings as newer interpreters read them (feature_version): an f-string, or a t-string from
(3, 14), is one token from its prefix to its closing quote, as the interpreter's own tokenize
spans it from FSTRING_START to FSTRING_END; the reference runs as a subprocess, so that any
interpreter runs these tests."""
import glob
import io
import json
import os
import random
import shutil
import subprocess

import pytest

import logicalline
from test_model_agreement import hostile_chunks

# Prints, for each source given as a latin-1 str in the JSON on stdin, its outermost
# f-strings as [start line, start byte column, end line, end byte column], or an error.
REFERENCE = r"""
import io, json, sys, tokenize
def spans(data):
    text = data.decode(tokenize.detect_encoding(io.BytesIO(data).readline)[0])
    lines, found, depth = text.split("\n"), [], 0
    col = lambda row, c: len(lines[row - 1][:c].encode())
    for t in tokenize.generate_tokens(io.StringIO(text).readline):
        if t.type == tokenize.FSTRING_START:
            start, depth = (start if depth else t.start), depth + 1
        elif t.type == tokenize.FSTRING_END:
            depth -= 1
            if not depth:
                found.append([start[0] - 1, col(*start), t.end[0] - 1, col(*t.end)])
    return found
def read(item):
    try:
        return spans(open(item, "rb").read() if item.startswith("/") else item.encode("latin-1"))
    except (SyntaxError, tokenize.TokenError) as error:
        return str(error)
json.dump([read(item) for item in json.load(sys.stdin)], sys.stdout)
"""


def reference(interpreter, items):
    """The reference spans of each source (bytes) or file path (str), by `interpreter`."""
    python = shutil.which(interpreter)
    if not python:
        pytest.skip(f"{interpreter} is not installed")
    items = [i if isinstance(i, str) else i.decode("latin-1") for i in items]
    done = subprocess.run([python, "-c", REFERENCE], input=json.dumps(items), text=True,
                          capture_output=True, timeout=600, check=True)
    return json.loads(done.stdout)


def parser(minor, **options):
    return logicalline.CreateLogicalLineParser(feature_version=(3, minor), **options)


def tokens_by_start(data, minor):
    lines = parser(minor).GetLogicalLineListFromBuffer(data)
    return {(line.fFirstLine + row, col): text for line in lines for text, (row, col) in line.fTokens}


def assert_spans_agree(data, spans, minor):
    starts = [0]
    for line in data.split(b"\n"):
        starts.append(starts[-1] + len(line) + 1)
    got = tokens_by_start(data, minor)
    for row, col, end_row, end_col in spans:
        text = data[starts[row] + col:starts[end_row] + end_col].decode("utf-8", "replace")
        assert got.get((row, col)) == text, (data[:300], row, col)


# Valid since 3.12: what the fields of an f-string may hold, and what ends them.
CASES = [
    b"f'{f' {d}\\n' if d else ''} def {name}(x)'\n",   # the quote of the string itself
    b"x = f'({', '.join(args)})' + y\n",
    b"s = f\"{a +\n b}\" + f'{c\n}'\ny = 1\n",          # line breaks in single-quoted strings
    b"f'{x # it's a comment, \"}\" too\n  + 1}'\n",
    b"f'{x:{width}.{precision}f} {y!r:>{w}} {z=} {z = !s:^9}'\n",
    b"f'{a!=b} {x:=5} {(x:=5)} {d[1:2]} {lambda: 1} {({1: 2})[1]}'\n",
    b"f'{{}} {{{x}}} }}{{ \\N{BULLET} {x:{y}}}}'\n",
    b"rf'\\{x}\\N{y}' Rf\"\\\"{'q'}\" fR'''{x\n}\\\\''' + 1\n",
    b"x = rf\"\\N{'\"'}\" + 1\n",                         # no named escape in a raw string
    b'f"""{x:a\n\'b\'} {"""\ndoc"""} #{{\n"""\n',          # a line break ends a format spec
    b"f'{f'{f'{f'{1}'}'}'}' f'{\"\\\\\"}' f'{x}' 'tail'\n",
    b"print(f'caf\xc3\xa9 {\xc3\xa9t\xc3\xa9!a}', f\"{'}'}\")\n",
    b"f'{x\\\n}' f'a\\\nb{y}'\n",                      # backslash continuations
    b"d = {f'{k}': v for k, v in f(f'''{\n  a}''')}\r\nz = 1\r\n",
]


@pytest.mark.parametrize("interpreter, minor", [("python3.12", 12), ("python3.13", 13)])
def test_outermost_strings_are_tokens_as_the_interpreter_spans_them(interpreter, minor):
    for data, spans in zip(CASES, reference(interpreter, CASES)):
        assert isinstance(spans, list) and spans, (data, spans)
        assert_spans_agree(data, spans, minor)


def as_template(data):
    return data.replace(b"f'", b"t'").replace(b'f"', b't"').replace(b"rf'", b"rt'").replace(
        b"Rf\"", b"Rt\"").replace(b"fR'", b"tR'")


@pytest.mark.parametrize("data", CASES)
def test_template_strings_read_as_the_formatted_strings_they_mirror_from_314(data):
    template = as_template(data)
    formatted = parser(13).GetLogicalLineListFromBuffer(data)
    got = parser(14).GetLogicalLineListFromBuffer(template)
    assert [[(as_template(t.encode()), p) for t, p in line.fTokens] for line in formatted] == [
        [(t.encode(), p) for t, p in line.fTokens] for line in got]
    older = [text for line in parser(13).GetLogicalLineListFromBuffer(b"t'{x}'\n")
             for text, _ in line.fTokens]
    assert older == ["t", "'{x}'"]  # a name, then a string, before 3.14


@pytest.mark.parametrize("source, lines", [
    # An open field acts as an open bracket; a statement keyword ends the string before its line.
    (b"x = f'{a\ndef g(): pass\n", [(["x", "=", "<errortoken> f'{a\n"], True), (["def"], False)]),
    (b"x = f'{a\n  + b}' + c\n", [(["x", "=", "f'{a\n  + b}'", "+", "c"], False)]),
    (b"x = f'{a\nif b else c}'\n", [(["x", "=", "f'{a\nif b else c}'"], False)]),
    (b"f'{a if b\nelse c}'\n", [(["f'{a if b\nelse c}'"], False)]),
    (b"x = f'{[i for i in y\nif i]}'\n", [(["x", "=", "f'{[i for i in y\nif i]}'"], False)]),
    (b"x = f'{a\n@deco\n", [(["x", "=", "<errortoken> f'{a\n"], True), (["@"], False)]),
    (b"x = f'{a\nif b:\n", [(["x", "=", "<errortoken> f'{a\n"], True), (["if"], False)]),
    # A literal part, a format spec or a plain string in a field ends at its line's end.
    (b"s = f'abc {x}\ny = 1\n", [(["s", "=", "<errortoken> f'abc {x}"], False), (["y"], False)]),
    (b"s = f'{x:>\n", [(["s", "=", "<errortoken> f'{x:>"], False)]),
    (b"s = f'{x + 'ab\nc'}'\n", [(["s", "=", "<errortoken> f'{x + 'ab"], False),
                                 (["c", "'}'"], False)]),
    (b"s = f'''{x\n", [(["s", "=", "<errortoken> f'''{x\n"], True)]),  # the input ends inside
    (b"f'{'", [(["<errortoken> f'{'"], True)]),
])
def test_half_typed_strings_swallow_no_more_than_a_bracket(source, lines):
    got = parser(12, copy_strings=True).GetLogicalLineListFromBuffer(source)
    want = [(texts, incomplete) for texts, incomplete in lines]
    assert [([t for t, _ in line.fTokens][:len(texts)], line.fIncomplete)
            for line, (texts, _) in zip(got, want)] == want
    assert len(got) == len(want)


@pytest.mark.parametrize("depth, kind", [(149, 3), (150, 201)])
def test_nesting_is_bounded_without_using_the_stack(depth, kind):
    data = b"x = " + b"f'{" * depth + b"1" + b"}'" * depth + b"\ny = 2\n"
    first, second = parser(12).GetLogicalLineListFromBuffer(data)
    assert first.GetTokenType(2) == kind and second.fFirstLine == 1
    assert parser(12).GetLogicalLineListFromBuffer(b"f'{" * 100000 + b"\n")[0].fTokenCount == 1


@pytest.mark.parametrize("version, error", [
    ((3,), TypeError), ([3, 12], TypeError), ((3, "12"), TypeError), (312, TypeError),
    ((2, 7), ValueError), ((4, 0), ValueError), ((3, -1), ValueError), ((3, 2**70), ValueError),
])
def test_feature_version_is_a_tuple_of_two_ints_with_major_3(version, error):
    with pytest.raises(error, match="feature_version"):
        logicalline.CreateLogicalLineParser(feature_version=version)
    with pytest.raises(TypeError):  # keyword only
        logicalline.CreateLogicalLineParser(True, True, True, True, (3, 12))


def test_token_queries_know_template_strings_only_on_lines_read_with_them():
    line = parser(14, copy_strings=True).GetLogicalLineListFromBuffer(b"x = (t'{a}', Rt'\n")[0]
    assert [line.GetTokenType(i, 1) for i in range(line.fTokenCount)] == [1, 22, 7, 3, 12, 3]
    assert line.GetTokenType(5) == 201
    assert logicalline.GetIdForTokenStart("t'{a}'") == 1  # a bare text reads as by default
    assert parser(11).GetLogicalLineListFromBuffer(b"f'{'a'}'\n")[0].fTokens[0][0] == "f'{'"


def test_every_entry_point_reads_with_the_option():
    old, new = b"a = 1\nx = f'{'b'}'\n", b"a = 2\nx = f'{'b'}'\ny = f'{\n 'c'}'\n"
    lines = parser(13).GetLogicalLineListFromBuffer(old)
    parser(13).UpdateLogicalLineList(lines, new, 0, 2, 4)
    assert [l.fTokens for l in lines] == [l.fTokens for l in parser(13).GetLogicalLineList(
        io.BytesIO(new).readline)]
    assert lines[2].fTokens[2] == ("f'{\n 'c'}'", (0, 4))


def test_both_entry_points_agree_on_hostile_input():
    rng = random.Random(7)
    for seed in range(300):
        chunks = hostile_chunks(seed)
        data = b"".join(rng.choice([b"f'{", b'rf"', b"}", b"!r:", b"t'{"]) + c for c in chunks)
        p = parser(14, remove_comments=False)
        by_buffer = p.GetLogicalLineListFromBuffer(data)
        by_readline = p.GetLogicalLineList(io.BytesIO(data).readline)
        assert [(l.fFirstLine, l.fTokens) for l in by_buffer] == [
            (l.fFirstLine, l.fTokens) for l in by_readline]


def stdlib_files(interpreter, request):
    root = subprocess.run([shutil.which(interpreter) or "false", "-c", "import os; print("
                           "os.path.dirname(os.__file__))"], capture_output=True, text=True)
    if root.returncode:
        pytest.skip(f"{interpreter} is not installed")
    files = sorted(p for p in glob.glob(os.path.join(root.stdout.strip(), "**", "*.py"),
                                        recursive=True) if "-packages" not in p)
    return files if request.config.getoption("--full-stdlib") else files[::25]


@pytest.mark.parametrize("interpreter, minor", [("python3.12", 12), ("python3.13", 13)])
def test_standard_library_strings_agree_with_the_interpreter(interpreter, minor, request):
    files = stdlib_files(interpreter, request)
    for path, spans in zip(files, reference(interpreter, files)):
        with open(path, "rb") as f:
            data = f.read()
        if isinstance(spans, list):
            assert_spans_agree(data, spans, minor)


@pytest.mark.parametrize("interpreter", ["python3.10", "python3.13"])
def test_code_valid_for_310_reads_the_same_with_the_option(interpreter, request):
    files = stdlib_files(interpreter, request)
    compiling = subprocess.run(["python3.10", "-c", "import sys\nfor p in sys.argv[1:]:\n try: "
                                "compile(open(p, 'rb').read(), p, 'exec'); print(p)\n except "
                                "Exception: pass"] + files, capture_output=True, text=True)
    for path in compiling.stdout.split():
        with open(path, "rb") as f:
            data = f.read()
        for options in ({}, {"remove_comments": False, "copy_strings": False}):
            want = logicalline.CreateLogicalLineParser(**options).GetLogicalLineListFromBuffer(data)
            got = parser(14, **options).GetLogicalLineListFromBuffer(data)
            assert [(l.fType, l.fIncomplete, l.fLineCount, l.fTokens) for l in got] == [
                (l.fType, l.fIncomplete, l.fLineCount, l.fTokens) for l in want], path


def test_dump_reads_as_the_newest_python_unless_told(tmp_path, capsys):
    from logicalline_dump.__main__ import main
    path = tmp_path / "new.py"
    path.write_bytes(b"x = f'{'a'}'\n")
    assert main(["--json", "--jobs", "2", str(path)]) == 0
    assert "[\"f'{'a'}'\", 1, 4]" in capsys.readouterr().out
    assert main(["--json", "--python", "3.11", str(path)]) == 0
    assert "[\"f'{'\", 1, 4]" in capsys.readouterr().out
    assert main(["--python", "3", str(path)]) == 2
