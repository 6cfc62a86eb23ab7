"""--ops: the host operations on LogicalLine objects, per call, against a plain Python line
doing the same bookkeeping.

Every operation is a row of one table, and one body times them all: the calls of a run are
prepared as a list of argument tuples, the line first, and the body makes each call in turn.
"""

import array
import functools
import gc
import io
import operator
import os
import sys
import time

import logicalline

from corpus import MB

# The plain-Python line classifies its tokens with the test suite's model of the module, the
# project's own plain-Python classification, rather than with a copy of its own.
sys.path.insert(0, os.path.join(os.path.dirname(os.path.dirname(os.path.abspath(__file__))),
                                "tests"))
from model import ERROR, ERROR_PREFIX, token_id_for_start  # noqa: E402

PREFIX_LENGTH = len(ERROR_PREFIX)
CLASS_DEF = logicalline.kClassDef
FUNCTION_DEF = logicalline.kFunctionDef
# The module does not publish its line type by name; the table needs its methods.
LogicalLine = type(logicalline.CreateLogicalLineParser().GetLogicalLineList(
    io.BytesIO(b"pass\n").readline)[0])


class PyLine:
    """A logical line kept in plain Python: the same fields, the same checks, lists for the
    annotations and positions packed two 16-bit values per token."""

    __slots__ = ("tokens", "positions", "line_type", "names", "type_equivs", "line_text",
                 "first_line", "line_count", "indent", "flags", "scope_name", "tokens_tuple")

    def __init__(self, line):
        self.tokens = [text.encode("utf-8", "surrogateescape") for text, _ in line.fTokens]
        self.positions = array.array("H", [v for _, pos in line.fTokens for v in pos])
        self.line_type = line.fType
        self.names = None
        self.type_equivs = None
        try:
            self.line_text = line.fLineText
        except UnicodeDecodeError:  # a file in another encoding
            self.line_text = None
        self.first_line = line.fFirstLine
        self.line_count = line.fLineCount
        self.indent = line.fIndentLevel
        self.flags = 0
        self.scope_name = None
        self.tokens_tuple = None

    def get_token_type(self, i, skip_error_prefix=0):
        if i < 0 or i >= len(self.tokens):
            raise IndexError("Invalid token index")
        text = self.tokens[i]
        if text.startswith(ERROR_PREFIX):
            if not skip_error_prefix:
                return ERROR
            text = text[PREFIX_LENGTH:]
        return token_id_for_start(text)

    def get_token_string(self, i, skip_error_prefix=0):
        if i < 0 or i >= len(self.tokens):
            raise IndexError("Invalid token index")
        text = self.tokens[i]
        if skip_error_prefix and len(text) > PREFIX_LENGTH and text.startswith(ERROR_PREFIX):
            text = text[PREFIX_LENGTH:]
        return text.decode("utf-8", "replace")

    def append_attrib(self, obj):
        if self.line_type is CLASS_DEF or self.line_type is FUNCTION_DEF:
            raise ValueError("Cannot append attrib name type to a class or function def line")
        if self.names is None:
            self.names = [obj]
        else:
            self.names.append(obj)

    def append_arg_name(self, obj):
        if self.line_type is not FUNCTION_DEF:
            raise ValueError("Cannot append arg name to a non-function def line")
        if self.names is None:
            self.names = [obj]
        else:
            self.names.append(obj)

    def append_type_equiv(self, a, b):
        if self.type_equivs is None:
            self.type_equivs = [(a, b)]
        else:
            self.type_equivs.append((a, b))

    def copy(self):
        other = PyLine.__new__(PyLine)
        other.tokens = self.tokens[:]
        other.positions = self.positions[:]
        other.line_type = self.line_type
        other.names = self.names[:] if self.names else None
        other.type_equivs = self.type_equivs[:] if self.type_equivs else None
        other.line_text = self.line_text
        other.first_line = self.first_line
        other.line_count = self.line_count
        other.indent = self.indent
        other.flags = self.flags & ~1
        other.scope_name = self.scope_name
        other.tokens_tuple = None
        return other

    @property
    def token_tuples(self):
        if self.tokens_tuple is None:
            pos = self.positions
            self.tokens_tuple = tuple([(text.decode("utf-8", "replace"), (pos[2 * k],
                                                                           pos[2 * k + 1]))
                                       for k, text in enumerate(self.tokens)])
        return self.tokens_tuple


# ---------------------------------------------------------------------------------------------
# The operations


def each_token(count):
    return [(i,) for i in range(count)]


def every_line(*calls):
    """The same calls on every line, whatever its length."""
    return lambda count: calls


def not_scope_start(line_type):
    return line_type is not CLASS_DEF and line_type is not FUNCTION_DEF


def is_function_def(line_type):
    return line_type is FUNCTION_DEF


def any_line(line_type):
    return True


KEPT = None  # the same lines in every run: the operation leaves them as they were
MARKER = ("name", None)
READ_TOKENS = operator.attrgetter("fTokens")
READ_TOKEN_TUPLES = operator.attrgetter("token_tuples")

