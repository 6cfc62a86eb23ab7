"""Editor updates: UpdateLogicalLineList after an edit, against a full read of the new text by
GetLogicalLineListFromBuffer. A one-character edit near the middle of files of growing size,
then a function typed into a standard library file one key at a time.

Each update is timed on its own with time.perf_counter, the cyclic collector enabled as in a
host; gc.collect() runs before each series, outside the timed region. Building the new text of
an edit is setup and stays outside it too. After each series the list is compared field by
field with a full read of the final text, outside the timing.
"""

import ast
import gc
import io
import os
import statistics
import time
import warnings

from contenders import progress

SIZES = (1_000, 10_000, 100_000)
EDITS_PER_SIZE = 400
FULL_READS = 20  # each timed alone, and averaged like the updates
# The size at which the speed target holds: the largest, where the checks against the module's
# record of the list, one pass over its items and one over the text, weigh most.
TARGET_SIZE = 100_000
FIELDS = ("fFirstLine", "fLineCount", "fTokens", "fType")

# Typed into the middle of textwrap.py, as a method of TextWrapper (indented to fit there).
TYPED_FUNCTION = '''\
def wrap_paragraphs(self, text, max_lines=None, placeholder=' [...]'):
    """Wrap each paragraph of text on its own and return all the lines.

    Paragraphs are separated by blank lines; a blank line is kept
    between two wrapped paragraphs.  When max_lines is given, the
    result stops there and its last line ends with the placeholder.
    """
    if max_lines is not None and max_lines < 1:
        raise ValueError('max_lines must be at least 1')
    paragraphs = []
    current = []
    for line in text.splitlines():
        stripped = line.strip()
        if stripped:
            current.append(stripped)
        elif current:
            paragraphs.append(' '.join(current))
            current = []
    if current:
        paragraphs.append(' '.join(current))

    result = []
    for number, paragraph in enumerate(paragraphs):
        if number:
            # one blank line between paragraphs, as in the input
            result.append('')
        result.extend(self.wrap(paragraph))
        if max_lines is not None and len(result) > max_lines:
            kept = result[:max_lines]
            last = kept[-1].rstrip()
            while last and len(last) + len(placeholder) > self.width:
                words = last.split()
                if len(words) < 2:
                    last = last[:self.width - len(placeholder)]
                    break
                last = ' '.join(words[:-1])
            kept[-1] = ''.join([last,
                                placeholder])
            return kept
    return result

'''


def physical_lines(data):
    return list(io.BytesIO(data))  # cut at b"\n" only, as the module cuts


def differences(lines, expected):
    """None when the lines match a full read field by field, else what differs first."""
    if len(lines) != len(expected):
        return f"{len(lines)} lines, a full read gives {len(expected)}"
    for i, (line, other) in enumerate(zip(lines, expected)):
        for field in FIELDS:
            if getattr(line, field) != getattr(other, field):
                return f"line {i}: {field} differs"
    return None


def mean_full_read(parser, data):
    total = 0.0
    for _ in range(FULL_READS):
        gc.collect()
        start = time.perf_counter()
        lines = parser.GetLogicalLineListFromBuffer(data)
        total += time.perf_counter() - start
        del lines  # freeing the old list is left out, which only flatters the full read
    gc.collect()
    return total / FULL_READS


def mean_scan(data, count=50):
    gc.collect()
    start = time.perf_counter()
    for _ in range(count):
        data.count(b"\n")
    return (time.perf_counter() - start) / count


def joined_source(sources, line_count):
    """line_count physical lines of real code: whole files that ast.parse accepts, one after
    another, so that no string or bracket left open in one runs on into the next."""
    lines = []
    with warnings.catch_warnings():
        warnings.simplefilter("ignore")
        for data in sources:
            if b"\r" in data or b"\0" in data:
                continue
            try:
                ast.parse(data)
            except (SyntaxError, ValueError, UnicodeDecodeError, RecursionError, MemoryError):
                continue
            lines.extend(physical_lines(data if data.endswith(b"\n") else data + b"\n"))
            if len(lines) >= line_count:
                return lines[:line_count]
    return None


