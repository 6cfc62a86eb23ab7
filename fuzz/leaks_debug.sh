#!/usr/bin/env bash
# Exact leak checks: builds the module against Debian's debug interpreter (python3.11-dbg, which
# has sys.gettotalrefcount) in build-dbg and runs tests/test_leaks.py there.
# Installs python3.11-dbg, its headers and pytest with apt-get when they are missing.
#
#   bash fuzz/leaks_debug.sh
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd)
BUILD="$ROOT/build-dbg"
if ! command -v python3.11-dbg > /dev/null || ! python3.11-dbg -c 'import pytest' 2>/dev/null; then
  export DEBIAN_FRONTEND=noninteractive
  apt-get install -y -q python3.11-dbg libpython3.11-dbg python3.11-dev python3-pytest \
    > /dev/null 2>&1 || { apt-get update -q > /dev/null &&
      apt-get install -y -q python3.11-dbg libpython3.11-dbg python3.11-dev python3-pytest \
        > /dev/null; }
fi
PYTHON=$(command -v python3.11-dbg)
# Debian's debug include directory links to the release headers, whose Python.h includes the
# release pyconfig.h by a quoted name; forcing the debug one in first keeps Py_DEBUG (and so
# the reference total) on for the module as it is for the interpreter.
PYCONFIG=$("$PYTHON" -c 'import sysconfig; print(sysconfig.get_config_h_filename())')
mkdir -p "$BUILD"
cmake -S "$ROOT" -B "$BUILD" -DCMAKE_BUILD_TYPE=Debug -DLOGICALLINE_WERROR=ON \
      -DPython_EXECUTABLE="$PYTHON" "-DCMAKE_CXX_FLAGS=-include $PYCONFIG" \
      > "$BUILD/configure.log" 2>&1 ||
  { cat "$BUILD/configure.log"; exit 1; }
cmake --build "$BUILD" -j 2 > "$BUILD/build.log" 2>&1 || { cat "$BUILD/build.log"; exit 1; }

cd "$ROOT"
PYTHONPATH="$BUILD:$ROOT/python" "$PYTHON" -c \
  'import logicalline, sys; assert "build-dbg" in logicalline.__file__ and sys.gettotalrefcount()'
PYTHONPATH="$BUILD:$ROOT/python" "$PYTHON" -m pytest -q -p no:cacheprovider tests/test_leaks.py "$@"
