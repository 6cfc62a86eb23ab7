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
INSTALLED = str(MODULE_DIR) in {str(pathlib.Path(sysconfig.get_paths()[key]).resolve())
                                for key in ("purelib", "platlib")}
RUNTIME_TYPES = {"bytes": bytes, "str": str, "int": int, "tuple": tuple, "type": type}


def stub_tree():
    assert STUB.is_file(), "the stub must sit next to the module"
    if INSTALLED:  # type checkers read the stub-only package; it must be the same text
        assert (MODULE_DIR / "logicalline-stubs" / "__init__.pyi").read_text() == STUB.read_text()
    return ast.parse(STUB.read_text())


def is_check_only(node):
    return any(isinstance(d, ast.Name) and d.id == "type_check_only" for d in node.decorator_list)


def members(node):
    return {item.name: any(isinstance(d, ast.Name) and d.id == "property"
                           for d in item.decorator_list)
            for item in node.body if isinstance(item, ast.FunctionDef)}


def test_stub_and_module_name_the_same_things():
    tree = stub_tree()
    published, classes = {}, {}
    for node in tree.body:
        if isinstance(node, ast.AnnAssign):
            published[node.target.id] = node.annotation.slice  # the type inside Final[...]
        elif isinstance(node, ast.FunctionDef):
            published[node.name] = None
        elif isinstance(node, ast.ClassDef):
            assert is_check_only(node), f"{node.name} is not in the module"
            classes[node.name] = members(node)
    assert set(published) == {name for name in dir(logicalline) if not name.startswith("__")}
    for name, annotation in published.items():
        value = getattr(logicalline, name)
        if annotation is None:
            assert callable(value) and not isinstance(value, type), name
        else:
            outer = annotation.value if isinstance(annotation, ast.Subscript) else annotation
            assert isinstance(value, RUNTIME_TYPES[outer.id]), name

    line_type = logicalline.LogicalLineType
    runtime = {name: type(vars(line_type)[name]).__name__ == "getset_descriptor"
               for name in set(dir(line_type)) - set(dir(object))}
    assert classes["LogicalLine"] == runtime
    parser_type = type(logicalline.CreateLogicalLineParser())
    assert set(classes["LogicalLineParser"]) == set(dir(parser_type)) - set(dir(object))
    assert (line_type.__name__, parser_type.__name__) == ("LogicalLine", "LogicalLineParser")


MISUSE = '''
import io
import logicalline
line = logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(b"").readline)[0]
kind: str = line.fType
column: str = line.fTokens[0][1][1]
line.fFirstLine = 3
logicalline.SetLogicalCreateFunction(lambda: None)
'''


def run_mypy(*paths, tool=("mypy", "--strict", "--no-incremental", "--no-error-summary")):
    pytest.importorskip("mypy", reason="mypy comes with the test extras")
    environment = dict(os.environ)
    environment.pop("MYPYPATH", None)
    if not INSTALLED:  # a build tree: point mypy at the stub beside the module
        environment["MYPYPATH"] = str(MODULE_DIR)
    return subprocess.run([sys.executable, "-m", *tool, *map(str, paths)],
                          capture_output=True, text=True, env=environment, cwd=HERE.parent)


def test_stubtest_finds_the_stub_consistent_with_the_module():
    result = run_mypy("logicalline", tool=("mypy.stubtest",))
    assert result.returncode == 0, result.stdout + result.stderr


def test_mypy_strict_accepts_the_host_and_catches_misuse(tmp_path):
    result = run_mypy(HOST_SCRIPT)
    assert result.returncode == 0, result.stdout + result.stderr
    misuse = tmp_path / "misuse.py"
    misuse.write_text(MISUSE)
    result = run_mypy(misuse)
    errors = [line for line in result.stdout.splitlines() if ": error:" in line]
    assert sorted({int(line.split(":")[1]) for line in errors}) == [5, 6, 7, 8], result.stdout


def test_host_script_runs():
    # In a child process: the script ends by installing a create hook, which stays for good.
    result = subprocess.run([sys.executable, str(HOST_SCRIPT)], capture_output=True, text=True)
    assert result.returncode == 0, result.stderr
    report = result.stdout
    assert "function definition | names ['parameter_names'] | 1 annotations" in report
    assert "hook made: [(0, ['x', '=', '1'], ((0, 0),))]" in report
