#!/usr/bin/env bash
# Runs the test suite (or the pytest arguments given) under valgrind memcheck against the
# release build in build/, with the interpreter's own allocator off so that memcheck sees every
# object. Leak reports are off: the interpreter leaks at exit by design; errors are what counts.
#
#   bash fuzz/valgrind.sh [PYTEST ARGS...]    # prints memcheck's ERROR SUMMARY
set -uo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd)
PYTHON=$(python3.10 -c 'import sys; print(sys.executable)')
LOG="${TMPDIR:-/tmp}/logicalline-valgrind.log"
cd "$ROOT"
PYTHONMALLOC=malloc PYTHONPATH="$ROOT/build:$ROOT/python" \
  valgrind --tool=memcheck --leak-check=no --track-origins=yes --trace-children=yes \
  --trace-children-skip='*cc*,*/ld,*/as,*collect2*' \
  --error-exitcode=99 --log-file="$LOG.%p" \
  "$PYTHON" -m pytest -q -p no:cacheprovider "${@:-tests}"
status=$?
grep -h "ERROR SUMMARY" "$LOG".* | sed 's/^==[0-9]*== //' | sort | uniq -c
# Logs are kept only when memcheck found something.
if grep -l "ERROR SUMMARY: [1-9]" "$LOG".* > /dev/null; then
  echo "memcheck logs with errors:"; grep -l "ERROR SUMMARY: [1-9]" "$LOG".*
else
  rm -f "$LOG".*
fi
exit $status
