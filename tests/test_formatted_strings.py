"""Strings as newer interpreters read them (feature_version): an f-string, or a t-string from
(3, 14), is one token from its prefix to its closing quote, as the interpreter's own tokenize
spans it from FSTRING_START to FSTRING_END. The reference is the running interpreter, so that
running the suite under each Python checks the reading of that Python."""
import glob
import io
import itertools
import os
import random
import re
import sys
import tokenize
import warnings

import pytest

import logicalline
from test_model_agreement import hostile_chunks

RUNNING = sys.version_info[:2]
needs_string_tokens = pytest.mark.skipif(
    RUNNING < (3, 12), reason="tokenize spans f-strings from Python 3.12: run the suite under it")


def string_spans(data):
    """The strings that the running interpreter's tokenize finds in UTF-8 source outside
    f-strings and t-strings, and the outermost f-strings and t-strings, each as (line from 0,
    byte column, text); None when it refuses the source."""
    opening = {tokenize.FSTRING_START, getattr(tokenize, "TSTRING_START", None)}
    closing = {tokenize.FSTRING_END, getattr(tokenize, "TSTRING_END", None)}
    try:
        text = data.decode()
        lines, found, depth, start = text.split("\n"), [], 0, None
        starts = list(itertools.accumulate((len(line) + 1 for line in lines), initial=0))
        at = lambda row, c: starts[row - 1] + c  # the offset in the text of a token position
        place = lambda row, c: (row - 1, len(lines[row - 1][:c].encode()))
        for t in tokenize.generate_tokens(io.StringIO(text).readline):
            if t.type in opening:
                start, depth = (start if depth else t.start), depth + 1
            elif t.type in closing:
                depth -= 1
                if not depth:
                    found.append((*place(*start), text[at(*start):at(*t.end)]))
            elif t.type == tokenize.STRING and not depth:
                # Its text rather than its end: 3.12.1 misplaces the end of a string that spans
                # lines and holds non-ASCII characters.
                found.append((*place(*t.start), t.string))
    except (SyntaxError, tokenize.TokenError, UnicodeDecodeError):
        return None
    return found


def parser(minor, **options):
    return logicalline.CreateLogicalLineParser(feature_version=(3, minor), **options)


def tokens_by_start(data, minor):
    lines = parser(minor).GetLogicalLineListFromBuffer(data)
    return {(line.fFirstLine + row, col): text for line in lines for text, (row, col) in line.fTokens}


def assert_spans_agree(data, spans, minor):
    """Each string is a token of the module's reading; returns how many were compared."""
    got = tokens_by_start(data, minor)
    for row, col, text in spans:
        assert got.get((row, col)) == text, (data[:300], row, col)
    return len(spans)


