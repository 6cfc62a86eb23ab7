"""What an interpreter worker hands back for the files it reads: one digest per file, of every
line's type, first line, line count and token texts. bench/parallel.py times the workers, and
tests/test_subinterpreters.py compares their digests with the main interpreter's."""

import hashlib
import os

import logicalline

# Left out: what is installed into the standard library is not part of it.
SKIPPED_DIRS = {"site-packages", "dist-packages", "__pycache__"}


def standard_library(every=1):
    """Every `every`th .py file of the running interpreter's standard library, in a fixed order."""
    paths = []
    for directory, subdirs, names in os.walk(os.path.dirname(os.__file__)):
        subdirs[:] = sorted(d for d in subdirs if d not in SKIPPED_DIRS)
        paths.extend(os.path.join(directory, n) for n in sorted(names) if n.endswith(".py"))
    return paths[::every]


def digest(parser, data):
    """A digest of the lines read from data, or the message with which the read refused it."""
    try:
        lines = parser.GetLogicalLineListFromBuffer(data)
    except ValueError as error:
        return f"refused: {error}"
    hasher = hashlib.sha256()
    for line in lines:
        texts = [text for text, _ in line.fTokens]
        hasher.update(repr((line.fType, line.fFirstLine, line.fLineCount, texts)).encode())
    return hasher.hexdigest()


def summarize(paths):
    """[(path, digest)] for the files, as the calling interpreter reads them."""
    parser = logicalline.CreateLogicalLineParser()
    summaries = []
    for path in paths:
        with open(path, "rb") as handle:
            summaries.append((path, digest(parser, handle.read())))
    return summaries
