#!/usr/bin/env bash
# prepare-prefix.sh BUILD_DIR DLL [SIMULATOR]
# Makes the tests' Wine prefix (once; later runs reuse it) and registers the DLL and the
# simulated device manager in it, so every test starts from a registered system.
# prepare-prefix.sh --fresh BUILD_DIR
# Makes the prefix anew with our settings and registers nothing: the MSI walks install into it.
# Either way the prefix is CALVEX_WINEPREFIX, else the one build/wine-run runs in.
set -euo pipefail
fresh=""
if [ "$1" = --fresh ]; then fresh=1; shift; fi
build=$1 dll=${2:-} sim=${3:-}
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$(sed -n 's/^export WINEPREFIX="${CALVEX_WINEPREFIX:-\(.*\)}"$/\1/p' "$run")}
export WINEPREFIX="$prefix" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml=" WINEARCH=win64

if [ -n "$fresh" ] || [ ! -f "$prefix/.calvex-ready" ]; then
  rm -rf "$prefix"
  wineboot -i >/dev/null 2>&1 || true
  wineserver -w
  touch "$prefix/.calvex-ready"
fi
"$(dirname "$0")/prefix-settings.sh" "$run"
if [ -z "$fresh" ]; then
  winpath() { winepath -w "$1" 2>/dev/null; }
  "$run" regsvr32 /s "$(winpath "$dll")"
  if [ -n "$sim" ]; then
    "$run" "$(winpath "$sim")" /RegServer
  fi
fi
wineserver -w
echo "prefix ready: $prefix"
