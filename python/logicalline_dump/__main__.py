"""logicalline-dump: print the logical lines of Python files as logicalline reads them.

With no argument it dumps a bundled sample; given files or directories (walked for *.py),
it dumps each one. --summary prints counts per line type and the reading speed instead.
"""

import argparse
import collections
import os
import sys
import time

import logicalline

SAMPLE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "sample.py")

# Line type constants by their bytes value, for printing.
LINE_TYPE_NAMES = {
    getattr(logicalline, name): name
    for name in dir(logicalline)
    if name.startswith("k") and isinstance(getattr(logicalline, name), bytes)
}


def iter_sources(paths):
    for path in paths:
        if os.path.isdir(path):
            for root, dirs, files in os.walk(path):
                dirs.sort()
                for name in sorted(files):
                    if name.endswith(".py"):
                        yield os.path.join(root, name)
        else:
            yield path


def read_lines(parser, path):
    with open(path, "rb") as handle:
        return parser.GetLogicalLineList(handle.readline)


def flags_of(line):
    marks = [("tabs", line.fTabsInIndent), ("spaces", line.fSpacesInIndent),
             ("incomplete", line.fIncomplete)]
    return ",".join(name for name, on in marks if on) or "-"


def dump_file(parser, path, out):
    out.write(f"== {path}\n")
    for line in read_lines(parser, path):
        name = line.fLocalScopeName
        out.write(f"{line.fFirstLine + 1:>5} +{line.fLineCount:<3} indent {line.fIndentLevel:<3} "
                  f"{flags_of(line):<18} {LINE_TYPE_NAMES[line.fType]:<18}"
                  f"{' ' + name if name is not None else ''}\n")
        tokens = "  ".join(f"{text!r}@{pos[0]}:{pos[1]}" for text, pos in line.fTokens)
        out.write(f"        {tokens}\n")


def summarize(parser, paths, out):
    counts = collections.Counter()
    files = size = 0
    start = time.perf_counter()
    for path in paths:
        with open(path, "rb") as handle:
            data = handle.read()
        readline = iter(data.splitlines(keepends=True) + [b""]).__next__
        for line in parser.GetLogicalLineList(readline):
            counts[LINE_TYPE_NAMES[line.fType]] += 1
        files += 1
        size += len(data)
    elapsed = max(time.perf_counter() - start, 1e-9)
    for name, count in counts.most_common():
        out.write(f"{name:<20} {count:>9}\n")
    out.write(f"{'lines':<20} {sum(counts.values()):>9}\n")
    out.write(f"{files} files, {size / 1e6:.2f} MB in {elapsed:.3f} s: "
              f"{files / elapsed:.0f} files/s, {size / 1e6 / elapsed:.1f} MB/s\n")


def main(argv=None):
    arguments = argparse.ArgumentParser(prog="logicalline-dump", description=__doc__.split("\n")[0])
    arguments.add_argument("paths", nargs="*", help="files or directories (default: a sample)")
    arguments.add_argument("--summary", action="store_true",
                           help="print counts per line type and the speed instead of lines")
    options = arguments.parse_args(argv)
    parser = logicalline.CreateLogicalLineParser()
    paths = list(iter_sources(options.paths or [SAMPLE]))
    try:
        if options.summary:
            summarize(parser, paths, sys.stdout)
        else:
            for path in paths:
                dump_file(parser, path, sys.stdout)
    except BrokenPipeError:
        sys.stderr.close()
    return 0


if __name__ == "__main__":
    sys.exit(main())