# What is timed; the module's call and the plain-Python one, each taking the line first; the
# type of fresh lines the calls are made on, or KEPT lines; the calls on a line of n tokens.
OPERATIONS = [
    ("GetTokenType(i)", LogicalLine.GetTokenType, PyLine.get_token_type, KEPT, each_token),
    ("GetTokenString(i)", LogicalLine.GetTokenString, PyLine.get_token_string, KEPT,
     each_token),
    ("AppendAttrib(obj), fresh non-def lines", LogicalLine.AppendAttrib, PyLine.append_attrib,
     not_scope_start, every_line((MARKER,))),
    ("AppendArgName(obj) x3, fresh def lines", LogicalLine.AppendArgName,
     PyLine.append_arg_name, is_function_def, every_line(("self",), ("other",), ("more",))),
    ("AppendTypeEquiv(a, b), fresh lines", LogicalLine.AppendTypeEquiv,
     PyLine.append_type_equiv, any_line, every_line(("a", "b"))),
    ("Copy(), per line", LogicalLine.Copy, PyLine.copy, KEPT, every_line(())),
    ("fTokens, first access per line", READ_TOKENS, READ_TOKEN_TUPLES, any_line, every_line(())),
    ("fTokens, later access per line", READ_TOKENS, READ_TOKEN_TUPLES, KEPT, every_line(())),
]


# ---------------------------------------------------------------------------------------------
# Timing


def ops_sample(corpus, limit):
    sample, size = [], 0
    step = max(1, len(corpus.sources) // 200)
    for data in corpus.sources[::step]:
        sample.append(data)
        size += len(data)
        if size >= limit:
            break
    return sample


def fresh_lines(parser, sample):
    lines = []
    for data in sample:
        try:
            lines.extend(parser.GetLogicalLineList(io.BytesIO(data).readline))
        except ValueError:
            pass
    return lines


def time_per_call(runs, prepare, body):
    """Best time per call of `body(prepared)`, which returns how many calls it made."""
    best, calls = float("inf"), 0
    for _ in range(runs):
        prepared = prepare()
        gc.collect()
        start = time.perf_counter()
        calls = body(prepared)
        best = min(best, time.perf_counter() - start)
        del prepared
    return best / calls * 1e9, calls


def same_line(line):
    return line


def native_token_count(line):
    return line.fTokenCount


def python_token_count(line):
    return len(line.tokens)


def prepare_calls(operation, wanted, calls_on, make_fresh, kept, convert, count):
    """The calls of one run of a row on one side, made outside the timing: fresh lines of the
    wanted types are parsed again for each run, since the operation changes them."""
    if wanted is KEPT:
        lines = kept
    else:
        lines = [convert(line) for line in make_fresh() if wanted(line.fType)]
    return operation, [(line, *args) for line in lines for args in calls_on(count(line))]


def call_each(prepared):
    """The one timed body: every prepared call in turn, returning how many it made."""
    operation, calls = prepared
    for args in calls:
        operation(*args)
    return len(calls)


def run_ops(corpus, runs):
    parser = logicalline.CreateLogicalLineParser()
    sample = ops_sample(corpus, 2_000_000)
    native = fresh_lines(parser, sample)
    python = [PyLine(line) for line in native]
    agree = sum(line.GetTokenType(i) == py.get_token_type(i)
                for line, py in zip(native, python) for i in range(line.fTokenCount))
    total = sum(line.fTokenCount for line in native)
    print(f"sample: {len(sample)} files, {sum(map(len, sample)) / MB:.2f} MB, {len(native):,} "
          f"lines, {total:,} tokens; the Python GetTokenType agrees with the module on "
          f"{100 * agree / total:.2f}% of tokens")
    print(f"best of {runs} runs; fresh lines are made before each run, outside the timing; "
          "each figure includes the loop and the call, the same for both columns\n")

    # Warm both caches of fTokens for the "later access" row.
    for line, py in zip(native, python):
        line.fTokens
        py.token_tuples
    # Each side: its kept lines, how it makes a line of its own from a fresh native one, and
    # how it counts a line's tokens.
    sides = [(native, same_line, native_token_count), (python, PyLine, python_token_count)]
    fresh = functools.partial(fresh_lines, parser, sample)

    print(f"{'operation':<42} {'calls':>9} {'module ns':>10} {'Python ns':>10} {'speedup':>8}")
    for name, native_call, python_call, wanted, calls_on in OPERATIONS:
        figures = [time_per_call(runs, functools.partial(prepare_calls, call, wanted, calls_on,
                                                         fresh, *side), call_each)
                   for call, side in zip((native_call, python_call), sides)]
        (native_ns, calls), (python_ns, _) = figures
        print(f"{name:<42} {calls:>9,} {native_ns:>10.1f} {python_ns:>10.1f} "
              f"{python_ns / native_ns:>7.1f}x")

    empty = range(total)
    start = time.perf_counter()
    for _ in empty:
        pass
    loop_ns = (time.perf_counter() - start) / total * 1e9
    mean_tokens = total / len(native)
    print(f"\nan empty loop costs {loop_ns:.1f} ns per pass; a line holds {mean_tokens:.1f} "
          "tokens on average, so per-line rows (Copy, fTokens) scale with that")
    print("the Python copy shares the immutable token list items and reuses the line type; "
          "Copy() also classifies the copy again")
    print("the Python column classifies tokens with the test suite's model (tests/model.py), "
          "which is written for clarity before speed")
