"""Progress of a long dump on stderr: files done out of the total, MB/s and the time left, drawn
by tqdm when it is installed (pip install 'logicalline[tools]'), else by a plain counter."""

import sys
import time

DELAY = 1.0  # seconds before anything is drawn, so that short runs stay silent


class Silent:
    """Counts what is done: bytes as a file is read, so that one big file shows progress too,
    brought to the file's size when it is done. Shows nothing; notes go straight to stderr."""

    def __init__(self, files, total_bytes):
        self.files, self.total_bytes = files, total_bytes
        self.done = self.done_bytes = self.file_bytes = 0

    def moved(self, size):
        self.file_bytes += size
        self.add(size)

    def file_done(self, size):
        self.done += 1
        self.add(size - self.file_bytes)  # the file's size on disk, whatever its encoding
        self.file_bytes = 0

    def add(self, size):
        self.done_bytes += size

    def note(self, message):
        sys.stderr.write(message + "\n")

    def close(self):
        pass


class PlainCounter(Silent):
    """One line, redrawn in place at most four times a second, cleared at the end."""

    def __init__(self, files, total_bytes):
        super().__init__(files, total_bytes)
        self.start = time.monotonic()
        self.drawn_at = self.start + DELAY - 0.25
        self.width = 0

    def add(self, size):
        super().add(size)
        now = time.monotonic()
        if now - self.drawn_at >= 0.25:
            self.drawn_at = now
            rate = self.done_bytes / max(now - self.start, 1e-9)
            left = int(max(self.total_bytes - self.done_bytes, 0) / rate) if rate else 0
            self.draw(f"{self.done}/{self.files} files, {rate / 1e6:.1f} MB/s, "
                      f"{left // 60}:{left % 60:02d} left")

    def draw(self, text):
        sys.stderr.write("\r" + text.ljust(self.width))
        sys.stderr.flush()
        self.width = len(text)

    def note(self, message):
        self.close()
        super().note(message)

    def close(self):
        if self.width:
            self.draw("")
            sys.stderr.write("\r")
            self.width = 0


class Bar(Silent):
    """A tqdm bar that runs on bytes, so that the time left weighs big files fairly."""

    def __init__(self, tqdm, files, total_bytes):
        super().__init__(files, total_bytes)
        self.bar = tqdm(desc=f"0/{files} files", total=total_bytes, unit="B", unit_scale=True,
                        delay=DELAY, leave=False, file=sys.stderr, dynamic_ncols=True,
                        bar_format="{desc} {percentage:3.0f}%|{bar}| {rate_fmt}, {remaining} left")

    def add(self, size):
        super().add(size)
        self.bar.set_description_str(f"{self.done}/{self.files} files", refresh=False)
        self.bar.update(size)

    def note(self, message):
        self.bar.write(message, file=sys.stderr)

    def close(self):
        self.bar.close()


def progress(files, total_bytes, shown):
    """The progress display for a run over `files` inputs of `total_bytes` in all."""
    if not shown:
        return Silent(files, total_bytes)
    try:
        from tqdm import tqdm
    except ImportError:
        return PlainCounter(files, total_bytes)
    return Bar(tqdm, files, total_bytes)
