"""Speed and memory of logicalline against the tools a host would otherwise use.

    python3.10 bench/compare.py [CORPUS_DIR] [--runs N] [--slow-runs N]
    python3.10 bench/compare.py [CORPUS_DIR] --ops

The corpus is read into memory before anything is timed. Without CORPUS_DIR it is every .py file
of the running interpreter's standard library (the directory of os.__file__), leaving out
site-packages and dist-packages so that the figures do not move with whatever else is installed.

Default mode times, best of several runs in this one process:
  - logicalline, default options and include_line_text=False, parsing alone and parsing plus
    reading every line's fTokens;
  - tokenize.tokenize consumed to the end;
  - ast.parse (files it rejects are skipped and counted);
  - parso's tokenizer, when parso is installed (pip install .[bench]);
  - a floor: every physical line split on blanks, one bytes object per chunk.
Then the memory that the lists of lines keep per token, the cost per MB of a few shapes of
source that stress one dimension each, and the targets.

--ops times the host operations on LogicalLine objects, per call, against a plain Python class
doing the same bookkeeping.

Timing rules: time.perf_counter; gc.collect() runs between runs, outside the timed region; the
cyclic collector stays enabled while a contender runs, as it would in a host. Fast contenders
get one untimed warm-up run, which also counts their tokens. Warnings are silenced while ast
parses, because the standard library's tests are full of deliberately odd code.
"""

import argparse
import array
import ast
import collections
import gc
import io
import os
import sys
import time
import tokenize
import tracemalloc
import warnings

import logicalline

try:
    import parso
    import parso.utils
    from parso.python.tokenize import tokenize as parso_tokenize
except ImportError:
    parso = None

MB = 1e6
SKIPPED_DIRS = {"site-packages", "dist-packages", "__pycache__"}


# ---------------------------------------------------------------------------------------------
# Corpus


class Corpus:
    """Source files held as bytes, with the tallies printed at the top of a run."""

    def __init__(self, root, sources, unreadable):
        self.root = root
        self.sources = sources
        self.unreadable = unreadable
        self.size = sum(map(len, sources))
        self.physical_lines = sum(CountPhysicalLines(data) for data in sources)


def CountPhysicalLines(data):
    return data.count(b"\n") + (1 if data and not data.endswith(b"\n") else 0)


def LoadCorpus(root, skip_installed):
    paths = []
    for directory, subdirs, names in os.walk(root):
        if skip_installed:
            subdirs[:] = [d for d in subdirs if d not in SKIPPED_DIRS]
        subdirs.sort()
        paths.extend(os.path.join(directory, n) for n in sorted(names) if n.endswith(".py"))
    sources, unreadable = [], 0
    for path in paths:
        try:
            with open(path, "rb") as f:
                sources.append(f.read())
        except OSError:
            unreadable += 1
    return Corpus(root, sources, unreadable)


# ---------------------------------------------------------------------------------------------
# Contenders. Each body takes the list of sources and returns (tokens or None, failed files,
# bytes of the files it completed). None means the tokens were counted by the warm-up run.


def LogicalLineBody(parser, read_tokens):
    get = parser.GetLogicalLineList

    def ParseOnly(sources):
        failed = done = 0
        for data in sources:
            try:
                get(io.BytesIO(data).readline)
            except ValueError:  # NUL bytes, a line of more tokens than fit
                failed += 1
            else:
                done += len(data)
        return None, failed, done

    def ParseAndReadTokens(sources):
        failed = done = 0
        for data in sources:
            try:
                lines = get(io.BytesIO(data).readline)
            except ValueError:
                failed += 1
                continue
            for line in lines:
                line.fTokens
            done += len(data)
        return None, failed, done

    return ParseAndReadTokens if read_tokens else ParseOnly


def LogicalLineCensus(parser):
    def Count(sources):
        tokens = failed = done = 0
        for data in sources:
            try:
                lines = parser.GetLogicalLineList(io.BytesIO(data).readline)
            except ValueError:
                failed += 1
                continue
            tokens += sum(line.fTokenCount for line in lines)
            done += len(data)
        return tokens, failed, done

    return Count


