"""Instructions per MB of source, counted by callgrind: a figure that does not move with the load
of a shared machine, for comparing two builds of the module.

    python3.10 bench/instructions.py [--every N] [--option NAME=VALUE ...] [MODE ...]

Reads every Nth standard library file (default 20) into memory, then counts the instructions
of one pass over them in each MODE (default: all), less a pass that only loads the files and
the module:
  parse    GetLogicalLineList through a BytesIO's readline, default options
  tokens   the same, then every line's fTokens
  buffer   GetLogicalLineListFromBuffer, default options
The pass runs in a fresh interpreter, so the module's process-wide tables start empty and their
first sightings are counted too; the interpreter's shutdown is not counted. The module is the one the running interpreter imports
(PYTHONPATH chooses a build). --option passes a keyword option to CreateLogicalLineParser, its
value read as a Python literal (feature_version=(3,13)).
"""

import argparse
import ast
import os
import re
import shutil
import subprocess
import sys
import tempfile

MODES = ("parse", "tokens", "buffer")

CHILD = r"""
import io, os, sys
root = os.path.dirname(os.__file__)
paths = sorted(os.path.join(d, n) for d, _, names in os.walk(root) for n in names
               if n.endswith(".py") and "-packages" not in d)[::EVERY]
sources = []
for path in paths:
    with open(path, "rb") as handle:
        sources.append(handle.read())
print(sum(map(len, sources)), file=sys.stderr)
import logicalline
parser = logicalline.CreateLogicalLineParser(**OPTIONS)
if MODE != "load":
    for data in sources:
        if MODE == "buffer":
            lines = parser.GetLogicalLineListFromBuffer(data)
        else:
            lines = parser.GetLogicalLineList(io.BytesIO(data).readline)
        if MODE == "tokens":
            for line in lines:
                line.fTokens
sys.stdout.flush()
os._exit(0)  # what the interpreter's shutdown releases is no part of reading
"""


def count(mode, every, options):
    """Returns (instructions, bytes of source) of one pass in a fresh interpreter."""
    code = CHILD.replace("EVERY", str(every)).replace("MODE", repr(mode)).replace(
        "OPTIONS", repr(options))
    with tempfile.TemporaryDirectory() as scratch:
        out = os.path.join(scratch, "callgrind.out")
        # Addresses steer some table lookups: without randomised addresses the count repeats.
        fixed = ["setarch", os.uname().machine, "-R"] if shutil.which("setarch") else []
        done = subprocess.run([*fixed, "valgrind", "--tool=callgrind",
                               f"--callgrind-out-file={out}", sys.executable, "-c", code],
                              capture_output=True, text=True, env=dict(os.environ,
                                                                        PYTHONHASHSEED="0"))
        if done.returncode != 0:
            sys.exit(done.stderr)
        with open(out) as counts:
            total = re.search(r"^totals: (\d+)", counts.read(), re.M)
    size = next(int(line) for line in done.stderr.splitlines() if line.isdigit())
    return int(total.group(1)), size


def main():
    arguments = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    arguments.add_argument("modes", nargs="*", metavar="MODE")
    arguments.add_argument("--every", type=int, default=20)
    arguments.add_argument("--option", action="append", default=[], metavar="NAME=VALUE")
    options = arguments.parse_args()
    unknown = set(options.modes) - set(MODES)
    if unknown:
        arguments.error(f"unknown mode {', '.join(sorted(unknown))}; modes: {', '.join(MODES)}")
    settings = {}
    for item in options.option:
        name, _, value = item.partition("=")
        settings[name] = ast.literal_eval(value)
    base, size = count("load", options.every, settings)
    print(f"sample: every {options.every}th file, {size / 1e6:.3f} MB; options {settings}")
    for mode in options.modes or MODES:
        total, _ = count(mode, options.every, settings)
        print(f"{mode:<8} {(total - base) / (size / 1e6) / 1e6:8.2f} M instructions per MB")


if __name__ == "__main__":
    main()
