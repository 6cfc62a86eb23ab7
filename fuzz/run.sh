#!/usr/bin/env bash
# Fuzzes the module for SECONDS (default 60), split over four targets: reading without and with
# a create hook (fuzz_reading.py, which also compares the buffer path with the readline path),
# the operations on the resulting lines (fuzz_lines.py), and edits replayed with
# UpdateLogicalLineList (fuzz_update.py).
#
#   bash fuzz/run.sh 600
#
# The module is built in build-fuzz with clang, AddressSanitizer, UndefinedBehaviorSanitizer and
# coverage counters for libFuzzer (which atheris drives); clang-14 and atheris are installed if
# missing. Without clang it falls back to the gcc sanitizer build (no native coverage).
# Corpora grow in build-fuzz/corpus/TARGET (seeded from the standard library); crashing inputs
# land in build-fuzz/crashes/. Exits non-zero when a target finds a failure.
set -uo pipefail

SECONDS_TOTAL=${1:-60}
ROOT=$(cd "$(dirname "$0")/.." && pwd)
OUT="$ROOT/build-fuzz"
PYTHON=$(python3.10 -c 'import sys; print(sys.executable)')
mkdir -p "$OUT/crashes"

"$PYTHON" -c 'import atheris' 2>/dev/null ||
  "$PYTHON" -m pip install -q --only-binary=:all: 'atheris==2.3.0' || exit 1

if ! command -v clang++-14 > /dev/null; then
  apt-get install -y -q clang-14 libclang-rt-14-dev > /dev/null 2>&1 ||
    { apt-get update -q > /dev/null 2>&1 &&
      apt-get install -y -q clang-14 libclang-rt-14-dev > /dev/null 2>&1; }
fi

RT=$(clang++-14 -print-runtime-dir 2>/dev/null || true)
if [[ -n "$RT" && -f "$RT/libclang_rt.fuzzer_no_main-x86_64.a" ]]; then
  BUILD="$OUT/module"
  rm -rf "$BUILD"  # configured afresh: a stale cache may name another interpreter
  cmake -S "$ROOT" -B "$BUILD" -DLOGICALLINE_SANITIZE=ON -DLOGICALLINE_WERROR=ON \
        -DCMAKE_CXX_COMPILER=clang++-14 -DCMAKE_CXX_FLAGS=-fsanitize=fuzzer-no-link \
        -DPython_EXECUTABLE="$PYTHON" \
        > "$OUT/configure.log" 2>&1 || { cat "$OUT/configure.log"; exit 1; }
  cmake --build "$BUILD" -j 2 > "$OUT/build.log" 2>&1 || { cat "$OUT/build.log"; exit 1; }
  # One preloaded runtime with both ASan and libFuzzer, so that the module's coverage counters
  # reach libFuzzer rather than ASan's empty defaults. ASan's preinit object cannot go in a DSO.
  if [[ ! -f "$OUT/asan_with_fuzzer.so" ]]; then
    cp "$RT/libclang_rt.asan-x86_64.a" "$OUT/asan.a" && ar d "$OUT/asan.a" asan_preinit.cpp.o
    clang++-14 -shared -o "$OUT/asan_with_fuzzer.so" -Wl,--whole-archive "$OUT/asan.a" \
      "$RT/libclang_rt.asan_cxx-x86_64.a" "$RT/libclang_rt.fuzzer_no_main-x86_64.a" \
      -Wl,--no-whole-archive -lpthread -ldl -lrt -lm -lstdc++ || exit 1
  fi
  RUNTIME="$OUT/asan_with_fuzzer.so"
else
  echo "clang-14 not available: fuzzing the gcc sanitizer build without native coverage"
  BUILD="$ROOT/build-asan"
  rm -rf "$BUILD"
  cmake -S "$ROOT" -B "$BUILD" -DLOGICALLINE_SANITIZE=ON -DLOGICALLINE_WERROR=ON \
        -DCMAKE_CXX_COMPILER=g++ -DPython_EXECUTABLE="$PYTHON" > "$OUT/configure.log" 2>&1 &&
    cmake --build "$BUILD" -j 2 > "$OUT/build.log" 2>&1 || { cat "$OUT/build.log"; exit 1; }
  RUNTIME=$(g++ -print-file-name=libasan.so)
fi

# Seeds: a spread of standard library files, cut to 4 KiB, behind each target's header bytes.
if [[ ! -d "$OUT/corpus" ]]; then
  "$PYTHON" - "$OUT/corpus" << 'EOF'
import os, random, sys
root = os.path.dirname(os.__file__)
paths = sorted(os.path.join(d, n) for d, _, names in os.walk(root) for n in names
               if n.endswith(".py"))[::20]
rng = random.Random(1)
for target in ("reading", "reading-hook", "lines", "update"):
    os.makedirs(os.path.join(sys.argv[1], target))
for i, path in enumerate(paths):
    with open(path, "rb") as f:
        source = f.read(4096)
    seeds = {"reading": bytes([rng.randrange(48), 0, rng.randrange(4) << 4, 0]) + source,
             "reading-hook": bytes([rng.randrange(48), 0, 0, rng.randrange(40)]) + source,
             "lines": bytes([rng.randrange(16), 24]) + source + rng.randbytes(48),
             "update": bytes([rng.randrange(16)]) + source[:1536] + b"\xff\xfe" + rng.randbytes(32)}
    for target, seed in seeds.items():
        with open(os.path.join(sys.argv[1], target, "%04d" % i), "wb") as f:
            f.write(seed)
EOF
fi

export LD_PRELOAD="$RUNTIME"
export ASAN_OPTIONS="detect_leaks=0:allocator_may_return_null=1"
export UBSAN_OPTIONS="halt_on_error=1:print_stacktrace=1"
export PYTHONMALLOC=malloc
export PYTHONPATH="$BUILD:$ROOT/python:$ROOT/fuzz"

status=0
share=$(( SECONDS_TOTAL / 4 > 1 ? SECONDS_TOTAL / 4 : 1 ))
for target in reading reading-hook lines update; do
  script="$ROOT/fuzz/fuzz_${target%-hook}.py"
  flags=()
  [[ $target == reading-hook ]] && flags=(--hook)
  echo "== $target for ${share}s"
  "$PYTHON" "$script" "${flags[@]}" -max_total_time="$share" -max_len=8192 -timeout=20 \
    -rss_limit_mb=4096 -print_final_stats=1 -artifact_prefix="$OUT/crashes/$target-" \
    "$OUT/corpus/$target" > "$OUT/$target.log" 2>&1 || status=1
  grep -E "^stat::number_of_executed_units|^stat::new_units_added|cov:" "$OUT/$target.log" |
    tail -3
  if [[ $status != 0 ]]; then tail -40 "$OUT/$target.log"; fi
done
exit $status
