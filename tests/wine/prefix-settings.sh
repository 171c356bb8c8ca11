#!/usr/bin/env bash
# prefix-settings.sh WINE_RUN: the Wine settings every prefix of ours gets, for tests and demo.
set -u
run=$1
# A crashing program must end, not wait on Wine's crash dialog until the test times out.
"$run" reg add 'HKCU\Software\Wine\WineDbg' /v ShowCrashDialog /t REG_DWORD /d 0 /f >/dev/null 2>&1 || true
# Under Xvfb there is no window manager: with managed windows, Wine's X11 driver waits 2 s for
# one to confirm every window it hides, so each closed download dialog would cost 2 s.
"$run" reg add 'HKCU\Software\Wine\X11 Driver' /v Managed /t REG_SZ /d N /f >/dev/null 2>&1 || true
