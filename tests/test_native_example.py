"""The native host example builds against the installed header with warnings as errors, and
what it appends through the table is what the lines then show."""
import importlib.util
import os
import subprocess
import sys
from pathlib import Path

import pytest

import logicalline_dump
from test_model_agreement import read, run_isolated

EXAMPLE = Path(__file__).resolve().parent.parent / "examples" / "native_host"


@pytest.fixture(scope="module")
def host(tmp_path_factory):
    pytest.importorskip("setuptools")
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


def test_annotations_and_failures(host):
    lines = read(b"import os\ndef f(a, b=(1, 2), *c): pass\nclass C(B, m.M, x=1): pass\nx = y = 1\n")
    assert host.annotate(lines + [None]) == [None, ("a", "b", "c"), ("B", "m.M"), ("x", "y"), None]
    assert (lines[1].fArgNames, lines[2].fBaseClassNames) == (("a", "b", "c"), ("B", "m.M"))
    with pytest.raises(TypeError, match="^String must be a bytes or unicode instance$"):
        host.find_tokens(lines[1], bytearray(b"x"))  # refused by the module itself
    assert host.reset(lines) == 4 and lines[1].fArgNames == ()
    done = run_isolated(f"import sys; sys.path[:0] = [{os.path.dirname(host.__file__)!r}, "
                        f"{str(EXAMPLE)!r}]; import demo; demo.main()")
    assert done.returncode == 0 and "self, size, timeout, options" in done.stdout, done.stderr
