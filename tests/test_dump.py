import io
import json
import socket
import subprocess
import sys

import pytest

import logicalline
from logicalline_dump.__main__ import PARSER_OPTIONS, main

# Tab indent, a line cut short by the next statement, a scope name, a byte that is not UTF-8.
SOURCE = b"class C:\n\tdef f(self, a,\n\t\treturn '\xff'  # note\n"


@pytest.fixture
def tree(tmp_path, monkeypatch):
    monkeypatch.chdir(tmp_path)
    (tmp_path / "ok.py").write_bytes(b"x = 1  # note\n")
    (tmp_path / "nul.py").write_bytes(b"x = 1\ny\x00\n")
    (tmp_path / "latin.py").write_bytes(SOURCE)
    (tmp_path / "empty").mkdir()
    with socket.socket(socket.AF_UNIX) as sock:
        sock.bind("sock")  # neither file nor directory


def run(capsys, *argv):
    status = main(list(argv))
    out, err = capsys.readouterr()
    return status, out, err


@pytest.mark.parametrize("argv, status, complaint", [
    (["ok.py", "latin.py", "empty"], 0, ""),  # an empty directory is not a failure
    (["ok.py", "missing.py"], 1, "missing.py"),
    (["--options", "remove_comments=maybe", "ok.py"], 2, "not 'maybe'"),
    (["--options", "strip=1"], 2, ", ".join(PARSER_OPTIONS)),  # answered with the valid names
    (["--no-such-flag"], 2, "--no-such-flag"),
])
def test_exit_status(tree, capsys, argv, status, complaint):
    status_seen, _, err = run(capsys, *argv)
    assert status_seen == status and complaint in err and bool(err) == bool(complaint)


def test_failed_inputs_are_reported_and_the_rest_still_dumped(tree, capsys):
    status, out, err = run(capsys, "missing.py", "nul.py", "sock", "ok.py")
    assert status == 1 and out.startswith("== ok.py\n") and out.count("==") == 1
    assert err.splitlines() == [
        "logicalline-dump: cannot read missing.py: No such file or directory",
        "logicalline-dump: nul.py: Binary data encountered at lineno 1 while tokenizing",
        "logicalline-dump: cannot read sock: No such device or address"]


def test_failures_show_in_json_too(tree, capsys):
    _, out, _ = run(capsys, "--json", "nul.py", "ok.py")
    assert [sorted(json.loads(row)) for row in out.splitlines()] == [["error", "path"],
                                                                     ["lines", "path"]]
    status, out, _ = run(capsys, "--summary", "--json", "ok.py", "latin.py", "nul.py")
    summary = json.loads(out)
    assert status == 1 and [e["path"] for e in summary["errors"]] == ["nul.py"]
    assert (summary["counts"], summary["files"], summary["bytes"]) == (dict.fromkeys(
        ["kAssignment", "kClassDef", "kFunctionDef", "kReturn"], 1), 2, 14 + len(SOURCE))


@pytest.mark.parametrize("options, comment, text", [
    ("", False, "x = 1  # note\n"),
    ("remove_comments=0,include_line_text=no", True, None),
    ("Remove_Comments=OFF, include_line_text=On", True, "x = 1  # note\n"),
])
def test_options_reach_the_parser(tree, capsys, options, comment, text):
    _, out, _ = run(capsys, "--json", "--options", options, "ok.py")
    [line] = json.loads(out)["lines"]
    assert (["# note\n", 0, 7] in line["tokens"], line["text"]) == (comment, text)


def test_json_from_stdin_agrees_with_the_module(capsys, monkeypatch):
    monkeypatch.setattr(sys, "stdin", io.TextIOWrapper(io.BytesIO(SOURCE)))
    status, out, _ = run(capsys, "--json", "-")
    record = json.loads(out)
    assert status == 0 and record["path"] == "-"
    lines = logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(SOURCE).readline)
    physical = SOURCE.decode("utf-8", "replace").splitlines(keepends=True)
    assert [(getattr(logicalline, r["type"]), r["description"].encode(), r["first_line"],
             r["line_count"], r["indent"], r["tabs_in_indent"], r["spaces_in_indent"],
             r["incomplete"], r["name"], r["text"], r["tokens"]) for r in record["lines"]] == [
        (x.fType, x.fType, x.fFirstLine, x.fLineCount, x.fIndentLevel, x.fTabsInIndent,
         x.fSpacesInIndent, x.fIncomplete, x.fLocalScopeName,
         "".join(physical[x.fFirstLine:x.fFirstLine + x.fLineCount]),
         [[text, *position] for text, position in x.fTokens]) for x in lines]


def test_closed_pipe_ends_quietly(tmp_path):
    (tmp_path / "big.py").write_bytes(b"x = (1,\n     2)\n" * 20000)
    child = subprocess.Popen([sys.executable, "-m", "logicalline_dump", str(tmp_path)],
                             stdout=subprocess.PIPE, stderr=subprocess.PIPE)
    child.stdout.read(100)
    child.stdout.close()
    assert child.wait(timeout=60) == 141 and child.stderr.read() == b""
