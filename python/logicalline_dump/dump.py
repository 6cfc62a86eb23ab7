"""Dumping inputs: the output of each logical line in the three styles, one input from reading to
its closing record, and many inputs in worker processes, delivered in the order a serial run
writes them."""

import collections
import json
import os
import shutil
import tempfile

import logicalline

from .reading import STDIN, load, path_fields, source_to_utf8, windows
from .workers import Workers, interrupts_held

# Tokens per write of one line's tokens: a line of millions of them is written in parts, so that
# its output never stands whole in memory.
PIECE = 4096
# Bytes of source per task of a worker process, at most and at least (a bigger file is a task
# of its own): large enough that a task's own cost vanishes, smaller towards the end, so that
# the workers finish together.
CHUNK = 1 << 20
SMALLEST = 1 << 17

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


# The flags column by (tabs in the indent, spaces in it, incomplete).
FLAGS = {(tabs, spaces, incomplete): ",".join(
    name for name, on in (("tabs", tabs), ("spaces", spaces), ("incomplete", incomplete)) if on)
    or "-" for tabs in (False, True) for spaces in (False, True) for incomplete in (False, True)}


def pieces(tokens):
    """The tokens in slices of PIECE, so that a dense line is written a part at a time."""
    return (tokens[start:start + PIECE] for start in range(0, len(tokens), PIECE))


def text_row(tokens, first):
    return "  ".join([f"{text!r}@{first + row}:{column}" for text, (row, column) in tokens])


def write_text(emit, fields, line):
    tokens, first = line.fTokens, line.fFirstLine
    flags = FLAGS[line.fTabsInIndent, line.fSpacesInIndent, line.fIncomplete]
    head = (f"{first:>5} +{line.fLineCount:<3} indent {line.fIndentLevel:<3} {flags:<18} "
            f"{LINE_TYPE_NAMES[line.fType]:<18} {line.fLocalScopeName or ''}".rstrip()
            + "\n        ")
    if len(tokens) <= PIECE:
        emit(head + text_row(tokens, first) + "\n")
        return
    emit(head)
    separator = ""
    for piece in pieces(tokens):
        emit(separator + text_row(piece, first))
        separator = "  "
    emit("\n")


def json_tokens(tokens, first):
    return [[text, first + row, column] for text, (row, column) in tokens]


def write_json(emit, fields, line):
    tokens, first = line.fTokens, line.fFirstLine
    record = {
        **fields, "type": LINE_TYPE_NAMES[line.fType], "description": line.fType.decode(),
        "first_line": first, "line_count": line.fLineCount,
        "indent": line.fIndentLevel, "tabs_in_indent": bool(line.fTabsInIndent),
        "spaces_in_indent": bool(line.fSpacesInIndent), "incomplete": bool(line.fIncomplete),
        "name": line.fLocalScopeName, "text": line_text(line), "tokens": [],
    }
    if len(tokens) <= PIECE:
        record["tokens"] = json_tokens(tokens, first)
        emit(json.dumps(record) + "\n")
        return
    # The same bytes as one json.dumps of the whole record: its head up to the token list's
    # opening bracket, then the tokens a piece at a time.
    emit(json.dumps(record)[:-2])
    separator = ""
    for piece in pieces(tokens):
        emit(separator + json.dumps(json_tokens(piece, first))[1:-1])
        separator = ", "
    emit("]}\n")


def write_window(style, emit, fields, lines):
    """Writes a window's lines, releasing each (with its fTokens) once it is written."""
    if style == "summary":
        emit(collections.Counter(LINE_TYPE_NAMES[line.fType] for line in lines))
        return
    write = write_json if style == "json" else write_text
    for index, line in enumerate(lines):
        lines[index] = None
        write(emit, fields, line)


def dump_file(parser, style, path, emit, moved=lambda size: None):
    """Reads one input and hands its output to emit (text and JSON as strings, the summary as
    counts), and the bytes read to moved. In JSON the input's last record closes it: the number
    of its line records and, if it failed, why. Returns (size of the input, failure message or
    None); a failure partway through comes after the output of the lines before it."""
    fields = path_fields(path)
    size = written = 0
    try:
        raw = load(path)
    except OSError as error:
        failure = f"cannot read {fields['path']}: {error.strerror or error}"
    else:
        size, failure = len(raw), None
        try:
            data, offset = source_to_utf8(raw), 0
            del raw
            for number, (lines, reached) in enumerate(windows(parser, data)):
                if number == 0 and style == "text":
                    emit(f"== {fields['path']}\n")
                write_window(style, emit, fields, lines)
                written += len(lines)
                moved(reached - offset)
                offset = reached
        except (ValueError, OverflowError, MemoryError) as error:
            failure = f"{fields['path']}: {str(error) or type(error).__name__}"
    if style == "json":
        closing = {**fields, "logical_lines": written}
        if failure:
            closing["error"] = failure
        emit(json.dumps(closing) + "\n")
    return size, failure