def CountItems(iterator):
    """Consumes an iterator in C and returns how many items it gave."""
    last = collections.deque(enumerate(iterator, 1), maxlen=1)
    return last[0][0] if last else 0


def TokenizeBody(sources):
    tokens = failed = done = 0
    for data in sources:
        try:
            tokens += CountItems(tokenize.tokenize(io.BytesIO(data).readline))
        except (SyntaxError, tokenize.TokenError, UnicodeDecodeError, ValueError):
            failed += 1  # bad indentation, EOF inside a statement, a bad coding cookie
        else:
            done += len(data)
    return tokens, failed, done


def AstBody(sources):
    failed = done = 0
    with warnings.catch_warnings():
        warnings.simplefilter("ignore")
        for data in sources:
            try:
                ast.parse(data)
            except (SyntaxError, ValueError, UnicodeDecodeError, RecursionError, MemoryError):
                failed += 1
            else:
                done += len(data)
    return None, failed, done


def ParsoInputs(sources):
    """Pairs each source with its declared encoding; parso wants str, so hosts decode first."""
    pairs, undecodable = [], 0
    for data in sources:
        try:
            encoding, _ = tokenize.detect_encoding(io.BytesIO(data).readline)
        except SyntaxError:
            undecodable += 1
            continue
        pairs.append((data, encoding))
    return pairs, undecodable


def ParsoBody(version):
    def Body(pairs):
        tokens = failed = done = 0
        for data, encoding in pairs:
            try:
                text = data.decode(encoding)
                if text.startswith("\ufeff"):
                    text = text[1:]
                tokens += CountItems(parso_tokenize(text, version_info=version))
            except (UnicodeDecodeError, LookupError, ValueError):
                failed += 1
            else:
                done += len(data)
        return tokens, failed, done

    return Body


def FloorBody(sources):
    # Iterating a BytesIO is its readline called from C, as logicalline calls readline.
    for data in sources:
        for line in io.BytesIO(data):
            line.split()
    return None, 0, sum(map(len, sources))


def FloorCensus(sources):
    chunks = 0
    for data in sources:
        for line in io.BytesIO(data):
            chunks += len(line.split())
    return chunks, 0, sum(map(len, sources))


# ---------------------------------------------------------------------------------------------
# Timing


class Result:
    def __init__(self, name, seconds, runs, tokens, failed, done):
        self.name = name
        self.seconds = seconds
        self.runs = runs
        self.tokens = tokens
        self.failed = failed
        self.done = done

    def SecondsPerMB(self):
        return self.seconds / (self.done / MB) if self.done else float("inf")


STARTED = time.perf_counter()


def Progress(message):
    print(f"  [{time.perf_counter() - STARTED:6.1f} s] {message}", file=sys.stderr, flush=True)


def BestOf(runs, body, inputs):
    """Returns the best time of `runs` calls and the outcome of the last one."""
    best, outcome = float("inf"), None
    for _ in range(runs):
        gc.collect()
        start = time.perf_counter()
        outcome = body(inputs)
        best = min(best, time.perf_counter() - start)
    gc.collect()
    return best, outcome


def TimeContender(name, body, inputs, runs, census=None):
    counted = None
    if census is not None:  # the warm-up run
        gc.collect()
        counted = census(inputs)
    seconds, (tokens, failed, done) = BestOf(runs, body, inputs)
    if tokens is None and counted is not None:
        tokens = counted[0]
    result = Result(name, seconds, runs, tokens, failed, done)
    Progress(f"timed {name}: {seconds:.3f} s")
    return result