# Valid since 3.12: what the fields of an f-string may hold, and what ends them; each source
# with its strings, as the interpreter's tokenize spans them.
CASES = [
    (b"f'{f' {d}\\n' if d else ''} def {name}(x)'\n",   # the quote of the string itself
     ["f'{f' {d}\\n' if d else ''} def {name}(x)'"]),
    (b"x = f'({', '.join(args)})' + y\n", ["f'({', '.join(args)})'"]),
    (b"s = f\"{a +\n b}\" + f'{c\n}'\ny = 1\n",          # line breaks in single-quoted strings
     ["f\"{a +\n b}\"", "f'{c\n}'"]),
    (b"f'{x # it's a comment, \"}\" too\n  + 1}'\n", ["f'{x # it's a comment, \"}\" too\n  + 1}'"]),
    (b"f'{x:{width}.{precision}f} {y!r:>{w}} {z=} {z = !s:^9}'\n",
     ["f'{x:{width}.{precision}f} {y!r:>{w}} {z=} {z = !s:^9}'"]),
    (b"f'{a!=b} {x:=5} {(x:=5)} {d[1:2]} {lambda: 1} {({1: 2})[1]}'\n",
     ["f'{a!=b} {x:=5} {(x:=5)} {d[1:2]} {lambda: 1} {({1: 2})[1]}'"]),
    (b"f'{{}} {{{x}}} }}{{ \\N{BULLET} {x:{y}}}}'\n", ["f'{{}} {{{x}}} }}{{ \\N{BULLET} {x:{y}}}}'"]),
    (b"rf'\\{x}\\N{y}' Rf\"\\\"{'q'}\" fR'''{x\n}\\\\''' + 1\n",
     ["rf'\\{x}\\N{y}'", "Rf\"\\\"{'q'}\"", "fR'''{x\n}\\\\'''"]),
    (b"x = rf\"\\N{'\"'}\" + 1\n", ["rf\"\\N{'\"'}\""]),    # no named escape in a raw string
    (b'f"""{x:a\n\'b\'} {"""\ndoc"""} #{{\n"""\n',          # a line break ends a format spec
     ['f"""{x:a\n\'b\'} {"""\ndoc"""} #{{\n"""']),
    (b"f'{f'{f'{f'{1}'}'}'}' f'{\"\\\\\"}' f'{x}' 'tail'\n",
     ["f'{f'{f'{f'{1}'}'}'}'", "f'{\"\\\\\"}'", "f'{x}'", "'tail'"]),
    (b"print(f'caf\xc3\xa9 {\xc3\xa9t\xc3\xa9!a}', f\"{'}'}\")\n", ["f'caf\xe9 {\xe9t\xe9!a}'", "f\"{'}'}\""]),
    (b"f'{x\\\n}' f'a\\\nb{y}'\n", ["f'{x\\\n}'", "f'a\\\nb{y}'"]),  # backslash continuations
    (b"d = {f'{k}': v for k, v in f(f'''{\n  a}''')}\r\nz = 1\r\n", ["f'{k}'", "f'''{\n  a}'''"]),
]


def string_tokens(data, minor):
    """The texts of the string tokens of the module's reading."""
    return [text for line in parser(minor).GetLogicalLineListFromBuffer(data)
            for i, (text, _) in enumerate(line.fTokens) if line.GetTokenType(i) == 3]


def as_template(data):
    """The source with every f prefix made a t prefix, in its case."""
    return re.sub(rb"\b([rR]?)([fF])([rR]?)(?=['\"])",
                  lambda m: m[1] + (b"t" if m[2] == b"f" else b"T") + m[3], data)


def templates(cases):
    return [(as_template(data), [as_template(s.encode()).decode() for s in strings])
            for data, strings in cases]


@pytest.mark.parametrize("data, strings", CASES + templates(CASES))
def test_outermost_strings_are_one_token_each(data, strings):
    assert string_tokens(data, 14) == strings


@needs_string_tokens
def test_outermost_strings_are_tokens_as_the_interpreter_spans_them():
    for data, strings in CASES + (templates(CASES) if RUNNING >= (3, 14) else []):
        spans = string_spans(data)
        assert [text for _, _, text in spans] == strings  # the table reads as the interpreter
        assert_spans_agree(data, spans, RUNNING[1])


@pytest.mark.parametrize("data", [data for data, _ in CASES])
def test_template_strings_read_as_the_formatted_strings_they_mirror_from_314(data):
    template = as_template(data)
    formatted = parser(13).GetLogicalLineListFromBuffer(data)
    got = parser(14).GetLogicalLineListFromBuffer(template)
    assert [[(as_template(t.encode()), p) for t, p in line.fTokens] for line in formatted] == [
        [(t.encode(), p) for t, p in line.fTokens] for line in got]
    older = [text for line in parser(13).GetLogicalLineListFromBuffer(b"t'{x}'\n")
             for text, _ in line.fTokens]
    assert older == ["t", "'{x}'"]  # a name, then a string, before 3.14


