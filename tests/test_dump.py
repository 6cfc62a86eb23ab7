import glob
import importlib.metadata
import io
import json
import os
import pathlib
import re
import signal
import socket
import subprocess
import sys

import pytest

import logicalline
from logicalline_dump import dump, progress, reading, source_to_utf8
from logicalline_dump.workers import Workers
from logicalline_dump.__main__ import PARSER_OPTIONS, main

SOURCE = b"class C:\n\tdef f(self, a,\n\t\treturn '\xff'  # note\n"
# Lines that run over brackets, backslashes, strings and blank lines, and a last one left open.
SPANNING = (b"x = (1,\n\n 2)\n# c\ns = '''a\n\nb'''\ny = 1 + \\\n  2\r\n\n\n"
            b"def f(a,\n      b):\n    return {\n  1: 2}\nz = [3,")
CLOSED = SPANNING + b"]\n"


@pytest.fixture
def tree(tmp_path, monkeypatch):
    monkeypatch.chdir(tmp_path)
    (tmp_path / "ok.py").write_bytes(b"x = 1  # note\n")
    (tmp_path / "nul.py").write_bytes(b"x = 1\ny\x00\n")
    (tmp_path / "bad.py").write_bytes(SOURCE)
    (tmp_path / "empty").mkdir()  # or holding no .py file
    with socket.socket(socket.AF_UNIX) as sock:
        sock.bind("sock")  # neither file nor directory


def run(capsys, *argv):
    return (main(list(argv)), *capsys.readouterr())


def strict_records(out):
    """The JSON records of out, each of which a strict parser accepts: valid UTF-8 text, so no
    lone surrogate, even escaped."""
    records = [json.loads(row) for row in out.splitlines()]
    for record in records:
        json.dumps(record, ensure_ascii=False).encode("utf-8")
    return records


@pytest.mark.parametrize("argv, status, complaint", [
    (["ok.py", "bad.py"], 0, ""),
    (["ok.py", "empty"], 1, "no .py files in empty"),
    (["ok.py", "missing.py"], 1, "missing.py"),
    (["--options", "remove_comments=maybe", "ok.py"], 2, "not 'maybe'"),
    (["--options", "strip=1"], 2, ", ".join(PARSER_OPTIONS)),  # answered with the valid names
    (["--jobs", "-1"], 2, "--jobs takes 0 or more"),
])
def test_exit_status(tree, capsys, argv, status, complaint):
    status_seen, _, err = run(capsys, *argv)
    assert status_seen == status and complaint in err and bool(err) == bool(complaint)


@pytest.mark.parametrize("style, head, tail", [
    ([], "== ok.py\n    1 +1   indent 0   -                  kAssignment\n",
     "'x'@1:0  '='@1:2  '1'@1:4\n"),
    (["--json"], '{"path": "missing.py", "logical_lines": 0, "error": ',
     '"tokens": [["x", 1, 0], ["=", 1, 2], ["1", 1, 4]]}\n{"path": "ok.py", "logical_lines": 1}\n'),
    (["--summary"], "kAssignment                  1\n", "; 3 failed\n"),
])
def test_failures_are_reported_in_order_and_the_rest_still_dumped(tree, capsys, style, head,
                                                                  tail):
    status, out, err = run(capsys, *style, "missing.py", "nul.py", "sock", "ok.py")
    assert status == 1 and out.startswith(head) and out.endswith(tail)
    assert err.splitlines() == [  # line numbers count from 1 here too
        "logicalline-dump: cannot read missing.py: No such file or directory",
        "logicalline-dump: nul.py: Binary data encountered at lineno 2 while tokenizing",
        "logicalline-dump: cannot read sock: No such device or address"]