def PrintTimings(results, reference):
    print(f"{'contender':<40} {'runs':>4} {'best s':>8} {'MB/s':>7} {'tokens':>10} "
          f"{'Mtok/s':>7} {'x logicalline':>13}")
    for r in results:
        if r is None:
            continue
        mb_per_s = (r.done / MB) / r.seconds
        tokens = f"{r.tokens:,}" if r.tokens is not None else "-"
        rate = f"{r.tokens / r.seconds / 1e6:.2f}" if r.tokens else "-"
        ratio = r.SecondsPerMB() / reference.SecondsPerMB()
        print(f"{r.name:<40} {r.runs:>4} {r.seconds:>8.3f} {mb_per_s:>7.2f} {tokens:>10} "
              f"{rate:>7} {ratio:>12.2f}x")
    print("(x logicalline: seconds per MB of completed files over those of logicalline with "
          "default options, parsing alone; above 1 is slower)")
    for r in results:
        if r is not None and r.failed:
            print(f"  {r.name}: {r.failed} file(s) rejected and left out of its MB")


# ---------------------------------------------------------------------------------------------
# Retained memory


def ResidentBytes():
    with open("/proc/self/statm") as f:
        return int(f.read().split()[1]) * os.sysconf("SC_PAGE_SIZE")


def MallocChunk(size):
    # glibc on 64-bit: 8 bytes of header, 16-byte granules, 32 bytes at least.
    return max(32, (size + 8 + 15) & ~15)


def NativeBytes(all_lines):
    """What the lines hold through malloc, which tracemalloc does not see: the token array,
    the positions and the line text of each line."""
    total = 0
    for lines in all_lines:
        for line in lines:
            n = max(line.fTokenCount, 1)
            total += MallocChunk(8 * n) + MallocChunk(4 * n)
            try:
                text = line.fLineText
            except UnicodeDecodeError:  # a file in another encoding: count its token texts
                text = "".join(token for token, _ in line.fTokens)
            if text is not None:
                total += MallocChunk(len(text.encode("utf-8", "surrogatepass")) + 1)
    return total


def ParseCorpus(parser, sources):
    lines = []
    for data in sources:
        try:
            lines.append(parser.GetLogicalLineList(io.BytesIO(data).readline))
        except ValueError:
            pass
    return lines


def TokenizeCorpus(sources):
    held = []
    for data in sources:
        try:
            held.append(list(tokenize.tokenize(io.BytesIO(data).readline)))
        except (SyntaxError, tokenize.TokenError, UnicodeDecodeError, ValueError):
            pass
    return held


def MeasureMemory(corpus, parser, label, check_rss):
    """Retained bytes of the whole corpus's lines, before and after every fTokens is read.
    The RSS cross-check means something only for the first build: later ones reuse the memory
    that earlier ones freed."""
    sources = corpus.sources
    rss_parsed = None
    if check_rss:
        gc.collect()
        rss_before = ResidentBytes()
        held = ParseCorpus(parser, sources)
        gc.collect()
        rss_parsed = ResidentBytes() - rss_before
        del held
        gc.collect()

    tracemalloc.start()
    base = tracemalloc.get_traced_memory()[0]
    held = ParseCorpus(parser, sources)
    gc.collect()
    traced_parsed = tracemalloc.get_traced_memory()[0] - base
    for lines in held:
        for line in lines:
            line.fTokens
    gc.collect()
    traced_tokens = tracemalloc.get_traced_memory()[0] - base
    tracemalloc.stop()
    native = NativeBytes(held)
    tokens = sum(line.fTokenCount for lines in held for line in lines)
    line_count = sum(map(len, held))
    del held
    gc.collect()
    return {
        "label": label, "tokens": tokens, "lines": line_count, "native": native,
        "traced_parsed": traced_parsed, "traced_tokens": traced_tokens, "rss_parsed": rss_parsed,
    }


def MeasureTokenizeMemory(corpus):
    gc.collect()
    tracemalloc.start()
    base = tracemalloc.get_traced_memory()[0]
    held = TokenizeCorpus(corpus.sources)
    gc.collect()
    traced = tracemalloc.get_traced_memory()[0] - base
    tracemalloc.stop()
    tokens = sum(map(len, held))
    del held
    gc.collect()
    return traced, tokens


