"""Reading in parallel in one process: interpreter workers, each with a lock of its own.

    python3.14 bench/parallel.py [--every N] [--batches N] [--rounds N] [--cycles N]

Workers: reads the standard library (every Nth .py file; default all) in an
InterpreterPoolExecutor with one worker, then with two. Each worker reads its batches of files
with GetLogicalLineListFromBuffer, reads every line's fTokens and hands back a digest per file
(bench/summaries.py); the main interpreter then checks that the digests are its own. Prints the
wall time of each pool, the best of --rounds runs once every worker has started, and two
workers' time over one's: at most 0.7 is the target on two idle cores. A control ratio follows,
of the same pools summing ranges, which share nothing: on a loaded machine it shows how far two
workers can get at all.

Memory: creates and closes --cycles interpreters (default 50) that each import the module, read
a file with its fTokens and install a create hook, and prints how much the process's resident
memory and C heap grew over them (after a few cycles that are not counted).

Needs Python 3.14 or later (concurrent.interpreters) and Linux (/proc, glibc's mallinfo2).
"""

import argparse
import ctypes
import gc
import math
import os
import sys
import time

import summaries

TARGET_RATIO = 0.7
CONTROL_SUM = 10**7
WARM_CYCLES = 5
CYCLE = """
import io, os, logicalline
parser = logicalline.CreateLogicalLineParser()
lines = parser.GetLogicalLineListFromBuffer(open(os.__file__, "rb").read())
tokens = [line.fTokens for line in lines]
logicalline.SetLogicalCreateFunction(lambda *parts: parts[1])
numbers = parser.GetLogicalLineList(io.BytesIO(b"x = 1\\ny = 2\\n").readline)
"""


def time_pool(workers, task, items, rounds):
    """Returns the best wall time of a pool of `workers` mapping task over the items, and the
    results of the last run."""
    from concurrent.futures import InterpreterPoolExecutor
    best = math.inf
    with InterpreterPoolExecutor(workers) as pool:
        # Tasks that overlap make the pool start every worker before the clock runs.
        list(pool.map(time.sleep, [0.3] * workers))
        for _ in range(rounds):
            start = time.perf_counter()
            results = list(pool.map(task, items))
            best = min(best, time.perf_counter() - start)
    return best, results


def time_workers(options):
    paths = summaries.standard_library(options.every)
    size = sum(os.path.getsize(path) for path in paths)
    count = max(1, len(paths) // options.batches)
    batches = [paths[i:i + count] for i in range(0, len(paths), count)]
    main_time = math.inf
    for _ in range(options.rounds):
        start = time.perf_counter()
        expected = summaries.summarize(paths)
        main_time = min(main_time, time.perf_counter() - start)
    print(f"sample: {len(paths)} files, {size / 1e6:.1f} MB, in {len(batches)} batches; "
          f"{os.cpu_count()} cores, load average {os.getloadavg()[0]:.2f}")
    print(f"main interpreter alone  {main_time:7.3f} s")
    times = {}
    for workers in (1, 2):
        times[workers], found = time_pool(workers, summaries.summarize, batches, options.rounds)
        if [item for batch in found for item in batch] != expected:
            sys.exit(f"{workers} worker(s) read differently from the main interpreter")
        print(f"{workers} worker(s)             {times[workers]:7.3f} s")
    ratio = times[2] / times[1]
    print(f"two workers / one       {ratio:7.3f}  (target <= {TARGET_RATIO} on two idle cores)")
    # The same pools summing ranges, work that shares nothing: what the machine allows now.
    control = [time_pool(workers, sum, [range(CONTROL_SUM)] * 8, 1)[0] for workers in (1, 2)]
    print(f"control: two workers / one summing ranges {control[1] / control[0]:7.3f}")


class Heap(ctypes.Structure):  # glibc's struct mallinfo2
    _fields_ = [(name, ctypes.c_size_t) for name in "arena ordblks smblks hblks hblkhd usmblks "
                "fsmblks uordblks fordblks keepcost".split()]


def memory():
    """(resident bytes, C heap bytes in use) of the process."""
    gc.collect()
    mallinfo2 = ctypes.CDLL(None).mallinfo2
    mallinfo2.restype = Heap
    heap = mallinfo2()
    with open("/proc/self/statm") as statm:
        resident = int(statm.read().split()[1]) * os.sysconf("SC_PAGE_SIZE")
    return resident, heap.uordblks + heap.hblkhd


def measure_cycles(cycles):
    from concurrent import interpreters

    def cycle():
        interpreter = interpreters.create()
        interpreter.exec(CYCLE)
        interpreter.close()

    for _ in range(WARM_CYCLES):
        cycle()
    before = memory()
    start = time.perf_counter()
    for _ in range(cycles):
        cycle()
    elapsed = time.perf_counter() - start
    after = memory()
    print(f"{cycles} interpreters created and closed in {elapsed:.2f} s, each reading "
          f"{os.path.basename(os.__file__)} and installing a create hook:")
    print(f"  resident memory grew {(after[0] - before[0]) / 1e3:8.0f} KB, "
          f"C heap {(after[1] - before[1]) / 1e3:8.0f} KB")


def main():
    arguments = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    arguments.add_argument("--every", type=int, default=1, metavar="N")
    arguments.add_argument("--batches", type=int, default=200, metavar="N")
    arguments.add_argument("--rounds", type=int, default=3, metavar="N")
    arguments.add_argument("--cycles", type=int, default=50, metavar="N")
    options = arguments.parse_args()
    if sys.version_info < (3, 14):
        sys.exit("interpreter workers need Python 3.14 or later (concurrent.interpreters)")
    time_workers(options)
    measure_cycles(options.cycles)


if __name__ == "__main__":
    main()
