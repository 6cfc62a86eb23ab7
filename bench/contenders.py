"""The timed contenders and the helpers that time them.

Each body takes the list of sources and returns (tokens or None, failed files, bytes of the
files it completed). None means the tokens were counted by the warm-up run, which calls the
body's census function instead: counting inside a timed body would slow it down.
"""

import ast
import collections
import gc
import io
import os
import sys
import time
import tokenize
import warnings
from importlib import metadata

from corpus import MB

try:
    import parso
    import parso.utils
    from parso.python.tokenize import tokenize as parso_tokenize
except ImportError:
    parso = None

try:
    import tree_sitter
    import tree_sitter_python
except ImportError:
    tree_sitter = None


def reader(parser, from_buffer):
    """The call that reads one source: the buffer entry point, or readline over a BytesIO."""
    if from_buffer:
        return parser.GetLogicalLineListFromBuffer
    get = parser.GetLogicalLineList
    return lambda data: get(io.BytesIO(data).readline)  # one call per file, not per line


def logicalline_body(parser, read_tokens, from_buffer=False):
    get = reader(parser, from_buffer)

    def parse_only(sources):
        failed = done = 0
        for data in sources:
            try:
                get(data)
            except ValueError:  # NUL bytes, a line of more tokens than fit
                failed += 1
            else:
                done += len(data)
        return None, failed, done

    def parse_and_read_tokens(sources):
        failed = done = 0
        for data in sources:
            try:
                lines = get(data)
            except ValueError:
                failed += 1
                continue
            for line in lines:
                line.fTokens
            done += len(data)
        return None, failed, done

    return parse_and_read_tokens if read_tokens else parse_only


def logicalline_census(parser, from_buffer=False):
    get = reader(parser, from_buffer)

    def count(sources):
        tokens = failed = done = 0
        for data in sources:
            try:
                lines = get(data)
            except ValueError:
                failed += 1
                continue
            tokens += sum(line.fTokenCount for line in lines)
            done += len(data)
        return tokens, failed, done

    return count


def count_items(iterator):
    """Consumes an iterator in C and returns how many items it gave."""
    last = collections.deque(enumerate(iterator, 1), maxlen=1)
    return last[0][0] if last else 0


def tokenize_body(sources):
    tokens = failed = done = 0
    for data in sources:
        try:
            tokens += count_items(tokenize.tokenize(io.BytesIO(data).readline))
        except (SyntaxError, tokenize.TokenError, UnicodeDecodeError, ValueError):
            failed += 1  # bad indentation, EOF inside a statement, a bad coding cookie
        else:
            done += len(data)
    return tokens, failed, done


def ast_body(sources):
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


def parso_inputs(sources):
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


def parso_body(version):
    def body(pairs):
        tokens = failed = done = 0
        for data, encoding in pairs:
            try:
                text = data.decode(encoding)
                if text.startswith("\ufeff"):
                    text = text[1:]
                tokens += count_items(parso_tokenize(text, version_info=version))
            except (UnicodeDecodeError, LookupError, ValueError):
                failed += 1
            else:
                done += len(data)
        return tokens, failed, done

    return body


def tree_sitter_parser():
    """tree-sitter's parser with its Python grammar, and its version text; (None, why) when it
    cannot be had."""
    if tree_sitter is None:
        return None, ("not installed (pip install tree-sitter tree-sitter-python, or the "
                      "'bench' extra)")
    try:
        language = tree_sitter.Language(tree_sitter_python.language())
        ts_parser = tree_sitter.Parser(language)
    except (TypeError, ValueError) as error:  # an older binding with another interface
        return None, f"unusable here: {type(error).__name__}: {error}"
    return ts_parser, (f"{metadata.version('tree-sitter')}, grammar "
                       f"{metadata.version('tree-sitter-python')}")


def tree_sitter_body(ts_parser):
    # Bytes in, as logicalline takes them; the tree is dropped at once, as the lines are by the
    # parse-only bodies. tree-sitter rejects no file: what it cannot parse becomes error nodes.
    parse = ts_parser.parse

    def body(sources):
        for data in sources:
            parse(data)
        return None, 0, sum(map(len, sources))

    return body


def floor_body(sources):
    # Iterating a BytesIO is its readline called from C, as logicalline calls readline.
    for data in sources:
        for line in io.BytesIO(data):
            line.split()
    return None, 0, sum(map(len, sources))


def floor_census(sources):
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

    def seconds_per_mb(self):
        return self.seconds / (self.done / MB) if self.done else float("inf")


STARTED = time.perf_counter()


def progress(message):
    print(f"  [{time.perf_counter() - STARTED:6.1f} s] {message}", file=sys.stderr, flush=True)


def load_text():
    return " ".join(f"{v:.2f}" for v in os.getloadavg())


def best_of(runs, body, inputs):
    """Returns the best time of `runs` calls and the outcome of the last one."""
    best, outcome = float("inf"), None
    for _ in range(runs):
        gc.collect()
        start = time.perf_counter()
        outcome = body(inputs)
        best = min(best, time.perf_counter() - start)
    gc.collect()
    return best, outcome


def time_contender(name, body, inputs, runs, census=None):
    counted = None
    if census is not None:  # the warm-up run
        gc.collect()
        counted = census(inputs)
    seconds, (tokens, failed, done) = best_of(runs, body, inputs)
    if tokens is None and counted is not None:
        tokens = counted[0]
    result = Result(name, seconds, runs, tokens, failed, done)
    progress(f"timed {name}: {seconds:.3f} s")
    return result


def print_timings(results, reference):
    print(f"{'contender':<40} {'runs':>4} {'best s':>8} {'MB/s':>7} {'tokens':>10} "
          f"{'Mtok/s':>7} {'x logicalline':>13}")
    for r in results:
        if r is None:
            continue
        mb_per_s = (r.done / MB) / r.seconds
        tokens = f"{r.tokens:,}" if r.tokens is not None else "-"
        rate = f"{r.tokens / r.seconds / 1e6:.2f}" if r.tokens else "-"
        ratio = r.seconds_per_mb() / reference.seconds_per_mb()
        print(f"{r.name:<40} {r.runs:>4} {r.seconds:>8.3f} {mb_per_s:>7.2f} {tokens:>10} "
              f"{rate:>7} {ratio:>12.2f}x")
    print("(x logicalline: seconds per MB of completed files over those of logicalline with "
          "default options, parsing alone; above 1 is slower)")
    for r in results:
        if r is not None and r.failed:
            print(f"  {r.name}: {r.failed} file(s) rejected and left out of its MB")