def PrintMemory(corpus, measures, tokenize_traced, tokenize_tokens):
    print("tracemalloc sees Python objects only; the lines' malloc'd arrays and texts are "
          "added from their sizes (glibc chunk rounding). The RSS growth of a first, untraced "
          "build is a cross-check.")
    print(f"{'what is held':<52} {'MB':>8} {'B/token':>8} {'B/src B':>8}")
    ll_tokens = measures[0]["tokens"]

    def Row(name, retained, tokens):
        print(f"{name:<52} {retained / MB:>8.1f} {retained / tokens:>8.1f} "
              f"{retained / corpus.size:>8.2f}")

    for m in measures:
        Row(f"{m['label']}, lines as parsed", m["traced_parsed"] + m["native"], m["tokens"])
        Row(f"{m['label']}, after every fTokens read", m["traced_tokens"] + m["native"],
            m["tokens"])
        rss = m["rss_parsed"]
        rss_text = f"; RSS growth as parsed {rss / m['tokens']:.1f} B/token" if rss else ""
        print(f"    ({m['lines']:,} lines, {m['tokens']:,} tokens; native part "
              f"{m['native'] / m['tokens']:.1f} B/token{rss_text})")
    Row("tokenize, TokenInfo lists", tokenize_traced, tokenize_tokens)
    print(f"    ({tokenize_tokens:,} TokenInfo, counting NEWLINE, NL, INDENT, DEDENT, ENCODING "
          f"and ENDMARKER; {tokenize_traced / ll_tokens:.1f} B per logicalline token)")


# ---------------------------------------------------------------------------------------------
# Scaling: shapes of source that stretch one dimension each


def LongStringSource():
    body = b"".join(b"text line %d\n" % i for i in range(199_999))
    return b'text = """\n' + body + b'"""\n'


def LongBracketSource():
    # 500,000 numbers and as many commas, 10 of each to a physical line
    rows = (b"    " + b" ".join(b"%d," % (i * 10 + k) for k in range(10)) + b"\n"
            for i in range(50_000))
    return b"values = [\n" + b"".join(rows) + b"]\n"


def LongPhysicalLineSource():
    chunk = b"alpha_value + compute(beta_item, 'gamma text') * 23, "  # about ordinary token density
    count = 10_000_000 // len(chunk)
    return b"result = f(" + chunk * count + b"0)\n"


def ManyStatementsSource():
    return b"".join(b"name_%d = %d\n" % (i, i) for i in range(100_000))


SCALING_CASES = [
    ("triple-quoted string, 200,000 lines", LongStringSource),
    ("bracketed literal, 1,000,000 tokens", LongBracketSource),
    ("one physical line of 10 MB", LongPhysicalLineSource),
    ("100,000 short statements", ManyStatementsSource),
]


