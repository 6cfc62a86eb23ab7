"""The native host example: it builds against the installed header with warnings as errors,
what it appends through the table is what the lines then show, and failures reach the caller."""
import importlib.util
import os
import shlex
import shutil
import subprocess
import sys
import sysconfig
from pathlib import Path

import pytest

import logicalline_dump
from test_model_agreement import read, run_isolated

EXAMPLE = Path(__file__).resolve().parent.parent / "examples" / "native_host"


@pytest.fixture(scope="module")
def host(tmp_path_factory):
    pytest.importorskip("setuptools")
    cc = shlex.split(sysconfig.get_config_var("CC") or "cc")[0]
    if not shutil.which(cc) or not os.path.exists(
            os.path.join(sysconfig.get_paths()["include"], "Python.h")):
        pytest.skip("needs a C compiler and Python.h")
    out, temp = tmp_path_factory.mktemp("lib"), tmp_path_factory.mktemp("temp")
    env = dict(os.environ, CFLAGS="-Wall -Wextra -Werror",
               PYTHONPATH=os.path.dirname(os.path.dirname(logicalline_dump.__file__)))
    done = subprocess.run([sys.executable, "setup.py", "build_ext", "--build-lib", str(out),
                           "--build-temp", str(temp)], cwd=EXAMPLE, env=env,
                          capture_output=True, text=True, timeout=300)
    assert done.returncode == 0, done.stdout + done.stderr
    location = importlib.util.spec_from_file_location("native_host", next(out.glob("native_host*")))
    module = importlib.util.module_from_spec(location)
    location.loader.exec_module(module)
    return module


@pytest.mark.parametrize("source, view, expected", [
    (b"def f(self, a, b=(1, 2), *args, c: int = {}, **kw) -> int: pass\n", "fArgNames",
     ("self", "a", "b", "args", "c", "kw")),
    (b"def h(\n    a,\n    b): pass\n", "fArgNames", ("a", "b")),
    (b"class C(Base, pkg.mod.Mixin, metaclass=M, *rest): pass\n", "fBaseClassNames",
     ("Base", "pkg.mod.Mixin")),
    (b"x = y = [1, 2]\n", "fNamesDefined", ("x", "y")),
    (b"obj.x = a[i] = f().y = z = 3\n", "fNamesDefined", ("z",)),
])
def test_annotate_appends_what_the_line_then_shows(host, source, view, expected):
    (line,) = read(source)
    assert host.annotate([line]) == [expected] and getattr(line, view) == expected


def test_other_objects_are_skipped_and_failures_reach_the_caller(host):
    lines = read(b"import os\ndef f(a, b): pass\nclass C(B): pass\nx = 1\n")
    objects = lines + ["def g(b): pass", None, 7]
    assert host.annotate(objects) == [None, ("a", "b"), ("B",), ("x",), None, None, None]
    assert host.find_tokens(lines[1], b",") == [4]
    sample = bytearray(b"x")
    before = sys.getrefcount(sample)
    for _ in range(100):  # refused by the module itself
        with pytest.raises(TypeError, match="^String must be a bytes or unicode instance$"):
            host.find_tokens(lines[1], sample)
    assert sys.getrefcount(sample) == before
    with pytest.raises(TypeError, match="expects a LogicalLine, not str"):
        host.find_tokens("def f(a): pass", "x")
    assert host.reset(objects) == 4 and lines[1].fArgNames == ()


def test_demo_prints_what_it_found(host):
    done = run_isolated(f"import sys; sys.path[:0] = [{os.path.dirname(host.__file__)!r}, "
                        f"{str(EXAMPLE)!r}]; import demo; demo.main()")
    assert done.returncode == 0, done.stderr
    for found in ("Base, io.RawIOBase", "self, size, timeout, options", "data, count",
                  "first, last", "lines cleared: 7"):
        assert found in done.stdout
