"""logicalline-dump: print Python files' logical lines as logicalline reads them.

With no argument it dumps a bundled sample; given files or directories (walked
for *.py), it dumps each one, and "-" reads a source from stdin.

A file is decoded as the interpreter would: byte-order mark, else coding
declaration, else UTF-8. A declaration that the interpreter refuses (an
unknown or non-text encoding, or one that contradicts a byte-order mark) fails
the file with the interpreter's message. Bytes that do not decode are read on,
shown as U+FFFD, where the interpreter would stop.

Line numbers count from 1 everywhere: in the text, the JSON and the error
messages. Columns are byte offsets from 0 into the line's UTF-8 text. A file
name that is not UTF-8 shows its undecodable bytes as \\xNN escapes.

The text output gives "== PATH", then two rows per logical line:
   12 +2   indent 4   spaces             kFunctionDef       area
        'def'@12:4  'area'@12:8  '('@12:12  'self'@12:13  ...
that is: first line, +the physical lines it spans, indent width (tabs advance
to the next multiple of 8), flags (tabs and/or spaces in the indent;
incomplete: it ended while still open), line type, and the name that a class
or function definition defines; then each token as text@line:column.

--json writes JSON Lines instead, valid UTF-8 throughout. One record per
logical line:
  {"path", "type", "description", "first_line", "line_count", "indent",
   "tabs_in_indent", "spaces_in_indent", "incomplete", "name", "text",
   "tokens": [[text, line, column], ...]}
then, after its lines, one closing record per input file, even an empty one:
  {"path", "logical_lines": N}, N being the number of its line records, with
  "error": MESSAGE too if it could not be read, decoded or parsed;
and {"path", "error"} for a directory that held no .py file or could not be
listed. A file name that is not UTF-8 adds "path_hex" to each record: the hex
of its bytes, bytes.fromhex(path_hex). With --summary, one object instead:
  {"counts": {TYPE: N, ...}, "lines", "files", "bytes", "seconds",
   "errors": [{"path", "error"}, ...]}

--summary prints counts per line type, then the files, MB and speed, and how
many inputs failed. --options NAME=BOOL,... sets the parser options (all on by
default): copy_strings, skip_whitespace_lines, remove_comments,
include_line_text; BOOL is 1/0, true/false, yes/no or on/off.

--jobs N parses in N worker processes (0: one per core); the output is byte
for byte that of a serial run. It pays on idle cores from about a MB of
source. Measured on 2 idle cores and the 3.10 standard library (30 MB), -j 2
took 0.51 to 0.52 of the wall time of -j 1 for 1.00 to 1.02 times its CPU
time (text, --json; 0.58 and 1.04 with --summary), and 0.64 of it on 1.7 MB
of that library; on 0.05 MB it took 1.2 times as long. With the other core
busy it gained 3%.

Memory: one file is read at a time, in windows of 20,000 physical lines, and
each logical line is written in turn and then released. Measured on Python
3.10 and 3.13, the peak grew by at most 20 bytes per byte of the biggest file
when dumping the standard library, and by at most 130 per byte for a 10 MB
file of one line of 3.3 million numbers, 125 of them the module's own tokens
of that line. Each --jobs worker holds as much for the files it reads.

On a terminal a run longer than a second shows its progress on stderr (files
done, MB/s, time left; a bar with pip install 'logicalline[tools]'), unless
--quiet or stdout is that terminal too and the dump would scroll it away.

Exit status: 0 when every input was dumped, 1 when any could not be read,
decoded or parsed, or a directory held no .py file (each is reported on
stderr, after what was dumped of it, and the rest are still dumped), 2 for a
usage error. Output cut short by a closed pipe ends quietly with status 141,
as for other filters.
"""

import argparse
import collections
import json
import os
import sys
import time

import logicalline

from . import progress
from .dump import ParallelDump, dump_file
from .reading import STDIN, find_sources, path_fields

SAMPLE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "sample.py")
PARSER_OPTIONS = ("copy_strings", "skip_whitespace_lines", "remove_comments", "include_line_text")
BOOLEANS = {"1": True, "true": True, "yes": True, "on": True,
            "0": False, "false": False, "no": False, "off": False}


def parse_options(text):
    settings = {}
    for item in filter(None, text.split(",")):
        name, _, value = (part.strip().lower() for part in item.partition("="))
        if name not in PARSER_OPTIONS:
            raise argparse.ArgumentTypeError(
                f"unknown option {name!r}; valid names: {', '.join(PARSER_OPTIONS)}")
        if value not in BOOLEANS:
            raise argparse.ArgumentTypeError(
                f"{name} takes 1/0, true/false, yes/no or on/off, not {value!r}")
        settings[name] = BOOLEANS[value]
    return settings


# The newest Python that the module reads as that version does; later ones read as it does.
NEWEST_PYTHON = logicalline.kNewestFeatureVersion


