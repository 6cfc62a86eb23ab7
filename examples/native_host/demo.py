"""Parses a small bundled source with logicalline and prints, per line, what native_host found."""
import io

import logicalline
import native_host

SOURCE = b'''\
import os

class Reader(Base, io.RawIOBase, metaclass=Meta):
    def read(self, size=-1, *, timeout: float = 1.0, **options):
        data, count = self.fetch(size), 0
        return data

limit: int = 4096
first = last = None
'''


def main():
    parser = logicalline.CreateLogicalLineParser()
    lines = parser.GetLogicalLineList(io.BytesIO(SOURCE).readline)
    for line, found in zip(lines, native_host.annotate(lines)):
        shown = ", ".join(found) if found is not None else "-"
        print(f"line {line.fFirstLine + 1:2}  {line.fType.decode():20}  {shown}")
    names = [lines[2].fTokens[i][0] for i in native_host.find_tokens(lines[2], "x")]
    print("names and keywords of line 4:", " ".join(names))
    print("lines cleared:", native_host.reset(lines))


if __name__ == "__main__":
    main()