@pytest.mark.parametrize("data", [
    "# -*- coding: latin-1 -*-\ns = 'café'\n".encode("latin-1"),
    "#!/usr/bin/env python\n# vim: set fileencoding=cp1252 :\ns = 'café'\n".encode("cp1252"),
    "# coding: latin-1, é\ns = 'café'\n".encode("latin-1"),  # the declaration line not UTF-8
    b"\xef\xbb\xbfs = 'caf\xc3\xa9'\n",  # UTF-8 with a byte-order mark
    b"\xef\xbb\xbf# coding: UTF_8\ns = 'caf\xc3\xa9'\n",  # one that agrees with it
])
def test_text_is_decoded_as_the_interpreter_would(tmp_path, capsys, data):
    (tmp_path / "x.py").write_bytes(data)
    _, out, _ = run(capsys, "--json", str(tmp_path / "x.py"))
    assert json.loads(out.splitlines()[0])["tokens"][2] == ["'café'", data.count(b"\n"), 4]


LATE_NUL = b"x = 1\n" * 20000 + b"y\x00\n"  # the second window fails


@pytest.mark.parametrize("name, data, lines, error", [
    (b"empty.py", b"", 0, None),
    (b"comment.py", b"# only a note\n\n", 0, None),
    (b"caf\xe9.py", b"x = 1\n", 1, None),  # a name that is not UTF-8
    (b"nul.py", b"x = 1\ny\x00\n", 0, "Binary data encountered at lineno 2 while tokenizing"),
    (b"late.py", LATE_NUL, 20000, "Binary data encountered at lineno 20001 while tokenizing"),
    (b"typo.py", b"# -*- coding: uft-8 -*-\nx = 1\n", 0, "unknown encoding: uft-8"),
    (b"bom.py", b"\xef\xbb\xbf# coding: latin-1\nx = 1\n", 0,
     "encoding problem: latin-1 with BOM"),
    (b"hex.py", b"#!/bin/python\n# coding: hex\n", 0,
     "'hex' is not a text encoding; use codecs.decode() to handle arbitrary codecs"),
])
def test_every_file_closes_with_a_record(tmp_path, capsys, name, data, lines, error):
    path = os.path.join(os.fsencode(tmp_path), name)
    with open(path, "wb") as handle:
        handle.write(data)
    for jobs in ("1", "2"):
        status, out, err = run(capsys, "--json", "--jobs", jobs, os.fsdecode(path))
        *records, closing = strict_records(out)
        assert bytes.fromhex(closing.get("path_hex", "")) == (path if b"\xe9" in name else b"")
        assert closing["path"].endswith(name.decode("utf-8", "backslashreplace"))
        assert all(record["path"] == closing["path"] for record in records)
        assert closing["logical_lines"] == len(records) == lines
        assert closing.get("error") == (error and f"{closing['path']}: {error}")
        assert status == bool(error) and (error or "") in err
    if not error:  # the text names the file as the JSON does
        assert run(capsys, os.fsdecode(path))[1].startswith(f"== {closing['path']}\n")


@pytest.mark.parametrize("style", [[], ["--json"]])
def test_a_line_written_in_parts_is_written_whole(tmp_path, capsys, monkeypatch, style):
    (tmp_path / "x.py").write_bytes(CLOSED + b"z = [" + b"1, " * 50 + b"]\n")
    whole = run(capsys, *style, str(tmp_path / "x.py"))
    monkeypatch.setattr(dump, "PIECE", 3)
    assert run(capsys, *style, str(tmp_path / "x.py")) == whole


def test_help_fits_80_columns(capsys, monkeypatch):
    monkeypatch.setenv("COLUMNS", "80")
    assert main(["--help"]) == 0
    assert max(map(len, capsys.readouterr().out.splitlines())) <= 80


