"""The native host example: it builds against the installed header with warnings as errors,
what it appends through the table is what the lines then show, and failures reach the caller."""
import importlib.util
import io
import os
import shlex
import shutil
import subprocess
import sys
import sysconfig
from pathlib import Path

import pytest

import logicalline
import logicalline_dump

EXAMPLE = Path(__file__).resolve().parent.parent / "examples" / "native_host"


def run_python(host, *args):
    """Runs Python with the built example, logicalline and logicalline_dump importable."""
    path = [os.path.dirname(m.__file__) for m in (host, logicalline)]
    path.append(os.path.dirname(os.path.dirname(logicalline_dump.__file__)))
    env = dict(os.environ, PYTHONPATH=os.pathsep.join(path))
    return subprocess.run([sys.executable, *args], env=env, capture_output=True, text=True,
                          timeout=120)


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
    built = next(out.glob("native_host*"))
    location = importlib.util.spec_from_file_location("native_host", built)
    module = importlib.util.module_from_spec(location)
    location.loader.exec_module(module)
    return module


def lines_of(source):
    return logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(source).readline)


@pytest.mark.parametrize("source, view, expected", [
    (b"def f(self, a, b=(1, 2), *args, c: int = {}, **kw) -> int: pass\n", "fArgNames",
     ("self", "a", "b", "args", "c", "kw")),
    (b"async def g(a, /, b, *, c=f(x, y)): pass\n", "fArgNames", ("a", "b", "c")),
    (b"def h(\n    a,\n    b): pass\n", "fArgNames", ("a", "b")),
    (b"def k(): pass\n", "fArgNames", ()),
    (b"class C(Base, pkg.mod.Mixin, metaclass=M, *rest): pass\n", "fBaseClassNames",
     ("Base", "pkg.mod.Mixin")),
    (b"class D(Generic[T], mod.): pass\n", "fBaseClassNames", ()),
    (b"x = y = [1, 2]\n", "fNamesDefined", ("x", "y")),
    (b"a, b = c, d\n", "fNamesDefined", ("a", "b")),
    (b"limit: int = f(n=1)\n", "fNamesDefined", ("limit",)),
    (b"obj.x = a[i] = f().y = z = 3\n", "fNamesDefined", ("z",)),
])
def test_annotate_appends_what_the_line_then_shows(host, source, view, expected):
    line, = lines_of(source)
    assert host.annotate([line]) == [expected]
    assert getattr(line, view) == expected


def test_other_objects_are_skipped_and_annotations_last_until_reset(host):
    lines = lines_of(b"import os\ndef f(a): pass\nclass C(B): pass\nx = 1\n")
    lines[1].AppendArgName("first")  # read back through the table along with what is appended
    objects = lines + ["def g(b): pass", None, 7]
    assert host.annotate(objects) == [None, ("first", "a"), ("B",), ("x",), None, None, None]
    assert host.annotate(iter(lines))[1:] == [("first", "a", "a"), ("B",), ("x", "x")]
    assert lines[0].fImportRefs == () and lines[2].fBaseClassNames == ("B", "B")
    assert host.reset(objects) == 4
    assert [(ln.fArgNames, ln.fBaseClassNames, ln.fNamesDefined) for ln in lines] == [
        ((), (), ()), ((), (), ("f",)), ((), (), ("C",)), ((), (), ())]


def test_failures_reach_the_caller(host):
    line, = lines_of(b"def f(a, b): pass\n")
    assert host.find_tokens(line, b",") == [4] and host.find_tokens(line, "x") == [0, 1, 3, 5, 8]
    sample = bytearray(b"x")
    before = sys.getrefcount(sample)
    for _ in range(100):  # refused by the module itself
        with pytest.raises(TypeError, match="^String must be a bytes or unicode instance$"):
            host.find_tokens(line, sample)
    assert sys.getrefcount(sample) == before
    with pytest.raises(TypeError, match="expects a LogicalLine, not str"):
        host.find_tokens("def f(a): pass", "x")

    def stopping():
        yield line
        raise KeyError("stop")
    with pytest.raises(KeyError):
        host.annotate(stopping())
    assert line.fArgNames == ("a", "b")  # what was done before the failure stays
    with pytest.raises(TypeError):
        host.reset(5)


INIT_SCRIPT = '''
import io, sys, types, logicalline
partial = types.SimpleNamespace(kFunctionDef=logicalline.kFunctionDef,
    GetDirectLogicalLineFunctionTable=logicalline.GetDirectLogicalLineFunctionTable)
for stand_in, error in ((None, ImportError), (partial, AttributeError)):
    sys.modules["logicalline"] = stand_in
    try:
        import native_host
    except error as e:
        print(type(e).__name__)
sys.modules["logicalline"] = logicalline
import native_host
parser = logicalline.CreateLogicalLineParser()
print(*native_host.annotate(parser.GetLogicalLineList(io.BytesIO(b"def f(a):\\n").readline)))
'''


def test_init_fails_with_the_exception_and_can_be_retried(host):
    done = run_python(host, "-c", INIT_SCRIPT)
    assert (done.returncode, done.stdout.split()) == (0, ["ModuleNotFoundError",
                                                          "AttributeError", "('a',)"]), done.stderr


def test_demo_prints_what_it_found(host):
    done = run_python(host, str(EXAMPLE / "demo.py"))
    assert done.returncode == 0, done.stderr
    for found in ("Base, io.RawIOBase", "self, size, timeout, options", "data, count",
                  "first, last", "lines cleared: 7"):
        assert found in done.stdout
