#!/usr/bin/env bash
# Python 3.14 and 3.15 for a machine that has neither: Debian's unstable suite packages both,
# but they need a newer C library than the machine's, so they run in a Debian unstable root
# made here once and kept for later runs. Run as root.
#
#   bash .ci/sidroot.sh make           # makes the root, unless the one kept is up to date
#   bash .ci/sidroot.sh run CMD ARG..  # runs CMD in the root, from this directory
#
# The repository is mounted at the same path inside, so a command sees the same files and
# writes dist/ where the host would. Every run has its mounts to itself (a mount namespace of
# its own), so runs may overlap and leave nothing mounted behind.
# SIDROOT names the root's directory (default /var/cache/logicalline/sidroot).
set -euo pipefail

ROOT="${SIDROOT:-/var/cache/logicalline/sidroot}"
HERE="$(cd "$(dirname "$0")/.." && pwd)"
PACKAGES=(python3.14 python3.14-dev python3.14-venv python3.14-testsuite
          python3.15 python3.15-dev python3.15-venv python3.15-testsuite
          g++ cmake make ca-certificates)
STAMP="$ROOT/.logicalline-packages"

# The mirror that the machine's own sources name; its Release files may be past their date.
mirror() {
  local uri
  uri="$(grep -hoE '^(URIs:|deb) +https?://[^ ]+/debian/?( |$)' \
         /etc/apt/sources.list.d/*.sources /etc/apt/sources.list 2>/dev/null |
         grep -oE 'https?://[^ ]+' | head -n 1 || true)"
  echo "${uri:-http://deb.debian.org/debian}"
}

make_root() {
  if [[ -f "$STAMP" && "$(cat "$STAMP")" == "${PACKAGES[*]}" ]]; then return 0; fi
  if ! command -v mmdebstrap >/dev/null 2>&1; then
    apt-get install -y -q mmdebstrap >/dev/null 2>&1 ||
      { apt-get update -q >/dev/null && apt-get install -y -q mmdebstrap >/dev/null; }
  fi
  rm -rf "$ROOT.new"
  mkdir -p "$(dirname "$ROOT")"
  local packages
  packages="$(IFS=,; echo "${PACKAGES[*]}")"
  mmdebstrap --quiet --variant=apt --aptopt='Acquire::Check-Valid-Until "false"' \
    --include="$packages" sid "$ROOT.new" "$(mirror)"
  rm -rf "$ROOT"
  mv "$ROOT.new" "$ROOT"
  echo "${PACKAGES[*]}" > "$STAMP"
}

# The machine's name resolution and the certificates its own pip trusts, so that pip inside
# reaches the package index as pip outside does.
refresh_settings() {
  cp /etc/resolv.conf "$ROOT/etc/resolv.conf"
  [[ -f /etc/hosts ]] && cp /etc/hosts "$ROOT/etc/hosts"
  local bundle="${PIP_CERT:-${SSL_CERT_FILE:-/etc/ssl/certs/ca-certificates.crt}}"
  if [[ -f "$bundle" ]]; then cp "$bundle" "$ROOT/etc/ssl/host-ca.crt"; fi
}

run_in_root() {
  refresh_settings
  local cert=/etc/ssl/host-ca.crt
  [[ -f "$ROOT$cert" ]] || cert=/etc/ssl/certs/ca-certificates.crt
  local quoted
  quoted="$(printf '%q ' "$@")"
  # A clean environment: the host's pip settings name directories that the root lacks.
  unshare --mount --propagation private bash -c '
    set -e
    root="$1"; here="$2"; shift 2
    for fs in proc dev sys; do mount --rbind "/$fs" "$root/$fs"; done
    mkdir -p "$root$here"
    mount --bind "$here" "$root$here"
    exec chroot "$root" "$@"' _ "$ROOT" "$HERE" \
    env -i PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin HOME=/root \
    LANG=C.UTF-8 CI="${CI:-}" CMAKE_ARGS="${CMAKE_ARGS:-}" PIP_CERT="$cert" SSL_CERT_FILE="$cert" \
    REQUESTS_CA_BUNDLE="$cert" PIP_DISABLE_PIP_VERSION_CHECK=1 PIP_ROOT_USER_ACTION=ignore \
    PIP_DEFAULT_TIMEOUT=180 bash -c "cd $(printf '%q' "$HERE") && exec $quoted"
}

case "${1:-}" in
  make) make_root ;;
  run) shift; make_root; run_in_root "$@" ;;
  *) echo "usage: bash .ci/sidroot.sh make | run CMD [ARG...]" >&2; exit 2 ;;
esac
