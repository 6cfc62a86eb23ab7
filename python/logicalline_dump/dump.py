"""Dumping inputs: the three outputs of a window of lines, one input from reading to output, and
many inputs in worker processes, delivered in the order a serial run writes them."""

import collections
import concurrent.futures
import functools
import json

import logicalline

from .reading import STDIN, load, to_utf8, windows

BIG = 1 << 20  # bytes of a file too big to gather its whole output in a worker

# Line type constants by their bytes value, for printing.
LINE_TYPE_NAMES = {
    getattr(logicalline, name): name
    for name in dir(logicalline)
    if name.startswith("k") and isinstance(getattr(logicalline, name), bytes)
}


def line_text(line):
    # Tokens decode with replacement but the line text is strict; a file with malformed UTF-8
    # should still dump, so fall back to the same replacement for the text.
    try:
        return line.fLineText
    except UnicodeDecodeError as error:
        return error.object.decode("utf-8", "replace")


def flags_of(line):
    marks = [("tabs", line.fTabsInIndent), ("spaces", line.fSpacesInIndent),
             ("incomplete", line.fIncomplete)]
    return ",".join(name for name, on in marks if on) or "-"


def text_piece(path, lines, first):
    rows = [f"== {path}\n"] if first else []
    for line in lines:
        rows.append(f"{line.fFirstLine:>5} +{line.fLineCount:<3} indent {line.fIndentLevel:<3} "
                    f"{flags_of(line):<18} {LINE_TYPE_NAMES[line.fType]:<18} "
                    f"{line.fLocalScopeName or ''}".rstrip() + "\n")
        tokens = "  ".join(f"{text!r}@{line.fFirstLine + row}:{column}"
                           for text, (row, column) in line.fTokens)
        rows.append(f"        {tokens}\n")
    return "".join(rows)


def json_piece(path, lines, first):
    # ASCII escapes keep the output valid even for file names that are not UTF-8.
    return "".join(json.dumps({
        "path": path, "type": LINE_TYPE_NAMES[line.fType], "description": line.fType.decode(),
        "first_line": line.fFirstLine, "line_count": line.fLineCount,
        "indent": line.fIndentLevel, "tabs_in_indent": bool(line.fTabsInIndent),
        "spaces_in_indent": bool(line.fSpacesInIndent), "incomplete": bool(line.fIncomplete),
        "name": line.fLocalScopeName, "text": line_text(line),
        "tokens": [[text, line.fFirstLine + row, column] for text, (row, column) in line.fTokens],
    }) + "\n" for line in lines)


def count_piece(path, lines, first):
    return collections.Counter(LINE_TYPE_NAMES[line.fType] for line in lines)


STYLES = {"text": text_piece, "json": json_piece, "summary": count_piece}


def dump_file(parser, style, path, emit, moved=lambda size: None):
    """Reads one input and hands its output to emit a window at a time, and the bytes read to
    moved. Returns (size of the input, failure message or None); a failure partway through
    comes after the output of the lines before it."""
    try:
        raw = load(path)
    except OSError as error:
        return 0, f"cannot read {path}: {error.strerror or error}"
    data, offset = to_utf8(raw), 0
    try:
        for number, (lines, reached) in enumerate(windows(parser, data)):
            emit(STYLES[style](path, lines, number == 0))
            moved(reached - offset)
            offset = reached
    except (ValueError, OverflowError, MemoryError) as error:
        return len(raw), f"{path}: {str(error) or type(error).__name__}"
    return len(raw), None


def collect(parser, style, path):
    pieces = []
    return (pieces, *dump_file(parser, style, path, pieces.append))


def stream(parser, style, path, emit, moved):
    return ([], *dump_file(parser, style, path, emit, moved))


worker_parser = None  # one per worker process, made once


def start_worker(settings):
    global worker_parser
    worker_parser = logicalline.CreateLogicalLineParser(**settings)


def collect_in_worker(style, path):
    return collect(worker_parser, style, path)


def dump_parallel(parser, settings, style, sources, sizes, jobs, emit, moved):
    """Yields (size, failure) per input in order, as dump_file returns them, having handed the
    input's output to emit. A worker process dumps an input whole and this one writes it; a few
    run ahead of the one being written, no more. Stdin, which only this process has, and files
    over BIG bytes, whose whole output would weigh on memory, are streamed here in their turn."""
    with concurrent.futures.ProcessPoolExecutor(
            jobs, initializer=start_worker, initargs=(settings,)) as pool:
        pending = collections.deque()

        def deliver():
            pieces, size, failure = pending.popleft()()
            for piece in pieces:
                emit(piece)
            return size, failure

        try:
            for path, size in zip(sources, sizes):
                if path == STDIN or size > BIG:
                    pending.append(functools.partial(stream, parser, style, path, emit, moved))
                else:
                    pending.append(pool.submit(collect_in_worker, style, path).result)
                if len(pending) > 2 * jobs:
                    yield deliver()
            while pending:
                yield deliver()
        finally:
            pool.shutdown(cancel_futures=True)
