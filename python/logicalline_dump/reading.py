"""Reading inputs for the dump: finding the sources, decoding them to the UTF-8 that the module
reads, and reading a file's logical lines in windows so that no whole file's lines are held."""

import array
import io
import os
import re
import sys
import tokenize

STDIN = "-"
# Physical lines per window: enough that the call overhead vanishes, few enough that a window's
# LogicalLine objects stay a few megabytes whatever the file size.
WINDOW = 20000


def find_sources(paths, fail):
    """Returns the inputs in dump order: files as given, directories walked for *.py in sorted
    order. A directory that cannot be listed, or holds no .py file, goes to `fail` instead."""
    sources, unlisted = [], []

    def unlistable(error):
        unlisted.append(error.filename)
        fail(error.filename, f"cannot read {error.filename}: {error.strerror or error}")

    for path in paths:
        if path == STDIN or not os.path.isdir(path):
            sources.append(path)
            continue
        found, failed = len(sources), len(unlisted)
        for root, dirs, files in os.walk(path, onerror=unlistable):
            dirs.sort()
            sources.extend(os.path.join(root, name) for name in sorted(files)
                           if name.endswith(".py"))
        if len(sources) == found and len(unlisted) == failed:  # an unlistable one is told once
            fail(path, f"no .py files in {path}")
    return sources


def load(path):
    """Returns the bytes of an input, or raises OSError."""
    if path == STDIN:
        return sys.stdin.buffer.read()
    # Opening rather than checking the file type first: a FIFO or <(...) is a fine source, and
    # whatever cannot be read (a socket, say) says why through errno.
    with open(path, "rb") as handle:
        return handle.read()


def to_utf8(data):
    """Decodes data as the interpreter would (byte-order mark, coding declaration) and returns it
    as UTF-8, which is all the module reads."""
    try:
        encoding, _ = tokenize.detect_encoding(io.BytesIO(data).readline)
    except SyntaxError:  # an unknown codec, or first lines that are not UTF-8: keep the bytes
        return data
    if encoding == "utf-8":
        return data  # malformed bytes stay, for the module to show as U+FFFD
    return data.decode(encoding, "replace").encode()  # "utf-8-sig" drops the byte-order mark


def read_lines(parser, data, offset, first_line, line_count):
    """The one call into the module: the logical lines of data[offset:], numbered from
    first_line, that start within line_count physical lines."""
    return parser.GetLogicalLineListFromBuffer(memoryview(data)[offset:], first_line, line_count)


def windows(parser, data, window=WINDOW):
    """Yields (logical lines, offset in data reached) window by window: the lines together are
    those of one read of the whole, numbered from 1. Each read starts at the first physical line
    of a logical line, so it continues the whole read exactly; a logical line that runs past a
    window's last physical line is read to its end, and the next window starts after it."""
    # Physical lines end at b"\n" alone, as for readline; a lone CR stays inside its line.
    starts = array.array("q", [0])
    starts.extend(match.end() for match in re.finditer(b"\n", data))
    start = 0  # index of the window's first physical line
    while True:
        lines = read_lines(parser, data, starts[start], start + 1, window)
        end = lines[-1].fFirstLine - 1 + lines[-1].fLineCount if lines else 0
        start = max(start + window, end)
        if start >= len(starts) or starts[start] >= len(data):
            yield lines, len(data)
            return
        yield lines, starts[start]
