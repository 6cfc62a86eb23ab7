"""Interpreters in one process, each with a lock of its own: every one imports the module afresh,
reads as the main interpreter does, and sees nothing that another made (types, constants,
tables, create hook). Isolated interpreters come with Python 3.12 (a private module until 3.14),
InterpreterPoolExecutor with 3.14."""
import contextlib
import ctypes
import gc
import io
import os
import sys
import textwrap

import pytest

import logicalline
from test_direct_table import DIRECT
from test_leaks import MALLINFO2
from test_model_agreement import read, run_isolated

import direct_table  # noqa: E402  (put on the path by test_direct_table)

sys.path.insert(0, os.path.join(os.path.dirname(__file__), "..", "bench"))
import summaries  # noqa: E402

if sys.version_info >= (3, 13):
    import _interpreters as private
elif sys.version_info >= (3, 12):
    import _xxsubinterpreters as private
else:
    private = None
needs_interpreters = pytest.mark.skipif(
    private is None, reason="interpreters with a lock of their own come with Python 3.12")
needs_ctypes_inside = pytest.mark.skipif(
    sys.version_info < (3, 13), reason="ctypes cannot be imported by an isolated interpreter "
    "before Python 3.13")
needs_pool = pytest.mark.skipif(
    sys.version_info < (3, 14), reason="InterpreterPoolExecutor comes with Python 3.14")
needs_clean_close = pytest.mark.skipif(
    sys.version_info < (3, 14), reason="before Python 3.14 a closed interpreter leaves memory of "
    "the interpreter's own behind (1.8 MB each on 3.12.1 and 3.13.0)")

PRELUDE = f"import sys\nsys.path[:0] = {sys.path!r}\n"  # the module, and the tests' helpers


@contextlib.contextmanager
def interpreter(legacy=False):
    """Yields run(script) for a new interpreter, closed on the way out: an isolated one with a
    lock of its own, or with legacy=True one that shares the main interpreter's lock and its
    modules' process-wide state, as embedding hosts made them before 3.12. A script sees this
    interpreter's sys.path; an exception that it raises fails the run."""
    if sys.version_info >= (3, 14) and not legacy:
        from concurrent import interpreters
        handle = interpreters.create()
        run, close = handle.exec, handle.close
    elif sys.version_info >= (3, 13):
        ident = private.create("legacy" if legacy else "isolated")

        def run(code):
            failure = private.exec(ident, code)
            assert failure is None, failure.errdisplay

        def close():
            private.destroy(ident)
    else:
        ident = private.create(isolated=not legacy)

        def run(code):
            private.run_string(ident, code)

        def close():
            private.destroy(ident)
    try:
        yield lambda script: run(PRELUDE + textwrap.dedent(script))
    finally:
        close()


# Run by the main interpreter and by an isolated one, which must come to the same report.
READING = r'''
import copy, io, logicalline
parser = logicalline.CreateLogicalLineParser()
source = b"class C(B):\n    def f(self, a,\n          b):\n        return a\nx = 1\n"
def view(lines):
    return [(line.fType, line.fFirstLine, line.fLineCount, line.fTokens, line.fLocalScopeName)
            for line in lines]
lines = parser.GetLogicalLineList(io.BytesIO(source).readline)
assert lines[0].fType is logicalline.kClassDef and type(lines[0]) is logicalline.LogicalLineType
report = [view(lines), view(parser.GetLogicalLineListFromBuffer(source))]
lines[1].AppendArgName("a")
lines[3].AppendAttrib(("x", "info"))
report.append((copy.deepcopy(lines[1]).fArgNames, lines[3].Copy().fNamesDefined))
edited = source.replace(b"x = 1\n", b"x = (1,\n     2)\n")
report.append(parser.UpdateLogicalLineList(lines, edited, 4, 1, 2)[:2])
report.append((view(lines) == view(parser.GetLogicalLineListFromBuffer(edited)), lines[1].fArgNames))
'''


@needs_interpreters
def test_an_isolated_interpreter_reads_updates_and_annotates_as_the_main_one():
    namespace = {}
    exec(READING, namespace)
    with interpreter() as run:
        run(READING + f"assert report == {namespace['report']!r}, report\n")


