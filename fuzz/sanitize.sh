#!/usr/bin/env bash
# Builds the module with AddressSanitizer and UndefinedBehaviorSanitizer in build-asan, then runs
# the whole test suite and a parse of the standard library (all 16 option sets) under them.
#
#   bash fuzz/sanitize.sh            # everything: every standard library file
#   STDLIB_EVERY=3 bash fuzz/sanitize.sh   # every third standard library file only
#
# Under CI (CI=true) the standard library pass takes every third file unless STDLIB_EVERY says
# otherwise, to keep the run to a few minutes on two cores. Exits non-zero on any test failure
# or sanitizer report.
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd)
BUILD="$ROOT/build-asan"
PYTHON=$(python3.10 -c 'import sys; print(sys.executable)')
if [[ -z "${STDLIB_EVERY:-}" ]]; then
  if [[ "${CI:-}" == "true" ]]; then STDLIB_EVERY=3; else STDLIB_EVERY=1; fi
fi

# Configured afresh every time (a few seconds): a cache left by another interpreter or without
# the sanitizers would otherwise win.
rm -rf "$BUILD"
mkdir -p "$BUILD"
cmake -S "$ROOT" -B "$BUILD" -DLOGICALLINE_SANITIZE=ON -DLOGICALLINE_WERROR=ON \
      -DCMAKE_CXX_COMPILER=g++ -DPython_EXECUTABLE="$PYTHON" > "$BUILD/configure.log" 2>&1 ||
  { cat "$BUILD/configure.log"; exit 1; }
cmake --build "$BUILD" -j 2 > "$BUILD/build.log" 2>&1 || { cat "$BUILD/build.log"; exit 1; }

# The runtime goes first so that it sees every allocation; CPython itself leaks at exit, so
# leak detection stays off. PYTHONMALLOC=malloc lets ASan see the interpreter's own objects,
# so an overrun of a bytes object that the module fills is caught too.
export LD_PRELOAD="$(g++ -print-file-name=libasan.so)"
# Reports go to files, shown at the end: pytest captures stderr, and a process that aborts
# takes its captured text with it.
REPORTS="$BUILD/sanitizer-report"
rm -f "$REPORTS".*
export ASAN_OPTIONS="detect_leaks=0:abort_on_error=1:log_path=$REPORTS"
export UBSAN_OPTIONS="halt_on_error=1:print_stacktrace=1:log_path=$REPORTS"
export PYTHONMALLOC=malloc
export PYTHONPATH="$BUILD:$ROOT/python${PYTHONPATH:+:$PYTHONPATH}"

cd "$ROOT"
"$PYTHON" -c 'import logicalline, sys; assert "build-asan" in logicalline.__file__, logicalline.__file__'
# Both passes run even if the first fails; a sanitizer report aborts the process at once.
status=0
"$PYTHON" -m pytest -q -p no:cacheprovider tests || status=1
"$PYTHON" fuzz/parse_tree.py --every "$STDLIB_EVERY" || status=1
if compgen -G "$REPORTS.*" > /dev/null; then
  cat "$REPORTS".*
  status=1
fi
if [[ $status == 0 ]]; then echo "sanitizer run clean"; else echo "sanitizer run FAILED"; fi
exit $status
