#!/usr/bin/env bash
# msi_install_check.sh BUILD_DIR: runs the installer test in a Wine prefix made afresh for it,
# so that nothing registered by other tests can stand in for what the MSI must write.
set -euo pipefail
build=$1
export WINEPREFIX="$build/msi-test-prefix" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml=" WINEARCH=win64
rm -rf "$WINEPREFIX"
wineboot -i >/dev/null 2>&1 || true
wineserver -w
status=0
wine "$build/installer_msi_install_test.exe" --gtest_color=no || status=$?
wineserver -k || true
rm -rf "$WINEPREFIX"
exit $status
