#!/usr/bin/env bash
# demo.sh [--show] [--no-build] [BUILD_DIR]: the product doing its whole job, as a Windows user
# would see it. Installs the Debian packages it needs, builds (only what changed), makes a
# fresh Wine prefix, installs the MSI with the simulated device manager serving the sample
# receivers, then walks Wine's Explorer to "Calvex GNSS Receivers" and into a receiver, copies
# all of that receiver's files out through the view's Copy and prints a report: screenshots,
# each file copied with its size and time, and whether its bytes equal the receiver's.
# Runs on a virtual screen; --show uses your own display ($DISPLAY) instead. Exits non-zero
# when any step fails.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
show="" build_it=1 build=${BUILD_DIR:-$here/build}
for arg in "$@"; do
  case $arg in
    --show) show=1 ;;
    --no-build) build_it="" ;;  # the end-to-end test runs the chain on the tree it built
    -*) echo "usage: $0 [--show] [--no-build] [BUILD_DIR]" >&2; exit 2 ;;
    *) build=$arg ;;
  esac
done
start=$(date +%s)

if [ -n "$build_it" ]; then
  "$here/scripts/setup-debian.sh"
  cmake -S "$here" -B "$build" -DCMAKE_TOOLCHAIN_FILE="$here/cmake/mingw-w64-x86_64.cmake" \
    -DCMAKE_BUILD_TYPE=RelWithDebInfo >/dev/null
  echo "== Building the extension, the simulator, the MSI and the walk's tools"
  cmake --build "$build" -j"$(nproc)" --target calvex_msi calvex-shell calvex-paste view_probe >/dev/null
fi
[ -f "$build/CalvexReceiversShellExt.msi" ] || { echo "no MSI in $build: is wixl installed?" >&2; exit 1; }

walk=("$here/scripts/explorer-walk.sh" "$build" --install msi --prefix "$build/demo-prefix"
      --shots "$build/shots" --rate 524288 --report "$build/demo-report.txt" --brands calvex)
echo "== Installing the MSI into a fresh Wine prefix and walking Wine's Explorer"
status=0
if [ -n "$show" ] && [ -n "${DISPLAY:-}" ]; then
  "${walk[@]}" >"$build/demo-walk.log" 2>&1 || status=$?
else
  xvfb-run -a -s "-screen 0 1280x1024x24" "${walk[@]}" >"$build/demo-walk.log" 2>&1 || status=$?
fi
echo
echo "== Report"
cat "$build/demo-report.txt"
echo "(the walk's full output: $build/demo-walk.log; took $(($(date +%s) - start)) s)"
if [ $status -ne 0 ]; then
  echo "FAILED:"; grep '^FAIL' "$build/demo-walk.log" || tail -20 "$build/demo-walk.log"
  exit $status
fi
echo "All files copied byte-identical with their times."
