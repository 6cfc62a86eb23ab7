"""Speed and memory of logicalline against the tools a host would otherwise use.

    python3.10 bench/compare.py [CORPUS_DIR] [--runs N] [--slow-runs N] [--check]
    python3.10 bench/compare.py [CORPUS_DIR] --ops [--runs N]
    python3.10 bench/compare.py [CORPUS_DIR] --dump [--runs N] [--check]

The corpus is read into memory before anything is timed. Without CORPUS_DIR it is every .py file
of the running interpreter's standard library (the directory of os.__file__), leaving out
site-packages and dist-packages so that the figures do not move with whatever else is installed.

Default mode times, best of several runs in this one process:
  - logicalline, default options and include_line_text=False, parsing alone and parsing plus
    reading every line's fTokens, through GetLogicalLineList with a BytesIO's readline;
  - logicalline, default options, the same two through GetLogicalLineListFromBuffer;
  - tokenize.tokenize consumed to the end;
  - ast.parse (files it rejects are skipped and counted);
  - parso's tokenizer, when parso is installed (pip install .[bench]);
  - tree-sitter's C parser with its Python grammar, bytes in, when tree-sitter and
    tree-sitter-python are installed (the 'bench' extra too);
  - a floor: every physical line split on blanks, one bytes object per chunk.
Then the cost per MB of a few shapes of source that stress one dimension each, on the readline
and the buffer paths; the memory that the lists of lines keep per token; editor updates
(UpdateLogicalLineList after a one-character edit in files of 1,000 to 100,000 lines, and a
function typed into textwrap.py a key at a time, against full reads); and last the targets,
each marked with the section its figure comes from.

--ops times the host operations on LogicalLine objects, per call, against a plain Python class
doing the same bookkeeping, whose tokens are classified by the test suite's model
(tests/model.py).

--dump runs the dump tool (python3 -m logicalline_dump) on the corpus: wall and CPU time with
--jobs 1, 2 and 0 for each output, and its peak memory per byte of input on a 10 MB file of one
dense line and on the corpus; then its targets.

--check makes the exit status 1 when a target is not met (an aim is no target); without it the
status is 0 whatever the figures.

This file is the entry point and holds the default mode and its targets; corpus.py loads the
corpus, contenders.py holds the timed bodies and the timing helpers, scaling.py the shapes of
source, memory.py the retained memory, updates.py the editor updates, host_ops.py the --ops
table, and dump_tool.py the --dump runs.

Timing rules: time.perf_counter; gc.collect() runs between runs, outside the timed region; the
cyclic collector stays enabled while a contender runs, as it would in a host. Fast contenders
get one untimed warm-up run, which also counts their tokens. Warnings are silenced while ast
parses, because the standard library's tests are full of deliberately odd code. Editor updates
are timed one call at a time; updates.py says how.
"""

import argparse
import os
import sys
import time

import logicalline

from contenders import (ast_body, floor_body, floor_census, load_text, logicalline_body,
                        logicalline_census, parso, parso_body, parso_inputs, print_timings,
                        progress, time_contender, tokenize_body, tree_sitter_body,
                        tree_sitter_parser)
from corpus import MB, default_corpus, load_corpus
from dump_tool import run_jobs, run_memory
from host_ops import run_ops
from memory import measure_memory, measure_record_text, measure_tokenize_memory, print_memory
from scaling import run_scaling
from updates import run_updates


# ---------------------------------------------------------------------------------------------
# Targets


MISSED = []  # labels of the targets not met, for --check


def check(label, value, limit, aim=None, at_most=False, unit="x"):
    def meets(bound):
        return value <= bound if at_most else value >= bound

    relation = "at most" if at_most else "at least"
    aim_text = f", aim {aim}{unit} {'met' if meets(aim) else 'not met'}" if aim else ""
    shown = f"{value:>6.2f}" if value < 10 else f"{value:>6.1f}"  # 1.26 must not read as 1.3
    print(f"  {label:<60} {shown}{unit}  ({relation} {limit}{unit}: "
          f"{'MET' if meets(limit) else 'NOT MET'}{aim_text})")
    if not meets(limit):
        MISSED.append(label)


def speedup(other, own):
    return other.seconds_per_mb() / own.seconds_per_mb()


