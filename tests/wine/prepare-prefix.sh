#!/usr/bin/env bash
# prepare-prefix.sh BUILD_DIR DLL [SIMULATOR]
# Makes the tests' Wine prefix (once; later runs reuse it) and registers the DLL and the
# simulated device manager in it, so every test starts from a registered system.
set -euo pipefail
build=$1 dll=$2 sim=${3:-}
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$(sed -n 's/^export WINEPREFIX="${CALVEX_WINEPREFIX:-\(.*\)}"$/\1/p' "$run")}
export WINEPREFIX="$prefix" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml=" WINEARCH=win64

if [ ! -f "$prefix/.calvex-ready" ]; then
  rm -rf "$prefix"
  wineboot -i >/dev/null 2>&1 || true
  wineserver -w
  touch "$prefix/.calvex-ready"
fi
"$(dirname "$0")/prefix-settings.sh" "$run"
winpath() { winepath -w "$1" 2>/dev/null; }
"$run" regsvr32 /s "$(winpath "$dll")"
if [ -n "$sim" ]; then
  "$run" "$(winpath "$sim")" /RegServer
fi
wineserver -w
echo "prefix ready: $prefix"
