"""Reading inputs for the dump: finding the sources and naming them, decoding them to the UTF-8
that the module reads, and reading a file's logical lines in windows so that no whole file's
lines are held."""

import array
import codecs
import os
import re
import sys

STDIN = "-"
BOM = b"\xef\xbb\xbf"
# A coding declaration as the interpreter finds it: a comment on the first line, or on the second
# after a first line that is blank or a comment. Matched on bytes, as the interpreter matches it,
# so that other bytes on that line need not be UTF-8.
DECLARATION = re.compile(rb"[ \t\f]*#.*?coding[:=][ \t]*([-\w.]+)", re.ASCII)
BLANK = re.compile(rb"[ \t\f]*(?:[#\r\n]|$)", re.ASCII)
# Physical lines per window: enough that the call overhead vanishes, few enough that a window's
# LogicalLine objects stay a few megabytes whatever the file size.
WINDOW = 20000


def path_fields(path):
    """The fields that name an input in a JSON record: "path", text that is valid UTF-8, and for a
    name that is not UTF-8 "path_hex" too, the hex of its bytes, from which it is recovered."""
    try:
        path.encode("utf-8")
    except UnicodeEncodeError:  # the bytes that the name could not decode to, kept as surrogates
        raw = os.fsencode(path)
        return {"path": raw.decode("utf-8", "backslashreplace"), "path_hex": raw.hex()}
    return {"path": path}


def shown(path):
    """An input's name in text output and messages: as in the "path" of its JSON records."""
    return path_fields(path)["path"]


def find_sources(paths, fail):
    """Returns the inputs in dump order: files as given, directories walked for *.py in sorted
    order. A directory that cannot be listed, or holds no .py file, goes to `fail` instead."""
    sources, unlisted = [], []

    def unlistable(error):
        unlisted.append(error.filename)
        fail(error.filename, f"cannot read {shown(error.filename)}: {error.strerror or error}")

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
            fail(path, f"no .py files in {shown(path)}")
    return sources


def load(path):
    """Returns the bytes of an input, or raises OSError."""
    if path == STDIN:
        return sys.stdin.buffer.read()
    # Opening rather than checking the file type first: a FIFO or <(...) is a fine source, and
    # whatever cannot be read (a socket, say) says why through errno.
    with open(path, "rb") as handle:
        return handle.read()


def declared_encoding(data, start):
    """Returns the encoding that a declaration on the first two lines of data[start:] names, as
    written, or None."""
    for _ in range(2):
        end = data.find(b"\n", start)
        end = len(data) if end < 0 else end + 1
        match = DECLARATION.match(data, start, end)
        if match:
            return match.group(1).decode("ascii")
        if not BLANK.match(data, start, end):
            return None
        start = end
    return None


def normal_name(name):
    """The interpreter's own spelling of the UTF-8 and Latin-1 names; others stay as written."""
    lowered = name[:12].lower().replace("_", "-")
    if lowered == "utf-8" or lowered.startswith("utf-8-"):
        return "utf-8"
    if lowered in ("latin-1", "iso-8859-1", "iso-latin-1") or lowered.startswith(
            ("latin-1-", "iso-8859-1-", "iso-latin-1-")):
        return "iso-8859-1"
    return name


def source_to_utf8(data: bytes) -> bytes:
    """Returns Python source bytes as the UTF-8 that logicalline reads, decoded as the interpreter
    decodes them: by a byte-order mark, else a coding declaration on the first two lines, else as
    UTF-8. Where the interpreter would stop, this reads on: bytes that do not decode stay
    malformed in UTF-8, or become U+FFFD in another encoding, and the module shows them as
    U+FFFD. Raises ValueError, with the interpreter's message, only for a declaration that the
    interpreter refuses: an unknown or non-text encoding, or one that contradicts a byte-order
    mark."""
    bom = data.startswith(BOM)
    name = declared_encoding(data, len(BOM) if bom else 0)
    if name is None or normal_name(name) == "utf-8":
        return data  # the module skips a byte-order mark
    if bom:
        raise ValueError(f"encoding problem: {name} with BOM")
    try:
        if codecs.lookup(name).name == "utf-8":
            return data
    except LookupError:
        raise ValueError(f"unknown encoding: {name}") from None
    try:
        try:
            text = data.decode(name)
        except UnicodeDecodeError:
            text = data.decode(name, "replace")
    except (LookupError, UnicodeError) as error:  # not a text encoding, or one that reads nothing
        raise ValueError(str(error) or f"cannot decode with {name}") from None
    # A codec that makes lone surrogates (an escape codec) leaves them as malformed UTF-8 too.
    return text.encode("utf-8", "surrogatepass")


def read_lines(parser, data, offset, first_line, line_count):
    """The one call into the module: the logical lines of data[offset:], numbered from
    first_line, that start within line_count physical lines."""
    if offset and data.startswith(BOM, offset):
        # The module skips a byte-order mark that opens its buffer, but only the one that opens
        # the file is no part of the source: this one stays, behind another for the module to
        # skip. The copy of the rest of the file is made only for such a rare window.
        return parser.GetLogicalLineListFromBuffer(BOM + data[offset:], first_line, line_count)
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