def print_targets(speed, memory_per_token, record_text, scaling_worst, updates):
    """speed maps short names to the Results of the speed table; updates is what run_updates
    returns, or None."""
    tok, ll, ll_tokens, buf = speed["tok"], speed["ll"], speed["ll_tokens"], speed["buf"]
    print("earlier targets, from the speed table:")
    check("parsing alone vs tokenize, faster by", speedup(tok, ll), 15, aim=30)
    check("parsing alone vs ast.parse, faster by", speedup(speed["ast"], ll), 3)
    check("parsing alone vs the floor, slower by", speedup(ll, speed["floor"]), 4, at_most=True)
    check("parsing + fTokens vs tokenize, faster by", speedup(tok, ll_tokens), 10, aim=20)
    print("current targets, from the section in brackets:")
    check("[speed] parsing alone (readline) vs tokenize, faster by", speedup(tok, ll), 30)
    check("[speed] parse + fTokens (readline) vs tokenize, faster by", speedup(tok, ll_tokens),
          22, aim=30)
    check("[memory] default options, after every fTokens read", memory_per_token, 150,
          aim=120, at_most=True, unit=" B/token")
    check("[speed] buffer, parsing alone vs tokenize, faster by", speedup(tok, buf), 45, aim=60)
    check("[speed] buffer vs readline, parsing alone, faster by", speedup(ll, buf), 1.3)
    for path, name in (("parse", "readline, parse"), ("tokens", "readline, parse + fTokens"),
                       ("buffer", "buffer, parse")):
        check(f"[scaling] worst case per MB, {name}", scaling_worst[path], 2, at_most=True)
    # One byte per byte, and the header of the bytes object that holds it: 1.01 on any corpus
    # whose files average 3.3 kB or more.
    check("[memory] record's copy of the text, per source byte", record_text, 1.01,
          at_most=True, unit=" B")
    if updates is None:
        print("  [editor updates] one-character edit: not measured")
        return
    check("[editor updates] one-character edit, 100,000 lines, faster by", updates["ratio"], 50)
    check("[editor updates] one-character edit, 1,000 lines, median", updates["median_small"],
          20, at_most=True, unit=" us")


# ---------------------------------------------------------------------------------------------
# Default mode


def run_comparison(corpus, runs, slow_runs):
    parser = logicalline.CreateLogicalLineParser()
    parser_no_text = logicalline.CreateLogicalLineParser(include_line_text=False)
    sources = corpus.sources
    started = time.perf_counter()

    print(f"== Speed (best of {runs} runs, {slow_runs} for tokenize, ast.parse, parso and "
          "tree-sitter) ==")
    ll = time_contender("logicalline default, parse", logicalline_body(parser, False), sources,
                        runs, logicalline_census(parser))
    ll_tokens = time_contender("logicalline default, parse + fTokens",
                               logicalline_body(parser, True), sources, runs,
                               logicalline_census(parser))
    buf = time_contender("logicalline buffer, parse",
                         logicalline_body(parser, False, from_buffer=True), sources, runs,
                         logicalline_census(parser, from_buffer=True))
    buf_tokens = time_contender("logicalline buffer, parse + fTokens",
                                logicalline_body(parser, True, from_buffer=True), sources, runs,
                                logicalline_census(parser, from_buffer=True))
    no_text = time_contender("logicalline no line text, parse",
                             logicalline_body(parser_no_text, False), sources, runs,
                             logicalline_census(parser_no_text))
    no_text_tokens = time_contender("logicalline no line text, parse + fTokens",
                                    logicalline_body(parser_no_text, True), sources, runs,
                                    logicalline_census(parser_no_text))
    floor = time_contender("floor: readline + bytes.split", floor_body, sources, runs,
                           floor_census)
    tok = time_contender("tokenize.tokenize", tokenize_body, sources, slow_runs)
    ast_result = time_contender("ast.parse", ast_body, sources, slow_runs)
    parso_result = None
    if parso is not None:
        pairs, undecodable = parso_inputs(sources)
        version = parso.utils.parse_version_string("3.10")
        parso_result = time_contender(f"parso {parso.__version__} tokenize",
                                      parso_body(version), pairs, slow_runs)
        parso_result.failed += undecodable
    ts_parser, ts_version = tree_sitter_parser()
    ts_result = None
    if ts_parser is not None:
        ts_result = time_contender(f"tree-sitter {ts_version.split(',')[0]} parse (C)",
                                   tree_sitter_body(ts_parser), sources, slow_runs)
    print()
    print_timings([ll, ll_tokens, buf, buf_tokens, no_text, no_text_tokens, tok, ast_result,
                   parso_result, ts_result, floor], ll)
    if parso is None:
        print("  parso tokenize: not installed (pip install parso, or the 'bench' extra)")
    if ts_parser is None:
        print(f"  tree-sitter parse: {ts_version}")
    print("(tokens: logicalline counts the tokens of its lines; tokenize and parso count every "
          "token they yield, NEWLINE, NL, INDENT and DEDENT included; the floor counts chunks; "
          "buffer: GetLogicalLineListFromBuffer on the bytes, the other logicalline rows call "
          "GetLogicalLineList with a BytesIO's readline; tree-sitter: parser.parse(bytes) per "
          "file, building its whole syntax tree)")

    # Timed before the memory measurements, in the same state of the heap as the corpus, and
    # with the fast contenders' runs: each case takes well under a second.
    print(f"\n== Scaling (logicalline default options, best of {runs}) ==")
    scaling_worst = run_scaling(parser, (ll.seconds_per_mb(), ll.seconds / ll.tokens),
                                (ll_tokens.seconds_per_mb(), ll_tokens.seconds / ll_tokens.tokens),
                                (buf.seconds_per_mb(), buf.seconds / buf.tokens), runs)

    print("\n== Retained memory, whole corpus held ==")
    measures = [measure_memory(corpus, parser, "logicalline default", True),
                measure_memory(corpus, parser_no_text, "logicalline no line text", False)]
    progress("measured logicalline memory")
    tokenize_traced, tokenize_tokens = measure_tokenize_memory(corpus)
    progress("measured tokenize memory")
    print_memory(corpus, measures, tokenize_traced, tokenize_tokens)
    default = measures[0]
    memory_per_token = default["traced_tokens"] / default["tokens"]
    record_text = measure_record_text(corpus, parser)
    print(f"the records' copies of the text, which updates check edits against: "
          f"{record_text:.4f} B per source byte (readline reads over buffer reads of the bytes "
          f"held, which the records refer to; a bytes object's {sys.getsizeof(b'')} B header "
          f"per list included)")

    print("\n== Editor updates (logicalline default options) ==")
    updates = run_updates(parser, corpus, slow_runs)

    print("\n== Targets ==")
    print_targets({"ll": ll, "ll_tokens": ll_tokens, "buf": buf, "tok": tok, "ast": ast_result,
                   "floor": floor}, memory_per_token, record_text, scaling_worst, updates)
    print(f"\ntotal wall time {time.perf_counter() - started:.0f} s; load average now "
          f"{load_text()}")