def one_character_edit(lines):
    """The index of a line near the middle and that line with its last letter changed."""
    for index in range(len(lines) // 2, len(lines)):
        line = lines[index]
        letters = [i for i, c in enumerate(line) if chr(c).isalpha() and c < 128]
        if letters:
            i = letters[-1]
            other = b"x" if line[i] != ord("x") else b"y"
            return index, line[:i] + other + line[i + 1:]
    raise ValueError("no line with a letter after the middle")


def run_one_line_edits(parser, sources):
    print(f"{'physical lines':>14} {'MB':>5} {'edits':>6} {'first us':>8} {'mean us':>8} "
          f"{'median us':>9} {'worst us':>8} {'full read ms':>12} {'faster by':>9} "
          f"{'scan us':>8}  same as a full read")
    joined = joined_source(sources, SIZES[-1])
    if joined is None:
        print("  the corpus holds too little code that ast.parse accepts for these sizes")
        return None
    update = parser.UpdateLogicalLineList
    means, medians, ratios = {}, {}, {}
    for size in SIZES:
        old_lines = joined[:size]
        index, edited = one_character_edit(old_lines)
        old = b"".join(old_lines)
        new = b"".join(old_lines[:index] + [edited] + old_lines[index + 1:])
        texts = (new, old)  # the edit and its undo, in turn: each is one changed line
        lines = parser.GetLogicalLineListFromBuffer(old)
        times = []
        gc.collect()
        for i in range(EDITS_PER_SIZE):
            data = texts[i % 2]
            start = time.perf_counter()
            update(lines, data, index, 1, 1)
            times.append(time.perf_counter() - start)
        final = texts[(EDITS_PER_SIZE - 1) % 2]
        problem = differences(lines, parser.GetLogicalLineListFromBuffer(final))
        del lines
        full = mean_full_read(parser, final)
        scan = mean_scan(final)
        means[size] = statistics.fmean(times)
        medians[size] = statistics.median(times)
        ratios[size] = full / means[size]
        print(f"{size:>14,} {len(old) / 1e6:>5.2f} {EDITS_PER_SIZE:>6} {times[0] * 1e6:>8.1f} "
              f"{means[size] * 1e6:>8.1f} {medians[size] * 1e6:>9.1f} {max(times) * 1e6:>8.1f} "
              f"{full * 1e3:>12.2f} {ratios[size]:>8.0f}x {scan * 1e6:>8.1f}  "
              f"{problem or 'yes'}")
        progress(f"updated {size:,} lines")
    print(f"(real code: files of the corpus that ast.parse accepts, joined and cut to size; the "
          f"last letter of a line at or just after the middle changed and changed back, "
          f"{EDITS_PER_SIZE} updates; first: the first update of the list, which finds "
          f"its lines out of the cache; mean: of every update, the first included; full read: the mean "
          f"of {FULL_READS}; faster by: the mean "
          f"full read over the mean update; scan: data.count(b'\\n') over the whole new text, "
          f"what any pass over every byte costs)")
    print(f"update time growth from {SIZES[0]:,} to {SIZES[-1]:,} lines: "
          f"{means[SIZES[-1]] / means[SIZES[0]]:.1f}x on the mean, "
          f"{medians[SIZES[-1]] / medians[SIZES[0]]:.1f}x on the median, for "
          f"{SIZES[-1] // SIZES[0]}x the lines")
    return {"ratio": ratios[TARGET_SIZE], "median_small": medians[SIZES[0]] * 1e6}


def typed_edits(lines, at, text):
    """Yields (data, first_line, old_count, new_count) for each key of `text` typed at the start
    of line `at`: a character changes the cursor's line, a newline splits it in two."""
    before = b"".join(lines[:at])
    typed = b""
    after = b"".join(lines[at:])
    line = at
    for key in text:
        key = bytes([key])
        typed += key
        yield before + typed + after, line, 1, 2 if key == b"\n" else 1
        if key == b"\n":
            line += 1


def insertion_point(lines):
    """The method or function definition nearest the middle, after a blank line."""
    candidates = [i for i, line in enumerate(lines)
                  if line.lstrip().startswith(b"def ") and i and not lines[i - 1].strip()]
    return min(candidates, key=lambda i: abs(i - len(lines) // 2))


def run_keystrokes(parser, runs):
    path = os.path.join(os.path.dirname(os.__file__), "textwrap.py")
    try:
        with open(path, "rb") as f:
            lines = physical_lines(f.read())
    except OSError as error:
        print(f"  cannot read {path}: {error}")
        return
    at = insertion_point(lines)
    indent = lines[at][:len(lines[at]) - len(lines[at].lstrip())]
    text = b"".join(indent + row if row.strip() else row
                    for row in physical_lines(TYPED_FUNCTION.encode()))
    edits = list(typed_edits(lines, at, text))  # setup: every buffer built before any timing
    update = parser.UpdateLogicalLineList
    times, problems = [], []
    for _ in range(runs):
        current = parser.GetLogicalLineListFromBuffer(b"".join(lines))
        gc.collect()
        for data, first_line, old_count, new_count in edits:
            start = time.perf_counter()
            update(current, data, first_line, old_count, new_count)
            times.append(time.perf_counter() - start)
        problems.append(differences(current, parser.GetLogicalLineListFromBuffer(edits[-1][0])))
        del current
    full = mean_full_read(parser, edits[-1][0])
    mean, worst = statistics.fmean(times), max(times)
    p99 = statistics.quantiles(times, n=100)[98]
    typed_lines = TYPED_FUNCTION.rstrip().count("\n") + 1
    print(f"{os.path.basename(path)}: {len(lines)} lines; a {typed_lines}-line "
          f"method typed before line {at + 1} ({lines[at].strip().decode()[:40]}), "
          f"{len(edits):,} keys, replayed {runs} times")
    print(f"  per key: mean {mean * 1e6:.1f} us, median {statistics.median(times) * 1e6:.1f} us, "
          f"99th percentile {p99 * 1e6:.1f} us, worst {worst * 1e6:.1f} us")
    print(f"  full read of the final text ({FULL_READS} reads): mean {full * 1e6:.1f} us; faster "
          f"by {full / mean:.0f}x on the mean, {full / worst:.1f}x on the worst key")
    failed = [p for p in problems if p]
    print(f"  after each replay, the list equals a full read of the final text field by field "
          f"({', '.join(FIELDS)}): " + ("yes" if not failed else f"NO: {failed[0]}"))


def run_updates(parser, corpus, runs):
    """Prints the tables; returns the figures that the targets take, or None."""
    print("-- a one-character edit near the middle --")
    figures = run_one_line_edits(parser, corpus.sources)
    print("\n-- keystroke replay --")
    run_keystrokes(parser, runs)
    progress("replayed the keystrokes")
    return figures