def RunScaling(parser, parse_reference, tokens_reference, runs):
    """References are (seconds per MB, seconds per token) of the ordinary corpus."""
    print(f"{'case':<38} {'MB':>5} {'tokens':>10} {'parse s':>8} {'per MB':>7} {'per tok':>7} "
          f"{'+fTokens s':>10} {'per MB':>7} {'per tok':>7} {'x floor':>7}")
    flagged = []
    for name, make in SCALING_CASES:
        data = make()
        size = len(data) / MB
        try:
            tokens, failed, _ = LogicalLineCensus(parser)([data])
            parse_s, _ = BestOf(runs, LogicalLineBody(parser, False), [data])
            tokens_s, _ = BestOf(runs, LogicalLineBody(parser, True), [data])
            floor_s, _ = BestOf(runs, FloorBody, [data])
        except Exception as error:  # a case that breaks the module is a finding, not a crash
            print(f"{name:<38} {size:>5.1f} failed: {type(error).__name__}: {error}")
            flagged.append(name)
            continue
        parse_mb = (parse_s / size) / parse_reference[0]
        tokens_mb = (tokens_s / size) / tokens_reference[0]
        parse_tok = (parse_s / max(tokens, 1)) / parse_reference[1]
        tokens_tok = (tokens_s / max(tokens, 1)) / tokens_reference[1]
        marks = "  <-- above 2x per MB" if max(parse_mb, tokens_mb) > 2 else ""
        per_token = tokens >= 1000  # a few tokens carrying megabytes say nothing per token
        parse_tok = f"{parse_tok:>6.2f}x" if per_token else f"{'-':>7}"
        tokens_tok = f"{tokens_tok:>6.2f}x" if per_token else f"{'-':>7}"
        print(f"{name:<38} {size:>5.1f} {tokens:>10,} {parse_s:>8.3f} {parse_mb:>6.2f}x "
              f"{parse_tok} {tokens_s:>10.3f} {tokens_mb:>6.2f}x {tokens_tok} "
              f"{parse_s / floor_s:>6.2f}x{marks}")
        if failed:
            print(f"    logicalline rejected this case")
        if marks:
            flagged.append(name)
        Progress(f"scaled {name}")
    print("(per MB, per tok: this case's seconds per MB, and per token, over the ordinary "
          "corpus's; parsing alone, then parsing plus fTokens. A case above 2x per MB but near "
          "1x per token is dense in tokens rather than slow to scale; x floor: parsing alone over "
          "the split-on-blanks floor on the same case, which pays the same per-line costs)")
    print("cases above 2x per MB: " + (", ".join(flagged) if flagged else "none"))


# ---------------------------------------------------------------------------------------------
# Targets


def PrintTargets(ll, ll_tokens, tok, ast_result, floor):
    def Check(label, value, minimum, aim=None, at_most=False):
        met = value <= minimum if at_most else value >= minimum
        relation = "at most" if at_most else "at least"
        aim_text = f", aim {aim}x {'met' if value >= aim else 'not met'}" if aim else ""
        print(f"  {label:<44} {value:>6.1f}x  ({relation} {minimum}x: "
              f"{'MET' if met else 'NOT MET'}{aim_text})")

    speedup = lambda other, own: other.SecondsPerMB() / own.SecondsPerMB()
    Check("parsing alone vs tokenize, faster by", speedup(tok, ll), 15, aim=30)
    Check("parsing alone vs ast.parse, faster by", speedup(ast_result, ll), 3)
    Check("parsing alone vs the floor, slower by", speedup(ll, floor), 4, at_most=True)
    Check("parsing + fTokens vs tokenize, faster by", speedup(tok, ll_tokens), 10, aim=20)


# ---------------------------------------------------------------------------------------------
# Default mode