# ---------------------------------------------------------------------------------------------
# --dump

# Bounds that the README states for the dump tool: its peak memory growth per byte of the biggest
# input file, on one dense line and on an ordinary tree.
DUMP_DENSE_BYTES_PER_BYTE = 130
DUMP_TREE_BYTES_PER_BYTE = 20


def run_dump(corpus, runs):
    print(f"== The dump tool: --jobs ({runs} runs; load average now {load_text()}) ==")
    times = run_jobs(corpus, runs)
    print("\n== The dump tool: peak memory ==")
    worst = run_memory(corpus)
    print("\n== Targets ==")
    for style in ("text", "--json", "--summary"):
        (wall1, cpu1), (wall2, cpu2) = times[style, 1], times[style, 2]
        check(f"[jobs] {style}: -j 2 total CPU over -j 1's", cpu2 / cpu1, 1.1, at_most=True)
        if os.cpu_count() >= 2:
            check(f"[jobs] {style}: -j 2 wall time over -j 1's (idle 2 cores)", wall2 / wall1,
                  0.6, at_most=True)
    check("[memory] one dense line: peak growth per input byte", worst["dense"],
          DUMP_DENSE_BYTES_PER_BYTE, at_most=True, unit=" B")
    check("[memory] the corpus: peak growth per byte of its biggest file", worst["tree"],
          DUMP_TREE_BYTES_PER_BYTE, at_most=True, unit=" B")


# ---------------------------------------------------------------------------------------------


def main():
    arguments = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    arguments.add_argument("corpus", nargs="?", help="directory of .py files (default: the "
                           "standard library of this interpreter)")
    arguments.add_argument("--ops", action="store_true", help="time the host operations")
    arguments.add_argument("--dump", action="store_true",
                           help="time the dump tool with --jobs and measure its peak memory")
    arguments.add_argument("--check", action="store_true",
                           help="exit with status 1 when a target is not met")
    arguments.add_argument("--runs", type=int,
                           help="runs of the fast contenders, the scaling cases and --ops "
                           "(default: 7), and of each --dump case (default: 3)")
    arguments.add_argument("--slow-runs", type=int, default=3,
                           help="runs of tokenize, ast.parse and parso")
    options = arguments.parse_args()

    if options.corpus:
        corpus = load_corpus(options.corpus, skip_installed=False)
    else:
        corpus = default_corpus()
    if not corpus.sources:
        sys.exit(f"no .py files under {corpus.root}")

    print(f"Python {sys.version.split()[0]} ({sys.implementation.name}, {sys.platform}), "
          f"logicalline from {os.path.dirname(logicalline.__file__)}")
    print(f"corpus: {corpus.root}: {len(corpus.sources):,} files, {corpus.size / MB:.2f} MB, "
          f"{corpus.physical_lines:,} physical lines"
          + (f", {corpus.unreadable} unreadable" if corpus.unreadable else ""))
    print(f"parso: {parso.__version__ if parso else 'not installed'}; tree-sitter: "
          f"{tree_sitter_parser()[1]}; {os.cpu_count()} CPUs, "
          f"load average at start {load_text()} (other work on the machine slows every "
          "contender alike, so the ratios hold better than the seconds)\n")
    if options.ops:
        run_ops(corpus, options.runs or 7)
    elif options.dump:
        run_dump(corpus, options.runs or 3)
    else:
        run_comparison(corpus, options.runs or 7, options.slow_runs)
    if options.check and MISSED:
        sys.exit(f"{len(MISSED)} target(s) not met: {'; '.join(MISSED)}")


if __name__ == "__main__":
    main()
