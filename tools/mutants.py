"""Mutation runner: proves that the test suite finds real faults.

Each mutant in tools/mutants.txt is a one-line fault. The runner copies the tracked tree into a
temporary directory, builds it once, then for each mutant applies it, rebuilds incrementally,
runs the suite and restores the file. With --tests-from REV the copy's tests/ and fuzz/ come
from REV, so two versions of the suite can be compared on the same code.

    python tools/mutants.py --list
    python tools/mutants.py [--only a,b] [--sanitize] [--tests-from REV] [--out table.md]
    python tools/mutants.py --suite-args=--full-stdlib   # with the slow checks too
"""

import argparse
import os
import shutil
import subprocess
import sys
import tempfile
import time
from collections import Counter
from dataclasses import dataclass
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
TABLE = Path(__file__).resolve().parent / "mutants.txt"


@dataclass
class Mutant:
    name: str
    file: str
    old: str
    new: str
    description: str


def load_mutants(path=TABLE):
    """Reads the table: blocks of "name | file", "- old", "+ new", "= description"."""
    mutants = []
    block = {}
    for raw in path.read_text().splitlines() + [""]:
        if raw.startswith("#"):
            continue
        if not raw.strip():
            if block:
                if set(block) != {"head", "-", "+", "="} or len(block["head"]) != 2:
                    sys.exit(f"incomplete mutant in {path.name}: {block}")
                mutants.append(Mutant(block["head"][0], block["head"][1], block["-"],
                                      block["+"], block["="]))
                block = {}
            continue
        kind, rest = raw[:1], raw[2:]
        if kind in "-+=":
            block[kind] = rest
        else:
            block["head"] = [part.strip() for part in raw.split("|")]
    return mutants


def run(command, cwd, env=None, timeout=None):
    """Runs a command quietly; returns (exit code or None on timeout, combined output)."""
    try:
        done = subprocess.run(command, cwd=cwd, env=env, timeout=timeout,
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)
        return done.returncode, done.stdout
    except subprocess.TimeoutExpired as expired:
        return None, expired.stdout or ""


def make_copy(tests_from):
    copy = Path(tempfile.mkdtemp(prefix="mutants-"))
    files = subprocess.run(["git", "ls-files", "-z"], cwd=ROOT, check=True,
                           stdout=subprocess.PIPE).stdout.decode().split("\0")
    for name in filter(None, files):
        source = ROOT / name
        if source.is_file():
            (copy / name).parent.mkdir(parents=True, exist_ok=True)
            shutil.copy2(source, copy / name)
    if tests_from:
        for folder in ("tests", "fuzz"):
            shutil.rmtree(copy / folder, ignore_errors=True)
        archive = subprocess.run(["git", "archive", tests_from, "tests", "fuzz"], cwd=ROOT,
                                 check=True, stdout=subprocess.PIPE).stdout
        subprocess.run(["tar", "-x", "-C", str(copy)], input=archive, check=True)
    return copy


class Build:
    """One CMake build directory of the copy, and how to run the suite against it."""

    def __init__(self, copy, name, sanitize, args):
        self.copy, self.dir, self.env = copy, copy / name, dict(os.environ)
        self.timeout, self.extra = args.timeout, args.suite_args.split()
        self.configure = ["cmake", "-S", str(copy), "-B", str(self.dir),
                          f"-DPython_EXECUTABLE={sys.executable}"]
        if sanitize:
            self.configure += ["-DLOGICALLINE_SANITIZE=ON", "-DCMAKE_CXX_COMPILER=g++"]
            libasan = subprocess.run(["g++", "-print-file-name=libasan.so"], check=True,
                                     stdout=subprocess.PIPE, text=True).stdout.strip()
            self.env.update(LD_PRELOAD=libasan, PYTHONMALLOC="malloc",
                            ASAN_OPTIONS="detect_leaks=0:abort_on_error=1",
                            UBSAN_OPTIONS="halt_on_error=1:print_stacktrace=1")
        else:
            self.configure.append("-DCMAKE_BUILD_TYPE=Release")
        self.env["PYTHONPATH"] = f"{self.dir}:{copy / 'python'}"

    def setup(self):
        for step in (self.configure, ["cmake", "--build", str(self.dir), "-j", "2"]):
            code, output = run(step, self.copy)
            if code != 0:
                sys.exit(f"building the unmutated copy failed:\n{output}")
        # A suite that fails on the unmutated code would count every mutant as caught.
        if self.suite(timeout=None) != "survived":
            sys.exit(f"the suite fails on the unmutated copy in {self.dir}")

    def rebuild(self):
        return run(["cmake", "--build", str(self.dir), "-j", "2"], self.copy)[0] == 0

    def suite(self, timeout):
        command = [sys.executable, "-m", "pytest", "-q", "-x", "-p", "no:cacheprovider", "tests",
                   *self.extra]
        code, _ = run(command, self.copy, env=self.env, timeout=timeout)
        return "timeout" if code is None else "survived" if code == 0 else "caught"


