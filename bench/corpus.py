"""The corpus of a benchmark run: source files read into memory as bytes before anything is
timed, so that no contender pays for the disk."""

import os

MB = 1e6
# Left out of the default corpus, so that the figures do not move with whatever is installed.
SKIPPED_DIRS = {"site-packages", "dist-packages", "__pycache__"}


class Corpus:
    """Source files held as bytes, with the tallies printed at the top of a run."""

    def __init__(self, root, paths, sources, unreadable):
        self.root = root
        self.paths = paths  # of the files read, in the order of sources
        self.sources = sources
        self.unreadable = unreadable
        self.size = sum(map(len, sources))
        self.physical_lines = sum(count_physical_lines(data) for data in sources)


def count_physical_lines(data):
    return data.count(b"\n") + (1 if data and not data.endswith(b"\n") else 0)


def load_corpus(root, skip_installed):
    paths = []
    for directory, subdirs, names in os.walk(root):
        if skip_installed:
            subdirs[:] = [d for d in subdirs if d not in SKIPPED_DIRS]
        subdirs.sort()
        paths.extend(os.path.join(directory, n) for n in sorted(names) if n.endswith(".py"))
    read, sources, unreadable = [], [], 0
    for path in paths:
        try:
            with open(path, "rb") as f:
                sources.append(f.read())
        except OSError:
            unreadable += 1
        else:
            read.append(path)
    return Corpus(root, read, sources, unreadable)


def default_corpus():
    """The standard library of the running interpreter, without what is installed into it."""
    return load_corpus(os.path.dirname(os.__file__), skip_installed=True)