def RunComparison(corpus, runs, slow_runs):
    parser = logicalline.CreateLogicalLineParser()
    parser_no_text = logicalline.CreateLogicalLineParser(include_line_text=False)
    sources = corpus.sources
    started = time.perf_counter()

    print(f"== Speed (best of {runs} runs, {slow_runs} for tokenize, ast.parse and parso) ==")
    ll = TimeContender("logicalline default, parse", LogicalLineBody(parser, False), sources,
                       runs, LogicalLineCensus(parser))
    ll_tokens = TimeContender("logicalline default, parse + fTokens",
                              LogicalLineBody(parser, True), sources, runs,
                              LogicalLineCensus(parser))
    no_text = TimeContender("logicalline no line text, parse",
                            LogicalLineBody(parser_no_text, False), sources, runs,
                            LogicalLineCensus(parser_no_text))
    no_text_tokens = TimeContender("logicalline no line text, parse + fTokens",
                                   LogicalLineBody(parser_no_text, True), sources, runs,
                                   LogicalLineCensus(parser_no_text))
    floor = TimeContender("floor: readline + bytes.split", FloorBody, sources, runs, FloorCensus)
    tok = TimeContender("tokenize.tokenize", TokenizeBody, sources, slow_runs)
    ast_result = TimeContender("ast.parse", AstBody, sources, slow_runs)
    parso_result = None
    if parso is not None:
        pairs, undecodable = ParsoInputs(sources)
        version = parso.utils.parse_version_string("3.10")
        parso_result = TimeContender(f"parso {parso.__version__} tokenize", ParsoBody(version),
                                     pairs, slow_runs)
        parso_result.failed += undecodable
    print()
    PrintTimings([ll, ll_tokens, no_text, no_text_tokens, tok, ast_result, parso_result, floor],
                 ll)
    if parso is None:
        print("  parso tokenize: not installed (pip install parso, or the 'bench' extra)")
    print("(tokens: logicalline counts the tokens of its lines; tokenize and parso count every "
          "token they yield, NEWLINE, NL, INDENT and DEDENT included; the floor counts chunks)")

    print("\n== Targets ==")
    PrintTargets(ll, ll_tokens, tok, ast_result, floor)

    # Timed before the memory measurements, in the same state of the heap as the corpus, and
    # with the fast contenders' runs: each case takes well under a second.
    print(f"\n== Scaling (logicalline default options, best of {runs}) ==")
    RunScaling(parser, (ll.SecondsPerMB(), ll.seconds / ll.tokens),
               (ll_tokens.SecondsPerMB(), ll_tokens.seconds / ll_tokens.tokens), runs)

    print("\n== Retained memory, whole corpus held ==")
    measures = [MeasureMemory(corpus, parser, "logicalline default", True),
                MeasureMemory(corpus, parser_no_text, "logicalline no line text", False)]
    Progress("measured logicalline memory")
    tokenize_traced, tokenize_tokens = MeasureTokenizeMemory(corpus)
    Progress("measured tokenize memory")
    PrintMemory(corpus, measures, tokenize_traced, tokenize_tokens)
    print(f"\ntotal wall time {time.perf_counter() - started:.0f} s; load average now "
          f"{LoadText()}")


# ---------------------------------------------------------------------------------------------
# --ops: host operations per call, against a plain Python line doing the same bookkeeping

ERROR_PREFIX = b"<errortoken> "
NAME_ID, NUMBER_ID, STRING_ID, ERROR_ID, COMMENT_ID = 1, 2, 3, 201, 202
QUOTES = frozenset(b"'\"")
DIGITS = frozenset(b"0123456789")
NAME_STARTS = frozenset(b"abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ_") | frozenset(
    range(128, 256))
STRING_PREFIXES = frozenset([b"r", b"b", b"u", b"f", b"rb", b"br", b"ru", b"ur", b"rf", b"fr"])


class PyLine:
    """A logical line kept in plain Python: the same fields, the same checks, lists for the
    annotations and positions packed two 16-bit values per token."""

    __slots__ = ("tokens", "positions", "line_type", "names", "type_equivs", "line_text",
                 "first_line", "line_count", "indent", "flags", "scope_name", "tokens_tuple")

    operator_ids = {}  # operator text -> id, filled from logicalline's own answers

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
                return ERROR_ID
            text = text[13:]
        return TokenIdForStart(text)

    def get_token_string(self, i, skip_error_prefix=0):
        if i < 0 or i >= len(self.tokens):
            raise IndexError("Invalid token index")
        text = self.tokens[i]
        if skip_error_prefix and len(text) > 13 and text.startswith(ERROR_PREFIX):
            text = text[13:]
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


def TokenIdForStart(text):
    first = text[0]
    if first in QUOTES:
        return STRING_ID
    if first in NAME_STARTS:
        for n in (1, 2):
            if len(text) > n and text[n] in QUOTES and text[:n].lower() in STRING_PREFIXES:
                return STRING_ID
        return NAME_ID
    if first in DIGITS or (first == 46 and len(text) > 1 and text[1] in DIGITS):
        return NUMBER_ID
    if first == 35:
        return COMMENT_ID
    return PyLine.operator_ids.get(text, ERROR_ID)


