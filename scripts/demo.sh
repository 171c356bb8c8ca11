#!/usr/bin/env bash
# demo.sh [BUILD_DIR]: builds the extension and the simulated device manager, registers
# both in a Wine prefix with regsvr32 and /RegServer, and browses the namespace through
# Wine's shell: My Computer with both brand folders, then every receiver and file of the
# built-in sample receivers.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
build=${1:-${BUILD_DIR:-$here/build}}
"$here/scripts/build.sh" "$build"
sim=""
[ -f "$build/CalvexDeviceSim.exe" ] && sim="$build/CalvexDeviceSim.exe"
"$here/tests/wine/prepare-prefix.sh" "$build" "$build/CalvexReceiversShellExt.dll" "$sim"
shell() { xvfb-run -a "$build/wine-run" "$build/calvex-shell.exe" "$@" 2>/dev/null | tr -d '\r'; }
echo
echo "== My Computer, as Wine's shell lists it"
shell ls
echo
echo "== The brand folders, their receivers and files (sample receivers)"
shell tree
