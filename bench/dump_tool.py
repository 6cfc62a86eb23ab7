"""The dump tool as a user runs it: wall and CPU time with --jobs 1, 2 and 0 on the corpus, and
peak memory per byte of input on a file of one dense line and on the corpus.

Every figure comes from a fresh run of the tool by this interpreter, its output going to
/dev/null. CPU time is what os.times() counts for finished children: the tool and its worker
processes, user plus system. Peak memory is the tool's own high-water mark (VmHWM) with
--jobs 1; its growth is that peak less the peak of a run over an empty file (the interpreter
with the tool loaded), per byte of the biggest input file.
"""

import os
import subprocess
import sys
import tempfile
import time

from contenders import load_text, progress
from corpus import MB

JOBS = (1, 2, 0)
STYLES = (("text", []), ("--json", ["--json"]), ("--summary", ["--summary"]))
DENSE_BYTES = 10_000_000

# The high-water mark of this process's own memory, read where it ends. Not ru_maxrss: a child
# keeps that of the process it was forked from, this benchmark, which holds the whole corpus.
HIGH_WATER = ("sys.stderr.write('\\n%s\\n' % [line.split()[1] for line in open('/proc/self/status')"
              " if line.startswith('VmHWM:')][0])")
# The tool's main() in a child, which then writes its peak in KB as the last line of stderr.
TOOL_PEAK = ("import sys; from logicalline_dump.__main__ import main; main(sys.argv[1:]); "
             + HIGH_WATER)
# The module alone on the same file: its lines as read, and with every fTokens built.
MODULE_PEAK = ("import sys, logicalline; data = open(sys.argv[1], 'rb').read();"
               " lines = logicalline.CreateLogicalLineParser().GetLogicalLineListFromBuffer(data);"
               " tokens = [line.fTokens for line in lines] if sys.argv[2] == '1' else None; "
               + HIGH_WATER)


def timed_run(arguments):
    """Returns (wall seconds, CPU seconds of the tool and its workers) of one run."""
    before, start = os.times(), time.perf_counter()
    subprocess.run([sys.executable, "-m", "logicalline_dump", "--quiet", *arguments],
                   stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=False)
    wall, after = time.perf_counter() - start, os.times()
    return wall, (after.children_user - before.children_user
                  + after.children_system - before.children_system)


def peak_bytes(code, arguments):
    done = subprocess.run([sys.executable, "-c", code, *arguments], stdout=subprocess.DEVNULL,
                          stderr=subprocess.PIPE, check=False)
    return int(done.stderr.split()[-1]) * 1024


def top_level_inputs(corpus):
    """The corpus's files as the tool takes them: the top-level files and directories that hold
    them, so that what the corpus leaves out (site-packages) stays out."""
    tops = {os.path.relpath(path, corpus.root).split(os.sep)[0] for path in corpus.paths}
    return [os.path.join(corpus.root, top) for top in sorted(tops)]


def run_jobs(corpus, runs):
    """Times each output style with each --jobs setting, the runs interleaved so that a change in
    the machine's load falls on all of them. Returns {(style, jobs): (best wall, best CPU)}."""
    inputs = top_level_inputs(corpus)
    best = {}
    for run in range(runs):
        for style, flags in STYLES:
            for jobs in JOBS:
                wall, cpu = timed_run([*flags, "--jobs", str(jobs), *inputs])
                old_wall, old_cpu = best.get((style, jobs), (float("inf"), float("inf")))
                best[style, jobs] = (min(wall, old_wall), min(cpu, old_cpu))
        progress(f"dump tool run {run + 1} of {runs}")
    print(f"{'output':<10}" + "".join(f"{f'-j {jobs} wall':>12} {'CPU s':>7}" for jobs in JOBS)
          + f"{'-j 2/-j 1 wall':>16} {'CPU':>6}")
    for style, _ in STYLES:
        row = "".join(f"{best[style, jobs][0]:>12.2f} {best[style, jobs][1]:>7.2f}"
                      for jobs in JOBS)
        (wall1, cpu1), (wall2, cpu2) = best[style, 1], best[style, 2]
        print(f"{style:<10}{row}{wall2 / wall1:>15.2f}x {cpu2 / cpu1:>5.2f}x")
    print(f"(seconds, best of {runs} runs each; CPU: user + system of the tool and its workers; "
          f"-j 0 is one worker per core, {os.cpu_count()} here; output to /dev/null; load average "
          f"now {load_text()})")
    return best


def dense_source(size):
    count = (size - len(b"x = []\n")) // len(b"1, ")
    return b"x = [" + b"1, " * count + b"]\n"


def run_memory(corpus):
    """Prints peak memory of the tool, and of the module alone for reference; returns the worst
    growth per input byte, {"dense": ..., "tree": ...}, over the three output styles."""
    biggest = max(os.path.getsize(path) for path in corpus.paths)
    worst = {}
    with tempfile.TemporaryDirectory() as scratch:
        empty, dense = os.path.join(scratch, "empty.py"), os.path.join(scratch, "dense.py")
        open(empty, "wb").close()
        with open(dense, "wb") as handle:
            handle.write(dense_source(DENSE_BYTES))
        print(f"{'input':<34} {'output':<10} {'peak MB':>8} {'growth MB':>10} {'B per B':>8}")
        cases = [("dense", "one dense line: x = [1, 1, ...]", [dense], DENSE_BYTES),
                 ("tree", f"the corpus (biggest file {biggest / MB:.2f} MB)",
                  top_level_inputs(corpus), biggest)]
        for style, flags in STYLES:
            base = peak_bytes(TOOL_PEAK, [*flags, empty])
            for key, label, inputs, size in cases:
                peak = peak_bytes(TOOL_PEAK, [*flags, "--quiet", *inputs])
                growth = (peak - base) / size
                worst[key] = max(worst.get(key, 0.0), growth)
                print(f"{label:<34} {style:<10} {peak / MB:>8.1f} {(peak - base) / MB:>10.1f} "
                      f"{growth:>8.1f}")
            progress(f"measured the dump tool's memory, {style}")
        base = peak_bytes(MODULE_PEAK, [empty, "0"])
        for tokens, label in (("0", "lines"), ("1", "+ fTokens")):
            peak = peak_bytes(MODULE_PEAK, [dense, tokens])
            print(f"{'the module alone, one dense line':<34} {label:<10} {peak / MB:>8.1f} "
                  f"{(peak - base) / MB:>10.1f} {(peak - base) / DENSE_BYTES:>8.1f}")
    print("(peak: VmHWM of a run with --jobs 1; growth: the peak less that of the same run on an "
          "empty file; B per B: growth per byte of the biggest input file; the module alone: the "
          "lines of GetLogicalLineListFromBuffer on the file, then with every line's fTokens)")
    return worst
