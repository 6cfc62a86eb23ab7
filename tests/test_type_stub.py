"""The type stub: it names what the module has, and mypy --strict accepts a host using all of it."""
import ast
import os
import pathlib
import subprocess
import sys
import sysconfig

import pytest

import logicalline

HERE = pathlib.Path(__file__).resolve().parent
HOST_SCRIPT = HERE.parent / "examples" / "host_script.py"
MODULE_DIR = pathlib.Path(logicalline.__file__).resolve().parent
STUB = MODULE_DIR / "logicalline.pyi"
ALLOWLIST = HERE.parent / "tools" / "stubtest_allowlist.txt"
INSTALLED = str(MODULE_DIR) in {str(pathlib.Path(sysconfig.get_paths()[key]).resolve())
                                for key in ("purelib", "platlib")}
MISUSE = '''import io, logicalline
line = logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(b"").readline)[0]
kind: str = line.fType
column: str = line.fTokens[0][1][1]
line.fFirstLine = 3
logicalline.SetLogicalCreateFunction(lambda: None)
'''


def run_mypy(*paths, tool=("mypy", "--strict", "--no-incremental", "--no-error-summary")):
    pytest.importorskip("mypy", reason="mypy comes with the test extras")
    environment = {k: v for k, v in os.environ.items() if k != "MYPYPATH"}
    if not INSTALLED:  # a build tree: point mypy at the stub beside the module
        environment["MYPYPATH"] = str(MODULE_DIR)
    return subprocess.run([sys.executable, "-m", *tool, *map(str, paths)],
                          capture_output=True, text=True, env=environment, cwd=HERE.parent)


def test_stub_names_what_the_module_has(tmp_path):
    if INSTALLED:  # type checkers read the stub-only package; it must be the same text
        assert (MODULE_DIR / "logicalline-stubs" / "__init__.pyi").read_text() == STUB.read_text()
    classes = {node.name: {item.name for item in node.body if isinstance(item, ast.FunctionDef)}
               for node in ast.parse(STUB.read_text()).body if isinstance(node, ast.ClassDef)}
    for name, runtime in [("LogicalLine", logicalline.LogicalLineType),
                          ("LogicalLineParser", type(logicalline.CreateLogicalLineParser()))]:
        assert classes[name] == set(dir(runtime)) - set(dir(object)) - {"__module__"}
    rows = ALLOWLIST.read_text().splitlines()
    assert all(i and rows[i - 1].startswith("#") for i, row in enumerate(rows)
               if row.strip() and not row.startswith("#")), "an allowlist entry needs a reason"
    stubtest = run_mypy("logicalline", "--allowlist", ALLOWLIST, tool=("mypy.stubtest",))
    for result in (stubtest, run_mypy(HOST_SCRIPT)):
        assert result.returncode == 0, result.stdout + result.stderr  # stubtest: names, kinds
    (tmp_path / "misuse.py").write_text(MISUSE)
    errors = [line for line in run_mypy(tmp_path / "misuse.py").stdout.splitlines() if "error:" in line]
    assert sorted({int(line.split(":")[1]) for line in errors}) == [3, 4, 5, 6], errors
    # In a child process: the script ends by installing a create hook, which stays for good.
    result = subprocess.run([sys.executable, str(HOST_SCRIPT)], capture_output=True, text=True)
    assert "hook made: [(0, ['x', '=', '1'], ((0, 0),))]" in result.stdout, result.stderr
