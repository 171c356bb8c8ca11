#!/usr/bin/env bash
# run-tests.sh [BUILD_DIR] [ctest arguments...]: builds, then runs every test under Wine with
# a virtual screen. Exits non-zero when any test fails.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
build=${BUILD_DIR:-$here/build}
if [ $# -gt 0 ] && [ "${1#-}" = "$1" ]; then build=$1; shift; fi
"$here/scripts/build.sh" "$build"
cd "$build"
# Surveyors work in every zone: the suite runs in one with an offset and daylight saving, whose
# change falls between the test files' dates (wine-run gives Wine the same zone).
export CALVEX_TEST_TZ=${CALVEX_TEST_TZ:-America/New_York}
export TZ=$CALVEX_TEST_TZ
xvfb-run -a -s "-screen 0 1280x1024x24" ctest --output-on-failure -j"$(nproc)" --timeout 900 "$@"
