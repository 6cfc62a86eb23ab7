"""Leak checks: every public operation, error paths included, is repeated and must leave
references and memory where they were. Exact on a debug interpreter (its reference total;
fuzz/leaks_debug.sh); everywhere the interpreter's block count, the C heap's bytes in use
(glibc's mallinfo2) and the reference counts of the objects that the operations store."""
import copy
import ctypes
import gc
import io
import itertools
import sys

import pytest

import logicalline
from test_direct_table import DIRECT
from test_model_agreement import run_isolated

ROUNDS = 400
SOURCE = (b"@deco\nclass C(Base):\n    def f(self, a,\n          b=')'):\n"
          b"        '''doc\r\n  more'''\n        return a \\\n  + b  # note\n"
          b"x = f(1,\nif y: pass\ncaf\xe9 = '\xff' <> $ \t\n# only a comment\n   \n"
          b"import os, sys  # handed back\nfrom a import (b,\n    c)\ns = 'open\n")
STORED = ["a name", ("a", "info"), b"raw"]  # not interned: only our references count
UNTRUTHFUL = type("Untruthful", (), {"__bool__": lambda self: 1 / 0})()


class Heap(ctypes.Structure):  # glibc's struct mallinfo2
    _fields_ = [(name, ctypes.c_size_t) for name in "arena ordblks smblks hblks hblkhd usmblks "
                "fsmblks uordblks fordblks keepcost".split()]


LIBC = ctypes.CDLL(None)
LIBC.malloc.restype = ctypes.c_void_p
MALLINFO2 = LIBC.mallinfo2
MALLINFO2.restype = Heap


def usage():
    gc.collect()
    heap = MALLINFO2()  # all 0 under an ASan runtime, which keeps no such count
    return [getattr(sys, "gettotalrefcount", int)(), sys.getallocatedblocks(),
            heap.uordblks + heap.hblkhd, *map(sys.getrefcount, STORED)]


# Per round, what a count may grow by before it counts as a leak: references, blocks, heap bytes.
BOUNDS = (0.25, 0.25, 6)


def growth_over(operation, rounds):
    """What each count grew by over `rounds` calls of `operation`, the shared tables emptied at
    both ends, so that only what the operations leak is left."""
    before = usage()
    for _ in range(rounds):
        operation()
    logicalline._ReleaseSharedTables()
    return [after - start for start, after in zip(before, usage())]


