#!/usr/bin/env bash
# Runs the README's two commands as they stand there, for each interpreter named, in a fresh
# virtual environment whose python3 comes first on the PATH, as a new user's would.
# Usage: bash .ci/readme.sh python3.X ...
set -euo pipefail
cd "$(dirname "$0")/.."

# The shell blocks of the section that gives the two commands, one command to a block.
commands="$(awk '/^## /{section = ($0 == "## The two commands")}
                 section && /^```sh$/ {inside = 1; next}
                 inside && /^```$/ {inside = 0; print ""; next}
                 inside {printf "%s ", $0}' README.md)"
mapfile -t commands <<<"$commands"
if [[ ${#commands[@]} -ne 2 ]]; then
  echo "README.md: expected two commands under '## The two commands', found ${#commands[@]}" >&2
  exit 1
fi

work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT
for python in "$@"; do
  "$python" -m venv "$work/$python"
  for command in "${commands[@]}"; do
    echo "=== $python, in a fresh virtual environment: $command"
    (PATH="$work/$python/bin:$PATH" && export PATH && eval "$command" >"$work/out.log" 2>&1) ||
      { cat "$work/out.log"; exit 1; }
    tail -n 3 "$work/out.log"
  done
done
