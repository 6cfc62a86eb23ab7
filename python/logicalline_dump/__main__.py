"""logicalline-dump: print the logical lines of Python files as logicalline reads them.

With no argument it dumps a bundled sample; given files or directories (walked for *.py),
it dumps each one, and "-" reads a source from stdin. --summary prints counts per line type
and the reading speed instead. --json writes one JSON object per input on stdout (JSON Lines):
{"path", "lines": [{"type", "description", "first_line", "line_count", "indent",
"tabs_in_indent", "spaces_in_indent", "incomplete", "name", "text", "tokens"}]}, or
{"path", "error"} for an input that failed; with --summary, a single object of counts.
--options NAME=BOOL,... sets the parser options (all on by default): copy_strings,
skip_whitespace_lines, remove_comments, include_line_text; BOOL is 1/0, true/false, yes/no
or on/off.

Exit status: 0 when every input was dumped, 1 when any could not be read or parsed (each is
reported on stderr and the rest are still dumped), 2 for a usage error. Output cut short by a
closed pipe ends quietly with status 141, as for other filters.
"""

import argparse
import collections
import io
import json
import os
import sys
import time

import logicalline

SAMPLE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "sample.py")
STDIN = "-"
PARSER_OPTIONS = ("copy_strings", "skip_whitespace_lines", "remove_comments", "include_line_text")
BOOLEANS = {"1": True, "true": True, "yes": True, "on": True,
            "0": False, "false": False, "no": False, "off": False}

# Line type constants by their bytes value, for printing.
LINE_TYPE_NAMES = {
    getattr(logicalline, name): name
    for name in dir(logicalline)
    if name.startswith("k") and isinstance(getattr(logicalline, name), bytes)
}


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


def iter_sources(paths, fail):
    # A directory that cannot be listed is reported where the walk meets it, then skipped.
    def unlistable(error):
        fail(error.filename, f"cannot read {error.filename}: {error.strerror or error}")

    for path in paths:
        if path != STDIN and os.path.isdir(path):
            for root, dirs, files in os.walk(path, onerror=unlistable):
                dirs.sort()
                for name in sorted(files):
                    if name.endswith(".py"):
                        yield os.path.join(root, name)
        else:
            yield path


def read_source(parser, path, fail):
    """Returns (source bytes, logical lines), or None once the failure has gone to `fail`."""
    try:
        if path == STDIN:
            data = sys.stdin.buffer.read()
        else:
            # Opening rather than checking the file type first: a FIFO or <(...) is a fine
            # source, and whatever cannot be read (a socket, say) says why through errno.
            with open(path, "rb") as handle:
                data = handle.read()
    except OSError as error:
        fail(path, f"cannot read {path}: {error.strerror or error}")
        return None
    try:
        return data, parser.GetLogicalLineList(io.BytesIO(data).readline)
    except (ValueError, OverflowError, MemoryError) as error:
        fail(path, f"{path}: {str(error) or type(error).__name__}")
        return None


def line_text(line):
    # Tokens decode with replacement but the line text is strict; a file in another encoding
    # should still dump, so fall back to the same replacement for the text.
    try:
        return line.fLineText
    except UnicodeDecodeError as error:
        return error.object.decode("utf-8", "replace")


def flags_of(line):
    marks = [("tabs", line.fTabsInIndent), ("spaces", line.fSpacesInIndent),
             ("incomplete", line.fIncomplete)]
    return ",".join(name for name, on in marks if on) or "-"


def dump_text(path, lines, out):
    out.write(f"== {path}\n")
    for line in lines:
        name = line.fLocalScopeName
        out.write(f"{line.fFirstLine + 1:>5} +{line.fLineCount:<3} indent {line.fIndentLevel:<3} "
                  f"{flags_of(line):<18} {LINE_TYPE_NAMES[line.fType]:<18}"
                  f"{' ' + name if name is not None else ''}\n")
        tokens = "  ".join(f"{text!r}@{pos[0]}:{pos[1]}" for text, pos in line.fTokens)
        out.write(f"        {tokens}\n")


def line_record(line):
    return {
        "type": LINE_TYPE_NAMES[line.fType], "description": line.fType.decode(),
        "first_line": line.fFirstLine, "line_count": line.fLineCount,
        "indent": line.fIndentLevel, "tabs_in_indent": bool(line.fTabsInIndent),
        "spaces_in_indent": bool(line.fSpacesInIndent), "incomplete": bool(line.fIncomplete),
        "name": line.fLocalScopeName, "text": line_text(line),
        "tokens": [[text, row, column] for text, (row, column) in line.fTokens],
    }


def write_json(record, out):
    # ASCII escapes keep the output valid even for file names that are not UTF-8.
    out.write(json.dumps(record) + "\n")


def summarize(parser, sources, fail, failures, as_json, out):
    counts = collections.Counter()
    files = size = 0
    start = time.perf_counter()
    for path in sources:
        loaded = read_source(parser, path, fail)
        if loaded is None:
            continue
        data, lines = loaded
        counts.update(LINE_TYPE_NAMES[line.fType] for line in lines)
        files += 1
        size += len(data)
    elapsed = max(time.perf_counter() - start, 1e-9)
    if as_json:
        write_json({"counts": dict(counts.most_common()), "lines": sum(counts.values()),
                    "files": files, "bytes": size, "seconds": elapsed, "errors": failures}, out)
        return
    for name, count in counts.most_common():
        out.write(f"{name:<20} {count:>9}\n")
    out.write(f"{'lines':<20} {sum(counts.values()):>9}\n")
    out.write(f"{files} files, {size / 1e6:.2f} MB in {elapsed:.3f} s: "
              f"{files / elapsed:.0f} files/s, {size / 1e6 / elapsed:.1f} MB/s\n")


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
    try:
        options = arguments.parse_args(argv)
    except SystemExit as leaving:  # usage errors and --help, returned for in-process callers
        return leaving.code
    settings = {}
    for chosen in options.options:
        settings.update(chosen)
    parser = logicalline.CreateLogicalLineParser(**settings)
    out, failures = sys.stdout, []

    def fail(path, message):
        failures.append({"path": path, "error": message})
        sys.stderr.write(f"logicalline-dump: {message}\n")
        if options.json and not options.summary:
            write_json(failures[-1], out)

    sources = iter_sources(options.paths or [SAMPLE], fail)
    try:
        if options.summary:
            summarize(parser, sources, fail, failures, options.json, out)
        else:
            for path in sources:
                loaded = read_source(parser, path, fail)
                if loaded is None:
                    continue
                if options.json:
                    write_json({"path": path, "lines": [line_record(x) for x in loaded[1]]}, out)
                else:
                    dump_text(path, loaded[1], out)
        out.flush()  # inside the try: with `| head` the last write may only fail here
    except BrokenPipeError:
        # The reader has gone; point stdout at devnull so the flush at exit stays silent.
        try:
            os.dup2(os.open(os.devnull, os.O_WRONLY), out.fileno())
        except (OSError, ValueError):
            pass
        return 141
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
