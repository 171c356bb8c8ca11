#!/usr/bin/env bash
# msi_install_check.sh BUILD_DIR: runs the installer test in a Wine prefix made afresh for it,
# so that nothing registered by other tests can stand in for what the MSI must write.
set -euo pipefail
build=$1
here=$(cd "$(dirname "$0")/.." && pwd)
export CALVEX_WINEPREFIX="$build/msi-test-prefix" WINEPREFIX="$build/msi-test-prefix"
"$here/wine/prepare-prefix.sh" --fresh "$build" >/dev/null
status=0
"$build/wine-run" "$build/installer_msi_install_test.exe" --gtest_color=no || status=$?
wineserver -k || true
rm -rf "$WINEPREFIX"
exit $status