@pytest.mark.parametrize("window", [1, 2, 3, 5, 100])
def test_windows_give_what_one_read_gives(window):
    # A U+FEFF that opens the file is skipped, and one that opens a window is a token.
    marked = b"\xef\xbb\xbf" + b"a = 1\n\xef\xbb\xbfb = 2\n" * 3
    for skip, source in [(True, SPANNING), (False, SPANNING), (True, marked)]:
        parser = logicalline.CreateLogicalLineParser(skip_whitespace_lines=skip)
        whole = parser.GetLogicalLineListFromBuffer(source, 1)
        read = [line for lines, _ in reading.windows(parser, source, window) for line in lines]
        assert [(x.fFirstLine, x.fLineCount, x.fType, x.fTokens, x.fIncomplete) for x in read] == [
            (x.fFirstLine, x.fLineCount, x.fType, x.fTokens, x.fIncomplete) for x in whole]


@pytest.mark.parametrize("style", [["--json"], [], ["--summary"]])
def test_jobs_write_what_a_serial_run_writes(tree, capsys, monkeypatch, style):
    monkeypatch.setattr(dump, "CHUNK", 20000)  # many tasks of a few files
    monkeypatch.setattr(dump, "SMALLEST", 5000)
    for number in range(12):  # sizes that make the workers finish out of order
        pathlib.Path(f"f{number}.py").write_bytes(CLOSED * (number % 5) * 100)
    inputs = ["nul.py", "ok.py", ".", "-", "bad.py", "missing.py"]

    def dump_with(*jobs):
        monkeypatch.setattr(sys, "stdin", io.TextIOWrapper(io.BytesIO(SPANNING)))
        out = io.TextIOWrapper(io.BytesIO(), "utf-8")  # holding text back, as a file's does
        monkeypatch.setattr(sys, "stdout", out)
        status = main([*style, *jobs, *inputs])
        # A summary ends with the time taken.
        return status, out.buffer.getvalue().rsplit(b" MB in ", 1)[0], capsys.readouterr().err

    assert dump_with("--jobs", "2") == dump_with()


@pytest.mark.parametrize("work, complaint", [
    (lambda task: os._exit(3), r"ended early \(status 3\)"),
    (lambda task: 1 / 0, "ZeroDivisionError"),
])
def test_a_worker_that_fails_is_told_not_waited_for(work, complaint):
    workers = Workers(1, lambda: None, work)
    pid = workers.send("task").pid
    with pytest.raises(RuntimeError, match=complaint):
        list(workers.answers())
    workers.close()
    with pytest.raises(ChildProcessError):  # it has ended and been waited for
        os.waitpid(pid, os.WNOHANG)


@pytest.mark.parametrize("terminal, shown", [(False, False), (True, True)])
def test_progress_only_on_a_terminal(tree, capsys, monkeypatch, terminal, shown):
    monkeypatch.setattr(progress, "DELAY", 0.0)
    monkeypatch.setattr(sys.stderr, "isatty", lambda: terminal)
    _, _, err = run(capsys, "ok.py", "bad.py")
    assert ("/2 files" in err) == shown and run(capsys, "-q", "ok.py", "bad.py")[2] == ""


@pytest.mark.skipif("asan" in os.environ.get("LD_PRELOAD", ""),
                    reason="the sanitizer keeps what is freed, to catch its use")
def test_memory_does_not_grow_with_the_file(tmp_path):
    # The whole file's lines would take about a hundred times its size; streamed, the growth
    # is the file's bytes and an index of its lines. Both files fill many windows. The child's
    # own high-water mark: its ru_maxrss would start at that of this process.
    child = ("import sys; from logicalline_dump.__main__ import main; main(sys.argv[1:]); sys."
             "stderr.write([row for row in open('/proc/self/status') if 'VmHWM' in row][0][6:-3])")
    peak_kb, path = [], tmp_path / "x.py"
    for count in (2500, 10000):
        path.write_bytes(CLOSED * count)
        done = subprocess.run([sys.executable, "-c", child, "--json", path],
                              stdout=subprocess.DEVNULL, stderr=subprocess.PIPE)
        peak_kb.append(int(done.stderr))
    assert peak_kb[1] - peak_kb[0] < 10 * len(CLOSED) * (10000 - 2500) / 1024


