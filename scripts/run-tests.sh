#!/usr/bin/env bash
# run-tests.sh [BUILD_DIR] [ctest arguments...]: builds, then runs every test under Wine with
# a virtual screen. Exits non-zero when any test fails.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
build=${BUILD_DIR:-$here/build}
if [ $# -gt 0 ] && [ "${1#-}" = "$1" ]; then build=$1; shift; fi
"$here/scripts/build.sh" "$build"
cd "$build"
xvfb-run -a -s "-screen 0 1280x1024x24" ctest --output-on-failure -j"$(nproc)" --timeout 900 "$@"
