"""logicalline-dump: print Python files' logical lines as logicalline reads them.

With no argument it dumps a bundled sample; given files or directories (walked
for *.py), it dumps each one, and "-" reads a source from stdin.

A file is decoded as the interpreter would (byte-order mark, else coding
declaration, else UTF-8) by logicalline_dump.source_to_utf8. Bytes that do not
decode are read on, shown as U+FFFD, where the interpreter would stop; a
declaration that the interpreter refuses fails the file with its message.

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
  {"path", "logical_lines": N}, with "error": MESSAGE if it failed;
and {"path", "error"} for a directory that held no .py file or could not be
listed. A file name that is not UTF-8 adds "path_hex", the hex of its bytes.
With --summary, one object instead:
  {"counts": {TYPE: N, ...}, "lines", "files", "bytes", "seconds",
   "errors": [{"path", "error"}, ...]}

--options takes NAME=BOOL,... for copy_strings, skip_whitespace_lines,
remove_comments and include_line_text (all on by default); BOOL is 1/0,
true/false, yes/no or on/off.

--jobs N writes byte for byte what a serial run writes; it pays on large
inputs and idle cores. A file is read in windows and each logical line is
released once written, so memory follows the biggest file, not the run. On a
terminal, a run longer than a second shows its progress on stderr, unless
--quiet or the dump goes to that terminal too.

Exit status: 0 when every input was dumped; 1 when any could not be read,
decoded or parsed, or a directory held no .py file (each is reported on stderr
and the rest are still dumped); 2 for a usage error; 130 after Ctrl-C; 141 when
the reader of the output goes away (| head, say).
"""

import argparse
import collections
import json
import os
import signal
import sys
import time

import logicalline

from . import progress
from .dump import ParallelDump, dump_file
from .reading import STDIN, find_sources, path_fields
from .workers import interrupts_held

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


def plural(count, noun):
    return f"{count} {noun}" if count == 1 else f"{count} {noun}s"


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
    out.write(f"{plural(files, 'file')}, {size / 1e6:.2f} MB in {elapsed:.3f} s: "
              f"{files / elapsed:.0f} files/s, {size / 1e6 / elapsed:.1f} MB/s; "
              f"{len(failures)} failed\n")


def argument_parser():
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
    arguments.add_argument("--version", action="version",
                           version=f"logicalline-dump {logicalline.__version__}")
    return arguments


def drop_output(out):
    """Points out's file at devnull, so that what it still holds goes nowhere."""
    try:
        os.dup2(os.open(os.devnull, os.O_WRONLY), out.fileno())
    except (OSError, ValueError):
        pass


def stop_once(signum, frame):
    """Ctrl-C: ends the run once, and leaves the clean-up on the way out uninterrupted."""
    signal.signal(signal.SIGINT, signal.SIG_IGN)
    raise KeyboardInterrupt


def main(argv=None):
    try:
        options = argument_parser().parse_args(argv)
    except SystemExit as leaving:  # usage errors and --help, returned for in-process callers
        return leaving.code
    previous = signal.signal(signal.SIGINT, stop_once)
    try:
        return dump(options)
    except KeyboardInterrupt:  # the workers and their files are gone by now
        # What is still buffered stays unwritten: a reader that has stopped reading would hold
        # the flush at exit for good, with Ctrl-C no longer heard.
        drop_output(sys.stdout)
        sys.stderr.write("logicalline-dump: interrupted\n")
        return 130
    finally:
        signal.signal(signal.SIGINT, previous)


def dump(options):
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
            with interrupts_held():  # so that a Ctrl-C finds them on record, to be ended
                parallel = ParallelDump(parser, settings, style, sources, sizes, options.jobs,
                                        out)
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
    except BrokenPipeError:  # the reader has gone: the flush at exit must stay silent
        drop_output(out)
        return 141
    finally:
        if parallel:
            parallel.close()
        display.close()
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
