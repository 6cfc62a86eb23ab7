#!/usr/bin/env bash
# Builds a wheel for each of Python 3.10 to 3.13 into dist/, installs each into a fresh virtual
# environment with the test extras, and runs the suite there against the installed wheel.
# Usage: bash .ci/wheels.sh [python3.X ...]
set -euo pipefail
cd "$(dirname "$0")/.."

pythons=("$@")
[ ${#pythons[@]} -gt 0 ] || pythons=(python3.10 python3.11 python3.12 python3.13)
work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT
mkdir -p dist

for python in "${pythons[@]}"; do
  echo "=== wheel for $python"
  tag="$("$python" -c 'import sys; print("cp%d%d" % sys.version_info[:2])')"
  rm -f dist/logicalline-*-"$tag"-*.whl
  "$python" -m pip wheel --quiet --no-deps --wheel-dir dist .
  wheel="$(ls dist/logicalline-*-"$tag"-*.whl)"
  "$python" -m venv "$work/$tag"
  "$work/$tag/bin/python" -m pip install --quiet "$wheel[test]"
  # From the repository root, so the tests and examples are at hand; the module and its stub
  # must come from the virtual environment, which the stub test checks.
  "$work/$tag/bin/python" -c 'import logicalline, sys; print(sys.version.split()[0], logicalline.__file__)'
  "$work/$tag/bin/python" -m pytest -q
done