def stale_reason(mutant, copy):
    """Says why the mutant no longer fits the tree, or returns None."""
    path = copy / mutant.file
    if not path.is_file():
        return f"stale mutant {mutant.name}: no file {mutant.file}"
    found = path.read_text().count(mutant.old)
    if found != 1:
        return (f"stale mutant {mutant.name}: its old text occurs {found} times in {mutant.file}"
                f" (expected once): {mutant.old!r}")
    return None


def try_mutant(mutant, build):
    path = build.copy / mutant.file
    original = path.read_text()
    path.write_text(original.replace(mutant.old, mutant.new))
    try:
        return build.suite(build.timeout) if build.rebuild() else "does not compile"
    finally:
        path.write_text(original)
        # Restoring the text must also restore the object: touch it newer than the mutant's.
        os.utime(path, None)


def table(rows, sanitize):
    lines = ["| mutant | fault | plain suite | sanitizer run |", "|---|---|---|---|"]
    lines += [f"| {m.name} | {m.description.replace('|', '/')} | {plain} | {san} |"
              for m, plain, san in rows]
    counts = Counter(plain for _, plain, _ in rows)
    summary = ", ".join(f"{n} {kind}" for kind, n in sorted(counts.items()))
    lines.append(f"\nTotal {len(rows)} mutants, plain suite: {summary}.")
    if sanitize:
        caught = sum(1 for _, _, san in rows if san == "caught")
        tried = sum(1 for _, _, san in rows if san != "-")
        lines.append(f"Sanitizer run on the {tried} survivors: {caught} caught.")
    return "\n".join(lines) + "\n"


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--list", action="store_true", help="print the mutant table and stop")
    parser.add_argument("--only", help="comma-separated mutant names to run")
    parser.add_argument("--sanitize", action="store_true",
                        help="run the plain survivors again under ASan and UBSan")
    parser.add_argument("--tests-from", metavar="REV", help="take tests/ and fuzz/ from REV")
    parser.add_argument("--timeout", type=float, default=600, help="seconds per suite run")
    parser.add_argument("--suite-args", default="",
                        help="extra pytest arguments, e.g. --suite-args=--leaks")
    parser.add_argument("--out", help="also write the result table to this file")
    parser.add_argument("--keep", action="store_true", help="keep the temporary copy")
    args = parser.parse_args()

    mutants = load_mutants()
    if args.list:
        for m in mutants:
            print(f"{m.name:32} {m.file:28} {m.description}")
        return
    if args.only:
        wanted = args.only.split(",")
        unknown = set(wanted) - {m.name for m in mutants}
        if unknown:
            sys.exit(f"no such mutant: {', '.join(sorted(unknown))}")
        mutants = [m for m in mutants if m.name in wanted]

    started = time.monotonic()
    copy = make_copy(args.tests_from)
    try:
        stale = list(filter(None, (stale_reason(m, copy) for m in mutants)))
        if stale:  # all of them, before the long build
            sys.exit("\n".join(stale))
        plain = Build(copy, "build", False, args)
        print(f"building {copy} ...", flush=True)
        plain.setup()
        results = {}
        for m in mutants:
            results[m.name] = try_mutant(m, plain)
            print(f"{m.name}: {results[m.name]}", flush=True)
        sanitized = {}
        survivors = [m for m in mutants if results[m.name] == "survived"]
        if args.sanitize and survivors:
            asan = Build(copy, "build-asan", True, args)
            print("building the sanitizer copy ...", flush=True)
            asan.setup()
            for m in survivors:
                sanitized[m.name] = try_mutant(m, asan)
                print(f"{m.name} (sanitizer): {sanitized[m.name]}", flush=True)
        rows = [(m, results[m.name], sanitized.get(m.name, "-")) for m in mutants]
        report = table(rows, args.sanitize)
        report += f"Run time: {(time.monotonic() - started) / 60:.1f} min.\n"
        print(report)
        if args.out:
            Path(args.out).write_text(report)
    finally:
        if not args.keep:
            shutil.rmtree(copy, ignore_errors=True)


if __name__ == "__main__":
    main()