@needs_interpreters
@needs_ctypes_inside
def test_the_native_table_serves_the_calling_interpreter():
    table = direct_table.TableAddress(logicalline.GetDirectLogicalLineFunctionTable())
    type_entry = (ctypes.c_void_p * 14).from_address(table)[2]
    with interpreter() as run:
        run(f"""
import io, logicalline, direct_table
capsule = logicalline.GetDirectLogicalLineFunctionTable()
assert direct_table.TableAddress(capsule) == {table}  # one table for every interpreter
table = direct_table.LoadTable()
line = logicalline.CreateLogicalLineParser().GetLogicalLineList(
    io.BytesIO(b"def f(a): pass\\n").readline)[0]
empty = table.CreateEmptyLogical()
assert table.GetLogicalTypeObject() is logicalline.LogicalLineType is type(empty)
assert [table.IsLogical(obj) for obj in (line, empty, "x")] == [1, 1, 0]
assert table.AppendArgNameDirect(line, "a") == 0 and line.fArgNames == ("a",)
assert table.GetArgName(line, 0) == "a" and table.GetNamesDefined(line) == ("f",)
""")
        assert DIRECT.GetLogicalTypeObject() is logicalline.LogicalLineType
    with interpreter() as run:  # where the module was never imported there is no type to give
        run(f"""
import ctypes
try:
    ctypes.PYFUNCTYPE(ctypes.py_object)({type_entry})()
except RuntimeError as error:
    assert "not imported" in str(error), error
else:
    raise AssertionError("a type without a module")
""")


READER = r"""
import io, logicalline
def read():
    return logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(b"x\n").readline)
"""


@needs_interpreters
def test_a_hook_is_called_by_its_own_interpreter_only():
    hook = "logicalline.SetLogicalCreateFunction(lambda *parts: {!r})\n"
    with interpreter() as first, interpreter() as second, interpreter(legacy=True) as legacy:
        first(READER + hook.format("first"))
        legacy(READER + hook.format("legacy"))
        second(READER + "assert type(read()[0]) is logicalline.LogicalLineType\n")
        assert type(read(b"x\n")[0]) is logicalline.LogicalLineType
        first("assert read() == ['first']")
        legacy("assert read() == ['legacy']")
    assert type(read(b"x\n")[0]) is logicalline.LogicalLineType  # nor once they are gone


def test_a_hook_installed_in_a_legacy_interpreter_stays_there():  # on every version
    pytest.importorskip("_testcapi", reason="the interpreter's test module makes the interpreter")
    done = run_isolated(r"""
import io, _testcapi, logicalline
from test_subinterpreters import PRELUDE, READER
hook = "logicalline.SetLogicalCreateFunction(lambda *parts: 'legacy')\n"
assert _testcapi.run_in_subinterp(PRELUDE + READER + hook + "assert read() == ['legacy']") == 0
line = logicalline.CreateLogicalLineParser().GetLogicalLineList(io.BytesIO(b"x\n").readline)[0]
assert type(line) is logicalline.LogicalLineType, line
""")
    assert done.returncode == 0, done.stderr


@needs_pool
def test_two_workers_read_the_standard_library_as_the_main_interpreter(request):
    from concurrent.futures import InterpreterPoolExecutor
    paths = summaries.standard_library(1 if request.config.getoption("--full-stdlib") else 5)
    batches = [paths[i::20] for i in range(20)]
    with InterpreterPoolExecutor(2, initializer=exec, initargs=(PRELUDE,)) as pool:
        found = [item for batch in pool.map(summaries.summarize, batches) for item in batch]
    assert found == summaries.summarize([path for batch in batches for path in batch])


def memory():
    """(resident bytes, C heap bytes in use) of the process."""
    gc.collect()
    heap = MALLINFO2()
    with open("/proc/self/statm") as statm:
        resident = int(statm.read().split()[1]) * os.sysconf("SC_PAGE_SIZE")
    return resident, heap.uordblks + heap.hblkhd


CYCLE = READER + r"""
import os
lines = logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(open(os.__file__, "rb").read())
tokens = [line.fTokens for line in lines]
logicalline.SetLogicalCreateFunction(lambda *parts: parts[1])
assert read() == [0]
"""


@needs_clean_close
def test_closed_interpreters_leave_no_memory_behind():
    """Kept past its interpreter's end, a module would hold over a megabyte of tables, more once
    reads fill them: 50 of them would far exceed the bound."""
    def cycle():
        with interpreter() as run:
            run(CYCLE)
    for _ in range(5):
        cycle()
    before = memory()
    for _ in range(50):
        cycle()
    growth = [after - start for start, after in zip(before, memory())]
    assert growth[0] < 8e6 and growth[1] < 8e6, f"resident and heap bytes grew: {growth}"
