#!/bin/sh
# run-then-restart.sh BUILD_DIR PROGRAM ARGS...: runs a test program in the tests' prefix, then
# ends that prefix's Wine session. Wine keeps a killed local server registered until the session
# ends, so without this the next test would find no device manager. Only for serial tests:
# nothing else of the prefix may be running.
build=$1
shift
status=0
"$build/wine-run" "$@" || status=$?
WINEPREFIX="${CALVEX_WINEPREFIX:-$build/wineprefix}" wineserver -k 2>/dev/null
WINEPREFIX="${CALVEX_WINEPREFIX:-$build/wineprefix}" wineserver -w 2>/dev/null
exit $status
