"""Speed and memory of logicalline against the tools a host would otherwise use.

    python3.10 bench/compare.py [CORPUS_DIR] [--runs N] [--slow-runs N]
    python3.10 bench/compare.py [CORPUS_DIR] --ops [--runs N]

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
Then the targets, the cost per MB of a few shapes of source that stress one dimension each,
and the memory that the lists of lines keep per token.

--ops times the host operations on LogicalLine objects, per call, against a plain Python class
doing the same bookkeeping, whose tokens are classified by the test suite's model
(tests/model.py).

This file is the entry point and holds the default mode and its targets; corpus.py loads the
corpus, contenders.py holds the timed bodies and the timing helpers, scaling.py the shapes of
source, memory.py the retained memory, and host_ops.py the --ops table.

Timing rules: time.perf_counter; gc.collect() runs between runs, outside the timed region; the
cyclic collector stays enabled while a contender runs, as it would in a host. Fast contenders
get one untimed warm-up run, which also counts their tokens. Warnings are silenced while ast
parses, because the standard library's tests are full of deliberately odd code.
"""

import argparse
import os
import sys
import time

import logicalline

from contenders import (ast_body, floor_body, floor_census, load_text, logicalline_body,
                        logicalline_census, parso, parso_body, parso_inputs, print_timings,
                        progress, time_contender, tokenize_body)
from corpus import MB, default_corpus, load_corpus
from host_ops import run_ops
from memory import measure_memory, measure_tokenize_memory, print_memory
from scaling import run_scaling


# ---------------------------------------------------------------------------------------------
# Targets


def print_targets(ll, ll_tokens, tok, ast_result, floor):
    def check(label, value, minimum, aim=None, at_most=False):
        met = value <= minimum if at_most else value >= minimum
        relation = "at most" if at_most else "at least"
        aim_text = f", aim {aim}x {'met' if value >= aim else 'not met'}" if aim else ""
        print(f"  {label:<44} {value:>6.1f}x  ({relation} {minimum}x: "
              f"{'MET' if met else 'NOT MET'}{aim_text})")

    def speedup(other, own):
        return other.seconds_per_mb() / own.seconds_per_mb()

    check("parsing alone vs tokenize, faster by", speedup(tok, ll), 15, aim=30)
    check("parsing alone vs ast.parse, faster by", speedup(ast_result, ll), 3)
    check("parsing alone vs the floor, slower by", speedup(ll, floor), 4, at_most=True)
    check("parsing + fTokens vs tokenize, faster by", speedup(tok, ll_tokens), 10, aim=20)


# ---------------------------------------------------------------------------------------------
# Default mode


def run_comparison(corpus, runs, slow_runs):
    parser = logicalline.CreateLogicalLineParser()
    parser_no_text = logicalline.CreateLogicalLineParser(include_line_text=False)
    sources = corpus.sources
    started = time.perf_counter()

    print(f"== Speed (best of {runs} runs, {slow_runs} for tokenize, ast.parse and parso) ==")
    ll = time_contender("logicalline default, parse", logicalline_body(parser, False), sources,
                        runs, logicalline_census(parser))
    ll_tokens = time_contender("logicalline default, parse + fTokens",
                               logicalline_body(parser, True), sources, runs,
                               logicalline_census(parser))
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
    print()
    print_timings([ll, ll_tokens, no_text, no_text_tokens, tok, ast_result, parso_result, floor],
                  ll)
    if parso is None:
        print("  parso tokenize: not installed (pip install parso, or the 'bench' extra)")
    print("(tokens: logicalline counts the tokens of its lines; tokenize and parso count every "
          "token they yield, NEWLINE, NL, INDENT and DEDENT included; the floor counts chunks)")

    print("\n== Targets ==")
    print_targets(ll, ll_tokens, tok, ast_result, floor)

    # Timed before the memory measurements, in the same state of the heap as the corpus, and
    # with the fast contenders' runs: each case takes well under a second.
    print(f"\n== Scaling (logicalline default options, best of {runs}) ==")
    run_scaling(parser, (ll.seconds_per_mb(), ll.seconds / ll.tokens),
                (ll_tokens.seconds_per_mb(), ll_tokens.seconds / ll_tokens.tokens), runs)

    print("\n== Retained memory, whole corpus held ==")
    measures = [measure_memory(corpus, parser, "logicalline default", True),
                measure_memory(corpus, parser_no_text, "logicalline no line text", False)]
    progress("measured logicalline memory")
    tokenize_traced, tokenize_tokens = measure_tokenize_memory(corpus)
    progress("measured tokenize memory")
    print_memory(corpus, measures, tokenize_traced, tokenize_tokens)
    print(f"\ntotal wall time {time.perf_counter() - started:.0f} s; load average now "
          f"{load_text()}")


# ---------------------------------------------------------------------------------------------


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
    print(f"parso: {parso.__version__ if parso else 'not installed'}; {os.cpu_count()} CPUs, "
          f"load average at start {load_text()} (other work on the machine slows every "
          "contender alike, so the ratios hold better than the seconds)\n")
    if options.ops:
        run_ops(corpus, options.runs)
    else:
        run_comparison(corpus, options.runs, options.slow_runs)


if __name__ == "__main__":
    main()
