#!/usr/bin/env bash
# Installs what building and testing needs on a fresh Debian machine. Safe to run again:
# packages already present are not fetched twice.
set -euo pipefail

packages=(
  cmake make python3
  g++-mingw-w64-x86-64-posix mingw-w64-tools   # compiler, windres, widl
  libwine-dev wine64-tools                     # the .idl files widl imports; Wine's widl for type libraries
  wine wine64                                  # runs the DLL, the simulator and the tests
  xvfb xauth xdotool imagemagick               # windows without a screen, input, screenshots
  wixl msitools                                # the MSI installer (wixl), msibuild and msiinfo
  googletest                                   # sources, built with the MinGW toolchain
  tzdata                                       # the tests run in a zone with daylight saving
)

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
if ((${#missing[@]})); then
  echo "Installing: ${missing[*]}"
  SUDO=""
  [ "$(id -u)" -eq 0 ] || SUDO="sudo"
  $SUDO apt-get update -qq
  DEBIAN_FRONTEND=noninteractive $SUDO apt-get install -y -qq "${missing[@]}" >/dev/null
fi