def OpsSample(corpus, limit):
    sample, size = [], 0
    step = max(1, len(corpus.sources) // 200)
    for data in corpus.sources[::step]:
        sample.append(data)
        size += len(data)
        if size >= limit:
            break
    return sample


def LearnOperatorIds(all_lines):
    """Fills the Python line's operator table with the ids the module gives those texts, so
    that only the classification of names, numbers, strings and comments is checked."""
    for line in all_lines:
        for i, (text, _) in enumerate(line.fTokens):
            first = text[:1]
            if text.startswith("<errortoken>"):
                continue
            if first and first.isascii() and not (first.isalnum() or first in "_'\"#"):
                PyLine.operator_ids[text.encode()] = line.GetTokenType(i)


def FreshLines(parser, sample):
    lines = []
    for data in sample:
        try:
            lines.extend(parser.GetLogicalLineList(io.BytesIO(data).readline))
        except ValueError:
            pass
    return lines


def TimePerCall(runs, prepare, body):
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


def RunOps(corpus, runs):
    parser = logicalline.CreateLogicalLineParser()
    sample = OpsSample(corpus, 2_000_000)
    native = FreshLines(parser, sample)
    LearnOperatorIds(native)
    python = [PyLine(line) for line in native]
    agree = sum(line.GetTokenType(i) == py.get_token_type(i)
                for line, py in zip(native, python) for i in range(line.fTokenCount))
    total = sum(line.fTokenCount for line in native)
    print(f"sample: {len(sample)} files, {sum(map(len, sample)) / MB:.2f} MB, {len(native):,} "
          f"lines, {total:,} tokens; the Python GetTokenType agrees with the module on "
          f"{100 * agree / total:.2f}% of tokens")
    print(f"best of {runs} runs; fresh lines are made before each run, outside the timing; "
          "each figure includes the loop and the method lookup, the same for both columns\n")

    def NativeFresh():
        return FreshLines(parser, sample)

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
        native_ns, calls = TimePerCall(runs, native_prepare, native_body)
        python_ns, _ = TimePerCall(runs, python_prepare, python_body)
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


# ---------------------------------------------------------------------------------------------


def LoadText():
    return " ".join(f"{v:.2f}" for v in os.getloadavg())


def main():
    arguments = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    arguments.add_argument("corpus", nargs="?", help="directory of .py files (default: the "
                           "standard library of this interpreter)")
    arguments.add_argument("--ops", action="store_true", help="time the host operations")
    arguments.add_argument("--runs", type=int, default=7,
                           help="runs of the fast contenders, the scaling cases and --ops")
    arguments.add_argument("--slow-runs", type=int, default=3,
                           help="runs of tokenize, ast.parse and parso")
    options = arguments.parse_args()

    if options.corpus:
        corpus = LoadCorpus(options.corpus, skip_installed=False)
    else:
        corpus = LoadCorpus(os.path.dirname(os.__file__), skip_installed=True)
    if not corpus.sources:
        sys.exit(f"no .py files under {corpus.root}")

    print(f"Python {sys.version.split()[0]} ({sys.implementation.name}, {sys.platform}), "
          f"logicalline from {os.path.dirname(logicalline.__file__)}")
    print(f"corpus: {corpus.root}: {len(corpus.sources):,} files, {corpus.size / MB:.2f} MB, "
          f"{corpus.physical_lines:,} physical lines"
          + (f", {corpus.unreadable} unreadable" if corpus.unreadable else ""))
    print(f"parso: {parso.__version__ if parso else 'not installed'}; {os.cpu_count()} CPUs, "
          f"load average at start {LoadText()} (other work on the machine slows every "
          "contender alike, so the ratios hold better than the seconds)\n")
    if options.ops:
        RunOps(corpus, options.runs)
    else:
        RunComparison(corpus, options.runs, options.slow_runs)


if __name__ == "__main__":
    main()
