"""Lazy imports, read from feature_version=(3, 15): "lazy import" and "lazy from" begin imports,
both as lines and as the statements that end a half-typed line early; "lazy" anywhere else is
the name it always was. Checked against the running interpreter's ast where it knows them."""
import ast
import glob
import os
import sys

import pytest

import logicalline

RUNNING = sys.version_info[:2]
SOURCE = (b"lazy import a.b\n"
          b"lazy from . import c\n"
          b"lazy = 1\n"
          b"lazy.x()\n"
          b"lazy(y)\n"
          b"print(lazy)\n"
          b"lazy if a else b\n"
          b"lazy \\\n  import d\n")
BY_DEFAULT = ["kUnknown", "kUnknown", "kAssignment", "kUnknown", "kUnknown", "kPrint", "kUnknown",
              "kUnknown"]
LAZY = ["kImport", "kFromImport", "kAssignment", "kUnknown", "kUnknown", "kPrint", "kUnknown",
        "kImport"]


def read(source, version):
    parser = logicalline.CreateLogicalLineParser(feature_version=version)
    return parser.GetLogicalLineListFromBuffer(source)


@pytest.mark.parametrize("version, types", [
    (None, BY_DEFAULT), ((3, 14), BY_DEFAULT), ((3, 15), LAZY), ((3, 99), LAZY)])
def test_lazy_imports_are_imports_from_315(version, types):
    lines = read(SOURCE, version)
    want = [getattr(logicalline, name) for name in types]
    assert [line.fType for line in lines] == want
    assert [line.Copy().fType for line in lines] == want  # a copy keeps the reading's type


@pytest.mark.parametrize("source, minor, lines", [
    # A line that begins with a lazy import ends a half-typed one, as "import" would.
    (b"x = (1,\nlazy import b\n", 15, [(["x", "=", "(", "1", ","], True), (["lazy", "import", "b"], False)]),
    (b"x = (1,\nlazy from b import c\n", 15, [(["x", "=", "(", "1", ","], True),
                                              (["lazy", "from", "b", "import", "c"], False)]),
    (b"x = (1,\nlazy import b\n", 14, [(["x", "=", "(", "1", ",", "lazy", "import", "b"], True)]),
    (b"x = (1,\nlazy, b)\n", 15, [(["x", "=", "(", "1", ",", "lazy", ",", "b", ")"], False)]),
    (b"x = 1 + \\\nlazy import b\n", 15, [(["x", "=", "1", "+", "\\", "lazy", "import", "b"], False)]),
    # So does one that begins with it inside a field of an f-string left open.
    (b"x = f'{a\nlazy import b\n", 15, [(["x", "=", "<errortoken> f'{a\n"], True),
                                         (["lazy", "import", "b"], False)]),
    (b"x = f'{a\nlazy + b}'\n", 15, [(["x", "=", "f'{a\nlazy + b}'"], False)]),
    (b"x = f'{a\nlazy import b}'\n", 14, [(["x", "=", "f'{a\nlazy import b}'"], False)]),
])
def test_a_lazy_import_starts_a_statement(source, minor, lines):
    got = read(source, (3, minor))
    assert [([text for text, _ in line.fTokens], line.fIncomplete) for line in got] == lines


def test_an_update_reads_lazy_imports_as_a_full_read_does():
    parser = logicalline.CreateLogicalLineParser(feature_version=(3, 15))
    old, new = b"x = 1\ny = 2\n", b"x = (1,\nlazy import y\n"
    lines = parser.GetLogicalLineListFromBuffer(old)
    parser.UpdateLogicalLineList(lines, new, 0, 2, 2)
    assert [(l.fType, l.fTokens) for l in lines] == [
        (l.fType, l.fTokens) for l in parser.GetLogicalLineListFromBuffer(new)]
    assert lines[1].fType == logicalline.kImport


def stdlib_sources():
    """Every 50th file of the running interpreter's standard library, and every file that holds
    a lazy import, as bytes."""
    root = os.path.dirname(os.__file__)
    files = sorted(p for p in glob.glob(os.path.join(root, "**", "*.py"), recursive=True)
                   if "-packages" not in p)
    for i, path in enumerate(files):
        with open(path, "rb") as f:
            data = f.read()
        if i % 50 == 0 or b"lazy import" in data or b"lazy from" in data:
            yield data


def test_imports_at_line_starts_agree_with_ast():
    """Every import statement that begins its physical line begins a logical line of its kind,
    read as the running interpreter reads; from 3.15 lazy imports are among them."""
    compared, lazy = 0, 0
    for data in stdlib_sources():
        try:
            tree = ast.parse(data)
        except (SyntaxError, ValueError):
            continue
        types = {line.fFirstLine + 1: line.fType for line in read(data, RUNNING)}
        physical = data.splitlines()
        for node in ast.walk(tree):
            if not isinstance(node, (ast.Import, ast.ImportFrom)):
                continue
            text = physical[node.lineno - 1]
            if len(text) - len(text.lstrip(b" \t\f")) != node.col_offset:
                continue  # after another statement on its line
            kind = logicalline.kImport if isinstance(node, ast.Import) else logicalline.kFromImport
            assert types.get(node.lineno) == kind, (node.lineno, text)
            compared += 1
            lazy += bool(getattr(node, "is_lazy", 0))
    assert compared > 50
    if RUNNING >= (3, 15):
        assert lazy > 0