CLASSIC_U_AND_R = ["x", "=", "ur'a'", "+", "Ru'''b\nc'''", "+", "uR", "+", "bu", "'d'"]
U_AND_R = ["x", "=", "ur", "'a'", "+", "Ru", "'''b\nc'''", "+", "uR", "+", "bu", "'d'"]


@pytest.mark.parametrize("version, tokens", [
    (None, CLASSIC_U_AND_R), ((3, 11), CLASSIC_U_AND_R), ((3, 12), U_AND_R), ((3, 15), U_AND_R)])
def test_u_and_r_together_are_a_name_before_a_string_from_312(version, tokens):
    source = b"x = ur'a' + Ru'''b\nc''' + uR + bu'd'\n"
    lines = logicalline.CreateLogicalLineParser(
        feature_version=version).GetLogicalLineListFromBuffer(source)
    assert [text for line in lines for text, _ in line.fTokens] == tokens


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


def stdlib_sources(request):
    """The running interpreter's standard library with its tests, every 25th file unless the
    whole is asked for, in UTF-8 as the module reads it: other encodings are decoded first."""
    root = os.path.dirname(os.__file__)
    files = sorted(p for p in glob.glob(os.path.join(root, "**", "*.py"), recursive=True)
                   if "-packages" not in p)
    for path in files if request.config.getoption("--full-stdlib") else files[::25]:
        with open(path, "rb") as f:
            data = f.read()
        try:
            yield data.decode(tokenize.detect_encoding(io.BytesIO(data).readline)[0]).encode()
        except (SyntaxError, UnicodeDecodeError):  # a test of undecodable source
            continue


@needs_string_tokens
def test_standard_library_strings_agree_with_the_interpreter(request):
    compared = 0
    for data in stdlib_sources(request):
        sources = [data]
        if RUNNING >= (3, 14):  # the f-strings again, as the t-strings they would be
            sources.append(as_template(data))
        for source in sources:
            spans = string_spans(source)
            compared += assert_spans_agree(source, spans, RUNNING[1]) if spans else 0
    assert compared > 1000


@pytest.mark.skipif(RUNNING >= (3, 12), reason="tells code valid before 3.12 by compiling it")
def test_code_valid_before_312_reads_the_same_with_the_newest_option(request):
    compared = 0
    for data in stdlib_sources(request):
        try:
            with warnings.catch_warnings():
                warnings.simplefilter("ignore")  # invalid escapes, in the tests of the parser
                compile(data.decode(), "<stdlib>", "exec")
        except (SyntaxError, ValueError):
            continue
        for options in ({}, {"remove_comments": False, "copy_strings": False}):
            want = logicalline.CreateLogicalLineParser(**options).GetLogicalLineListFromBuffer(data)
            got = logicalline.CreateLogicalLineParser(
                **options, feature_version=logicalline.kNewestFeatureVersion
            ).GetLogicalLineListFromBuffer(data)
            assert [(l.fType, l.fIncomplete, l.fLineCount, l.fTokens) for l in got] == [
                (l.fType, l.fIncomplete, l.fLineCount, l.fTokens) for l in want], data[:200]
        compared += 1
    assert compared > 10


def test_dump_reads_as_the_newest_python_unless_told(tmp_path, capsys):
    from logicalline_dump.__main__ import main
    path = tmp_path / "new.py"
    path.write_bytes(b"x = f'{'a'}'\nlazy import y\n")
    assert main(["--json", "--jobs", "2", str(path)]) == 0
    out = capsys.readouterr().out
    assert "[\"f'{'a'}'\", 1, 4]" in out and '"type": "kImport"' in out
    assert main(["--json", "--python", "3.14", str(path)]) == 0
    out = capsys.readouterr().out
    assert "[\"f'{'a'}'\", 1, 4]" in out and '"type": "kImport"' not in out
    assert main(["--json", "--python", "3.11", str(path)]) == 0
    assert "[\"f'{'\", 1, 4]" in capsys.readouterr().out
    assert main(["--python", "3", str(path)]) == 2