def parse_python(text):
    major, dot, minor = text.partition(".")
    if not (dot and major.isdigit() and minor.isdigit()) or int(major) != 3:
        raise argparse.ArgumentTypeError(f"--python takes a version such as 3.12, not {text!r}")
    return int(major), int(minor)


def parse_jobs(text):
    jobs = int(text)
    if jobs < 0:
        raise argparse.ArgumentTypeError(f"--jobs takes 0 or more, not {jobs}")
    return jobs or os.cpu_count() or 1


def file_size(path):
    try:
        return os.stat(path).st_size if path != STDIN else 0
    except OSError:
        return 0


def write_summary(counts, files, size, elapsed, failures, as_json, out):
    if as_json:
        out.write(json.dumps({"counts": dict(counts.most_common()), "lines": sum(counts.values()),
                              "files": files, "bytes": size, "seconds": elapsed,
                              "errors": [{**path_fields(path), "error": message}
                                         for path, message in failures]}) + "\n")
        return
    for name, count in counts.most_common():
        out.write(f"{name:<20} {count:>9}\n")
    out.write(f"{'lines':<20} {sum(counts.values()):>9}\n")
    out.write(f"{files} files, {size / 1e6:.2f} MB in {elapsed:.3f} s: {files / elapsed:.0f} "
              f"files/s, {size / 1e6 / elapsed:.1f} MB/s; {len(failures)} failed\n")


def main(argv=None):
    arguments = argparse.ArgumentParser(
        prog="logicalline-dump", description=__doc__.split("\n\n")[0],
        epilog=__doc__.split("\n\n", 1)[1], formatter_class=argparse.RawDescriptionHelpFormatter)
    arguments.add_argument("paths", nargs="*",
                           help='files or directories, "-" for stdin (default: a sample)')
    arguments.add_argument("--summary", action="store_true",
                           help="print counts per line type and the speed instead of lines")
    arguments.add_argument("--json", action="store_true", help="write JSON Lines to stdout")
    arguments.add_argument("--options", type=parse_options, action="append", default=[],
                           metavar="NAME=BOOL,...", help="set parser options (default: all on)")
    arguments.add_argument(
        "--python", type=parse_python, default=NEWEST_PYTHON, metavar="X.Y",
        help="read code as Python X.Y does: f-strings with nested fields from 3.12, "
             "t-strings from 3.14, lazy imports from 3.15 (default: %s, the newest the module "
             "knows, so that code reads as it runs)" % ".".join(map(str, NEWEST_PYTHON)))
    arguments.add_argument("--jobs", "-j", type=parse_jobs, default=1, metavar="N",
                           help="parse in N worker processes, 0 for one per core (default: 1)")
    arguments.add_argument("--quiet", "-q", action="store_true", help="show no progress")
    try:
        options = arguments.parse_args(argv)
    except SystemExit as leaving:  # usage errors and --help, returned for in-process callers
        return leaving.code
    settings = {}
    for chosen in options.options:
        settings.update(chosen)
    settings["feature_version"] = options.python  # workers make their parsers from settings
    parser = logicalline.CreateLogicalLineParser(**settings)
    style = "summary" if options.summary else "json" if options.json else "text"
    out, failures, counts = sys.stdout, [], collections.Counter()
    display, parallel = progress.Silent(0, 0), None

    def fail(path, message):
        failures.append((path, message))
        display.note(f"logicalline-dump: {message}")

    def fail_directory(path, message):  # a file's own output closes with its failure
        fail(path, message)
        if style == "json":
            out.write(json.dumps({**path_fields(path), "error": message}) + "\n")

    emit = counts.update if style == "summary" else out.write
    start = time.perf_counter()
    files = size = 0
    try:
        sources = find_sources(options.paths or [SAMPLE], fail_directory)
        sizes = [file_size(path) for path in sources]
        if options.jobs == 1:
            results = (dump_file(parser, style, path, emit, display.moved) for path in sources)
        else:
            out.flush()  # before the workers start, so that they inherit no pending output
            parallel = ParallelDump(parser, settings, style, sources, sizes, options.jobs, out)
        display = progress.progress(len(sources), sum(sizes), not options.quiet and (
            sys.stderr.isatty() and (options.summary or not sys.stdout.isatty())))
        if parallel:
            results = parallel.results(emit, display.moved)
        for (read, failure), path, stat_size in zip(results, sources, sizes):
            display.file_done(stat_size)
            if failure:
                fail(path, failure)
            else:
                files, size = files + 1, size + read
        display.close()
        if options.summary:
            write_summary(counts, files, size, max(time.perf_counter() - start, 1e-9), failures,
                          options.json, out)
        out.flush()  # inside the try: with `| head` the last write may only fail here
    except BrokenPipeError:
        display.close()
        # The reader has gone; point stdout at devnull so the flush at exit stays silent.
        try:
            os.dup2(os.open(os.devnull, os.O_WRONLY), out.fileno())
        except (OSError, ValueError):
            pass
        return 141
    finally:
        if parallel:
            parallel.close()
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
