"""Parses every .py file under a directory with all 16 parser option sets, and the default set
reading strings as Python 3.12 and 3.14 do, and reads back every attribute and token of every
line, so that a sanitizer build sees each path on real source.

usage: python3.10 fuzz/parse_tree.py [DIR] [--every N]
DIR defaults to the standard library (the directory of os.__file__); --every N parses only
every N-th file (sorted by path), for a quicker pass.
"""
import argparse
import io
import itertools
import os
import sys
import time

import logicalline

ATTRIBUTES = ("fType", "fParsed", "fTabsInIndent", "fSpacesInIndent", "fIncomplete",
              "fIndentLevel", "fFirstLine", "fLineCount", "fTokenCount", "fNamesDefined",
              "fTypeEquivs", "fArgNames", "fArgTypeEquivs", "fBaseClassNames",
              "fLocalScopeName", "fTokens", "fScopeName", "fImportRefs")


def TouchLine(line):
    for name in ATTRIBUTES:
        getattr(line, name)
    try:
        line.fLineText
    except UnicodeDecodeError:
        pass
    for i in range(line.fTokenCount):
        line.GetTokenType(i)
        line.GetTokenType(i, 1)
        line.GetTokenString(i, skip_error_prefix=1)
    line.Copy()


def ParseFile(path, parsers):
    with open(path, "rb") as f:
        data = f.read()
    lines = 0
    for index, parser in enumerate(parsers):
        try:
            result = parser.GetLogicalLineList(io.BytesIO(data).readline)
        except ValueError as e:  # NUL bytes in a file are refused
            if b"\0" not in data:
                raise AssertionError(f"{path}: {e}")
            continue
        # Every getter and method on the lines of the all-off and all-on parsers, and of the
        # newest reading; the other option sets only build their lines and decode their text.
        for line in result:
            if index in (0, 15, len(parsers) - 1):
                TouchLine(line)
            else:
                try:
                    line.fLineText
                except UnicodeDecodeError:
                    pass
        lines += len(result)
    return lines


def main():
    args = argparse.ArgumentParser()
    args.add_argument("root", nargs="?", default=os.path.dirname(os.__file__))
    args.add_argument("--every", type=int, default=1)
    options = args.parse_args()
    paths = sorted(os.path.join(d, n) for d, _, names in os.walk(options.root)
                   for n in names if n.endswith(".py"))[::options.every]
    parsers = [logicalline.CreateLogicalLineParser(*flags)
               for flags in itertools.product((0, 1), repeat=4)]
    parsers += [logicalline.CreateLogicalLineParser(feature_version=(3, minor)) for minor in (12, 14)]
    start = time.monotonic()
    lines = sum(ParseFile(path, parsers) for path in paths)
    print(f"parsed {len(paths)} files x {len(parsers)} option sets: {lines} logical lines "
          f"in {time.monotonic() - start:.1f}s")


if __name__ == "__main__":
    main()
