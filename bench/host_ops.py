"""--ops: the host operations on LogicalLine objects, per call, against a plain Python line
doing the same bookkeeping."""

import array
import gc
import io
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


CLASS_DEF = logicalline.kClassDef
FUNCTION_DEF = logicalline.kFunctionDef


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
          "each figure includes the loop and the method lookup, the same for both columns")
    print()

    def NativeFresh():
        return fresh_lines(parser, sample)

    def PythonFresh():
        return [PyLine(line) for line in NativeFresh()]

    def KeepNative():
        return native

    def KeepPython():
        return python

    def EachToken(method, count):
        """A body that calls `method(i)` for every token index of every line."""
        def Body(lines):
            for line in lines:
                get = getattr(line, method)
                for i in range(count(line)):
                    get(i)
            return total
        return Body

    def NativeCount(line):
        return line.fTokenCount

    def PythonCount(line):
        return len(line.tokens)

    marker = ("name", None)

    # The lines are sorted by type before the timing, so the loops hold the call alone.
    def NativeFreshOf(wanted):
        return lambda: [line for line in NativeFresh() if wanted(line.fType)]

    def PythonFreshOf(wanted):
        return lambda: [PyLine(line) for line in NativeFresh() if wanted(line.fType)]

    def NotScopeStart(line_type):
        return line_type is not CLASS_DEF and line_type is not FUNCTION_DEF

    def IsFunctionDef(line_type):
        return line_type is FUNCTION_DEF

    def NativeAppendAttrib(lines):
        for line in lines:
            line.AppendAttrib(marker)
        return len(lines)

    def PythonAppendAttrib(lines):
        for line in lines:
            line.append_attrib(marker)
        return len(lines)

    def NativeAppendArgName(lines):
        for line in lines:
            append = line.AppendArgName
            append("self")
            append("other")
            append("more")
        return 3 * len(lines)

    def PythonAppendArgName(lines):
        for line in lines:
            append = line.append_arg_name
            append("self")
            append("other")
            append("more")
        return 3 * len(lines)

    def NativeAppendTypeEquiv(lines):
        for line in lines:
            line.AppendTypeEquiv("a", "b")
        return len(lines)

    def PythonAppendTypeEquiv(lines):
        for line in lines:
            line.append_type_equiv("a", "b")
        return len(lines)

    def NativeCopy(lines):
        for line in lines:
            line.Copy()
        return len(lines)

    def PythonCopy(lines):
        for line in lines:
            line.copy()
        return len(lines)

    def NativeTokens(lines):
        for line in lines:
            line.fTokens
        return len(lines)

    def PythonTokens(lines):
        for line in lines:
            line.token_tuples
        return len(lines)

    cases = [
        ("GetTokenType(i)", KeepNative, EachToken("GetTokenType", NativeCount), KeepPython,
         EachToken("get_token_type", PythonCount)),
        ("GetTokenString(i)", KeepNative, EachToken("GetTokenString", NativeCount), KeepPython,
         EachToken("get_token_string", PythonCount)),
        ("AppendAttrib(obj), fresh non-def lines", NativeFreshOf(NotScopeStart),
         NativeAppendAttrib, PythonFreshOf(NotScopeStart), PythonAppendAttrib),
        ("AppendArgName(obj) x3, fresh def lines", NativeFreshOf(IsFunctionDef),
         NativeAppendArgName, PythonFreshOf(IsFunctionDef), PythonAppendArgName),
        ("AppendTypeEquiv(a, b), fresh lines", NativeFresh, NativeAppendTypeEquiv,
         PythonFresh, PythonAppendTypeEquiv),
        ("Copy(), per line", KeepNative, NativeCopy, KeepPython, PythonCopy),
        ("fTokens, first access per line", NativeFresh, NativeTokens, PythonFresh,
         PythonTokens),
        ("fTokens, later access per line", KeepNative, NativeTokens, KeepPython,
         PythonTokens),
    ]
    # Warm both caches of fTokens for the "later access" row.
    NativeTokens(native)
    PythonTokens(python)
    print(f"{'operation':<42} {'calls':>9} {'module ns':>10} {'Python ns':>10} {'speedup':>8}")
    for name, native_prepare, native_body, python_prepare, python_body in cases:
        native_ns, calls = time_per_call(runs, native_prepare, native_body)
        python_ns, _ = time_per_call(runs, python_prepare, python_body)
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