def assert_no_growth(operation):
    """A leak grows the counts in step with the rounds. The interpreter also allocates now and
    then on its own (some thousand heap bytes at a time, on 3.14 and later freed again in the
    next window), so growth is measured over ROUNDS and then over 2 * ROUNDS: an operation
    leaks when a count passes its bound in both windows, the second twice as far. The objects
    that the operations store must come back to their exact reference counts."""
    for _ in range(2):  # the second window refills the emptied tables as a counted one will
        growth_over(operation, ROUNDS // 2)
    short = growth_over(operation, ROUNDS)
    long = growth_over(operation, 2 * ROUNDS)
    leaking = [name for name, bound, once, twice in zip(("references", "blocks", "heap bytes"),
                                                        BOUNDS, short, long)
               if once > bound * ROUNDS and twice > 2 * bound * ROUNDS]
    stored = [a or b for a, b in zip(short[3:], long[3:])]
    assert not leaking and stored == [0] * len(STORED), (
        f"{leaking} grew by {short[:3]} over {ROUNDS} rounds and {long[:3]} over "
        f"{2 * ROUNDS}; stored objects by {stored}")


def read(source=SOURCE, first_line=0, line_count=-1, *options):
    return logicalline.CreateLogicalLineParser(*options).GetLogicalLineList(
        io.BytesIO(source).readline, first_line, line_count)


def attempt(call, *args, **kwargs):
    """Calls, letting through the exceptions that bad input gets."""
    try:
        call(*args, **kwargs)
    except (ValueError, TypeError, IndexError, OverflowError, SystemError, ZeroDivisionError):
        pass


def parsing():
    for flags in itertools.product((0, 1), repeat=4):
        for line in read(SOURCE, 0, -1, *flags):
            for name in dir(line):
                if name.startswith("f"):
                    attempt(getattr, line, name)  # fLineText of invalid UTF-8 raises
    parser = logicalline.CreateLogicalLineParser()
    pending = [b"x = (1,\n"]
    attempt(parser.GetLogicalLineList, lambda: pending.pop() if pending else 1 / 0)
    for bad in ("x\n", None, bytearray(b"x\n")):
        attempt(parser.GetLogicalLineList, lambda: bad)
    for args in ((5,), (print, "x"), (io.BytesIO(b"y\x00\n").readline,)):
        attempt(parser.GetLogicalLineList, *args)
    for window in ((2**31 - 2,), (-5,), (3, 4), (0, 0)):
        attempt(read, SOURCE, *window)
        attempt(parser.GetLogicalLineListFromBuffer, bytearray(SOURCE), *window)
    for data in (memoryview(SOURCE)[5:], b"x\n\x00", "x", None):
        attempt(parser.GetLogicalLineListFromBuffer, data)
    lines = parser.GetLogicalLineListFromBuffer(SOURCE)
    for edit in ((3, 2, 1), (0, 30, 0), (1, 0, 40), (-1, 0, 0)):  # the last two are refused
        attempt(parser.UpdateLogicalLineList, lines, SOURCE.replace(b"\n", b"\n\n", 1), *edit)
    attempt(logicalline.CreateLogicalLineParser, UNTRUTHFUL)


def methods_and_entries():
    lines = read() + [DIRECT.CreateEmptyLogical()]
    for line in lines:
        for i, skip in itertools.product((0, 5, -1, 99), (0, 1)):
            attempt(line.GetTokenType, i, skip_error_prefix=skip)
            attempt(line.GetTokenString, i, skip)
            attempt(DIRECT.GetTokenTypeDirect, line, i, skip)
        attempt(line.GetTokenType, "0")
        for name in ("AppendAttrib", "AppendArgName", "AppendBaseClassName", "AppendTypeEquiv",
                     "AppendArgTypeEquiv", "SetScopeName", "SetParsed"):
            attempt(getattr(line, name), *STORED[:2 if "Equiv" in name else 1])
            if name.startswith("Append"):
                # Interned: the interpreter's attribute cache would keep a fresh name for a while.
                direct = getattr(DIRECT, sys.intern(name + "Direct"))
                attempt(direct, line, *STORED[1:3 if "Equiv" in name else 2])
        attempt(line.SetParsed, UNTRUTHFUL)
        attempt(line.SetLineRange, 2**40, 1)
        attempt(DIRECT.GetArgName, line, 0)
        DIRECT.IsLogical(line), DIRECT.GetArgNameCount(line), DIRECT.GetNamesDefined(line)
        attempt(lambda: copy.deepcopy(line).Copy(1, 2, 3))
        line.SetLineRange(0, 0)
        attempt(line.Copy)
        DIRECT.ClearAppended(line)
    for text in (b"<errortoken> 'x", "name", "\udc80", None, b"<<="):
        attempt(DIRECT.GetStringTokenTypeDirect, text, 1)  # "\udc80": UnicodeEncodeError
        attempt(logicalline.GetIdForTokenStart, text)
        attempt(logicalline._GetFirstCodeUnit, text)
    DIRECT.GetLogicalTypeObject()


@pytest.mark.parametrize("operation", ["parsing", "methods_and_entries"])
def test_operation_leaks_nothing(operation):  # in a fresh interpreter, clear of other tests' state
    done = run_isolated(f"import test_leaks as t; t.assert_no_growth(t.{operation})")
    assert done.returncode == 0, done.stderr


@pytest.mark.skipif(sys.version_info < (3, 13), reason="the checks call the native table "
                    "through ctypes, which an isolated interpreter imports from Python 3.13")
@pytest.mark.parametrize("operation", ["parsing", "methods_and_entries"])
def test_operation_leaks_nothing_inside_an_isolated_interpreter(operation):
    done = run_isolated("import test_subinterpreters as s\n"
                        "with s.interpreter() as run:\n"
                        f"    run('import test_leaks as t; t.assert_no_growth(t.{operation})')\n")
    assert done.returncode == 0, done.stderr


def leaking_16_bytes():
    parsing()
    LIBC.malloc(16)


@pytest.mark.skipif(usage()[2] == 0, reason="this C heap keeps no count of its bytes")
def test_a_leak_of_16_bytes_a_round_is_found():
    done = run_isolated("import test_leaks as t; t.assert_no_growth(t.leaking_16_bytes)")
    assert done.returncode != 0 and "['heap bytes']" in done.stderr, done.stderr


def test_released_tables_fill_again():
    line = read(b"self.x = 1\n")[0]
    shared = line.fTokens
    logicalline._ReleaseSharedTables()
    again = read(b"self.x = 1\n")[0]
    assert again.fTokens == shared and line.fTokens is shared  # a line keeps what it had
    assert again.fTokens[0] is not shared[0] and read(b"self.y\n")[0].fTokens[0] is again.fTokens[0]


def test_texts_pushed_out_of_the_tables_are_released():  # 40,000 names in a few thousand sets
    source = b"".join(b"name%d = other%d\n" % (i, i) for i in range(20000))
    logicalline._ReleaseSharedTables()
    before = usage()[1]
    for _ in range(2):
        for line in logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(source):
            line.fTokens
    logicalline._ReleaseSharedTables()
    assert usage()[1] - before < 100
