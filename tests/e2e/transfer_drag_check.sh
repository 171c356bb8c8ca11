#!/usr/bin/env bash
# transfer_drag_check.sh BUILD_DIR: a real drag out of a receiver. drag_source.exe starts
# DoDragDrop with the product's data object, calvex-paste shows its drop window in another
# process, and xdotool moves the X pointer from one to the other and lets go.
set -u
build=$1
run="$build/wine-run"
work=$(mktemp -d /tmp/calvex-drag-XXXXXX)
mkdir "$work/target"
source "$(dirname "$0")/lib.sh"
export CALVEX_BUILD_DIR=$build CALVEX_SOURCE_DIR=${CALVEX_SOURCE_DIR:-$build/..}
export CALVEX_DRAG_MARKER=$(win "$work/marker") CALVEX_DRAG_TARGET=$(win "$work/target")
"$run" "$build/calvex-paste.exe" --drop "$CALVEX_DRAG_TARGET" 90 >"$work/paste.out" 2>&1 &
paste=$!
waitfor "$work/paste.out" "drop window ready" 60 || { kill $paste; exit 1; }
"$run" "$build/tests/e2e_drag_source.exe" --gtest_color=no >"$work/source.out" 2>&1 &
source=$!
ok=1
if waitfor "$work/marker" window 90; then
  xdotool mousemove 200 200 mousedown 1
  waitfor "$work/marker" dragging 20 || ok=0
  sleep 1
  for x in 300 500 700 800 850; do xdotool mousemove $x 250; sleep 0.3; done
  sleep 0.5
  xdotool mouseup 1
else
  ok=0
fi
wait $source; source_rc=$?
wait $paste; paste_rc=$?
tr -d '\r' <"$work/source.out"
echo "--- calvex-paste:"; tr -d '\r' <"$work/paste.out"
rm -rf "$work" "$work.marker"
if [ $ok = 1 ] && [ $source_rc = 0 ] && [ $paste_rc = 0 ]; then echo "PASS"; exit 0; fi
echo "FAIL: source $source_rc, calvex-paste $paste_rc"; exit 1