def tasks(sources, sizes, jobs):
    """Splits the inputs, in order, into runs of consecutive files, each of about a quarter of
    what is left per worker, between SMALLEST and CHUNK bytes; stdin is a run of its own."""
    left = sum(sizes)
    start = weight = 0
    for index, (path, size) in enumerate(zip(sources, sizes)):
        if path == STDIN:
            if start < index:
                yield start, index
            yield index, index + 1
            start, weight = index + 1, 0
            continue
        weight += size
        if weight >= max(SMALLEST, min(CHUNK, left // (4 * jobs))):
            yield start, index + 1
            left -= weight
            start, weight = index + 1, 0
    if start < len(sources):
        yield start, len(sources)


class ParallelDump:
    """Dumps the inputs in worker processes, forked when this object is made: before any thread
    of this process starts, and so with the module loaded and the inputs known. A worker dumps a
    run of consecutive inputs into a file of its own, which results() copies to `out` in order;
    a few runs are under way ahead of the one being copied, no more. Stdin, which only this
    process reads, is dumped here in its turn."""

    def __init__(self, parser, settings, style, sources, sizes, jobs, out):
        self.parser, self.style, self.sources, self.out = parser, style, sources, out
        self.runs = list(tasks(sources, sizes, jobs))
        self.ahead = 2 * jobs  # runs handed out past the one being copied
        self.target = getattr(out, "buffer", None)  # written to as bytes, with no decoding
        encoding, errors = (out.encoding, out.errors) if self.target else ("utf-8", "strict")
        self.scratch = tempfile.mkdtemp(prefix="logicalline-dump-")
        parsers = []  # the worker's own, made when it starts

        def dump_run(number):
            """In a worker: dumps a run, text and JSON into a file encoded as out encodes."""
            start, stop = self.runs[number]
            paths = sources[start:stop]
            if style == "summary":
                counts = collections.Counter()
                return number, [dump_file(parsers[0], style, path, counts.update)
                                for path in paths], counts
            with open(self.output(number), "w", encoding=encoding, errors=errors,
                      buffering=1 << 16) as handle:
                return number, [dump_file(parsers[0], style, path, handle.write)
                                for path in paths], None

        def start_worker():
            parsers.append(logicalline.CreateLogicalLineParser(**settings))

        count = sum(sources[start] != STDIN for start, _ in self.runs)
        try:
            self.workers = Workers(min(jobs, count), start_worker, dump_run)
        except BaseException:
            shutil.rmtree(self.scratch, ignore_errors=True)
            raise

    def output(self, number):
        return os.path.join(self.scratch, str(number))

    def results(self, emit, moved):
        """Yields (size, failure) per input in order, as dump_file returns them, once the
        input's output is written."""
        answered, sent = {}, 0
        for number in range(len(self.runs)):
            while number not in answered:
                while sent < min(len(self.runs), number + self.ahead):
                    if self.sources[self.runs[sent][0]] == STDIN:
                        answered[sent] = None
                    elif self.workers.idle(2):
                        self.workers.send(sent)
                    else:
                        break
                    sent += 1
                if number not in answered:
                    for done, results, counts in self.workers.answers():
                        answered[done] = results, counts
            answer = answered.pop(number)
            if answer is None:
                yield dump_file(self.parser, self.style, STDIN, emit, moved)
                continue
            results, counts = answer
            if counts is not None:
                emit(counts)
            else:
                self.copy_out(self.output(number))
            yield from results

    def copy_out(self, path):
        """Appends a worker's output file to out, then removes it."""
        with open(path, "rb") as handle:
            if self.target is None:
                self.out.write(handle.read().decode("utf-8"))
            else:
                self.out.flush()  # what this process wrote before, such as stdin's lines
                shutil.copyfileobj(handle, self.target, 1 << 20)
        os.remove(path)

    def close(self):
        """Ends the workers and removes their files, with Ctrl-C held back until both are done."""
        with interrupts_held():
            self.workers.close()
            shutil.rmtree(self.scratch, ignore_errors=True)