def test_a_line_longer_than_a_window_is_dumped_once(tmp_path, capsys):
    path = tmp_path / "long.py"
    path.write_bytes(b"x = [\n" + b"    1,\n" * 40000 + b"]\ny = 2\n")
    _, out, _ = run(capsys, "--json", str(path))
    records = [json.loads(record) for record in out.splitlines()]
    assert [(record["first_line"], record["line_count"])
            for record in records if "first_line" in record] == [(1, 40002), (40003, 1)]


@pytest.mark.parametrize("jobs", ["1", "2"])
def test_ctrl_c_ends_the_run_with_one_line(tmp_path, jobs):
    for number in range(8):
        (tmp_path / f"f{number}.py").write_bytes(CLOSED * 3000)
    scratch = tmp_path / "scratch"
    scratch.mkdir()
    # A session of its own, so that the Ctrl-C reaches the tool and its workers, as a terminal's
    # does. The tool is mid-run once it has written, and stays so: nobody reads on yet.
    tool = subprocess.Popen([sys.executable, "-m", "logicalline_dump", "-j", jobs, str(tmp_path)],
                            stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                            env={**os.environ, "TMPDIR": str(scratch)}, start_new_session=True)
    tool.stdout.read(1)
    os.killpg(tool.pid, signal.SIGINT)
    _, err = tool.communicate()
    assert (tool.returncode, err) == (130, b"logicalline-dump: interrupted\n")
    assert list(scratch.iterdir()) == []
    with pytest.raises(ProcessLookupError):  # no worker outlives the tool
        os.killpg(tool.pid, 0)


def test_one_version_everywhere(capsys):
    root = pathlib.Path(__file__).resolve().parent.parent
    declared = re.search(r'^version = "(.+)"$', (root / "pyproject.toml").read_text(), re.M)[1]
    assert logicalline.__version__ == declared
    assert main(["--version"]) == 0 and capsys.readouterr().out == f"logicalline-dump {declared}\n"
    try:
        package = importlib.metadata.distribution("logicalline")
    except importlib.metadata.PackageNotFoundError:  # a build tree, with no metadata
        return
    module = pathlib.Path(logicalline.__file__).resolve()
    if any(pathlib.Path(package.locate_file(name)).resolve() == module for name in package.files):
        assert package.version == declared


@pytest.mark.parametrize("data", [
    b"s = '\xff'\n",  # not UTF-8, with no declaration
    b"# coding: cp1252\ns = '\x81'\n",  # a byte that the declared encoding leaves undefined
    b"# coding: unicode_escape\ns = '\\udc80'\n",  # an escape to a lone surrogate
])
def test_decoding_reads_on_where_the_interpreter_stops(data):
    with pytest.raises(SyntaxError):
        compile(data, "x.py", "exec")
    line = logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(source_to_utf8(data))
    assert "\ufffd" in line[-1].fTokens[2][0]


@pytest.mark.skipif(sys.version_info < (3, 12), reason="3.10 and 3.11 read as by default")
def test_reading_as_this_interpreter_is_reading_as_the_newest_version():
    # What the README tells a tool author to check their results against the dump tool with.
    running = logicalline.CreateLogicalLineParser(feature_version=sys.version_info[:2])
    newest = logicalline.CreateLogicalLineParser(
        feature_version=logicalline.kNewestFeatureVersion)
    files = sorted(glob.glob(os.path.join(os.path.dirname(os.__file__), "**", "*.py"),
                             recursive=True))
    compiled = 0
    for path in (path for path in files[::25] if "-packages" not in path):
        data = pathlib.Path(path).read_bytes()
        try:
            compile(data, path, "exec")
        except (SyntaxError, ValueError):
            continue  # this interpreter refuses it, so it may read either way
        compiled += 1
        assert [(x.fType, x.fIncomplete, x.fLineCount, x.fTokens)
                for x in running.GetLogicalLineListFromBuffer(data)] == [
            (x.fType, x.fIncomplete, x.fLineCount, x.fTokens)
            for x in newest.GetLogicalLineListFromBuffer(data)], path
    assert compiled > 40
