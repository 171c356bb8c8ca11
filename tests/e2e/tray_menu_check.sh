#!/usr/bin/env bash
# tray_menu_check.sh BUILD_DIR: the running calvex-fetchw driven through its notification area icon as a
# person would (tray_driver sends the icon's own callback messages and types into its menu), with the simulator
# logging files meanwhile. Download now compares at once; a click, Enter, a click on the notice and a Recent
# pass open Explorer on their folders; Pause holds back a file logged meanwhile and says so, Resume brings it;
# a second start brings the settings window forward and leaves one watch; a layout chosen there is taken
# without a restart and without losing the download in progress; Quit during a download ends cleanly, nothing
# half-written. Guards against an icon that does nothing, a pause that downloads, settings that wait for a
# restart or cut a download, a second watch, and a Quit that leaves a file behind.
set -u
build=$1
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
work=$(mktemp -d /tmp/calvex-tray-XXXXXX)
root=$work/root target=$work/target wlog=$work/watch.log shots=$build/shots
key='HKCU\Software\Calvex\Receivers Shell Extension'
mkdir -p "$root" "$target" "$shots"
source "$(dirname "$0")/lib.sh"
fail=0
stamp=1796000000

driver() { "$run" "$build/tray_driver.exe" "$@" 2>&1 | tr -d '\r'; }
explorer_on() {  # explorer_on FOLDER WHAT: until an Explorer window shows FOLDER; then it is closed
  local window=""
  for _ in $(seq 1 150); do
    window=$(xdotool search --onlyvisible --name "$(basename "$1")" 2>/dev/null | head -1)
    [ -n "$window" ] && break; sleep 0.1
  done
  [ -n "$window" ] || { bad "$2 opened no Explorer window on $(basename "$1")"; return 1; }
  echo "$2: $(xdotool getwindowname "$window")"
  "$run" "$build/tray_driver.exe" close "$(xdotool getwindowname "$window")" >/dev/null 2>&1
  sleep 1
}
fetched() { grep -cF "fetched     $1" "$wlog" 2>/dev/null; }

receiver "$root/Calvex A" 1 1000-0001 A
log "$root/Calvex A" LOG0001 3000
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
"$run" reg delete "$key" /f >/dev/null 2>&1
"$run" "$build/calvex-fetchw.exe" --watch --log "$(win "$wlog")" "$(win "$target")" >/dev/null 2>&1 &
tool=$!
waitfor "$wlog" "A@USB: 1 file in $(win "$target"). Safe to unplug." 60

# Download now: a copy removed from the target comes again at once, not at the minute's comparison.
rm "$target/A@USB/LOG0001.qpr"
driver menu d >/dev/null
waitfor "$wlog" "every receiver is compared in full" 5
waitfor "$wlog" "fetched     A@USB\\LOG0001" 10 2

# The menu with Recent open, for the eye: what it says is the unit tests' (tray_status_test).
driver menu >/dev/null
driver keys c
sleep 1
import -window root "$shots/tray-menu.png" 2>/dev/null || bad "no screenshot of the menu"
# The menu and its Recent submenu, as the README shows them (the menu's bottom left corner is at 600,500).
convert "$shots/tray-menu.png" -crop 660x215+590+300 +repage "$shots/tray-menu-cropped.png" 2>/dev/null
# Its first pass, chosen in Recent, opens the receiver's folder.
driver keys ">"
explorer_on "$target/A@USB" "a Recent pass"
driver click; explorer_on "$target" "a click on the icon"
driver enter; explorer_on "$target" "Enter on the icon"
driver notice; explorer_on "$target/A@USB" "a click on the notice"

# Paused for an hour: a file logged meanwhile waits, the icon says so; Resume brings it.
trayid=$(xdotool search --onlyvisible --name '^Wine System Tray$' 2>/dev/null | head -1)
import -window "$trayid" "$shots/tray-running.png" 2>/dev/null
driver menu p >/dev/null
waitfor "$wlog" "paused for 60 min" 10
log "$root/Calvex A" LOG0002 2000
sleep 8
[ "$(fetched 'A@USB\LOG0002')" = 0 ] || bad "LOG0002 was fetched while paused"
# The icon says so: it is not the one of a running watch.
import -window "$trayid" "$shots/tray-paused.png" 2>/dev/null
icons() { convert "$1" -gravity south -crop 0x24+0+0 +repage "$2"; }  # below the tray's title
icons "$shots/tray-running.png" "$work/running-icons.png"; icons "$shots/tray-paused.png" "$work/paused-icons.png"
[ "$(compare -metric AE "$work/running-icons.png" "$work/paused-icons.png" null: 2>&1)" != 0 ] || bad "the icon does not show the pause"
driver menu r >/dev/null
waitfor "$wlog" "fetched     A@USB\\LOG0002" 15

# A second start brings the settings forward and ends; the one watch runs on. A layout chosen there while a
# file downloads: that file lands whole where it was going, the next one by the new layout.
log "$root/Calvex A" BIG0001 1200000
downloading "Calvex A" BIG0001
"$run" "$build/calvex-fetchw.exe" >/dev/null 2>&1 &
ends $! 20; status=$?
[ $status = 0 ] || bad "a second start ended with $status"
kill -0 $tool 2>/dev/null || bad "the first watch did not run on"
for _ in $(seq 1 100); do
  window=$(xdotool search --onlyvisible --name '^Calvex receivers download settings$' 2>/dev/null | head -1)
  [ -n "$window" ] && break; sleep 0.1
done
if [ -n "$window" ]; then
  xdotool windowactivate "$window" 2>/dev/null; xdotool windowfocus "$window" 2>/dev/null; sleep 0.5
  xdotool key --delay 100 alt+w Home Down Down; sleep 0.5
  [ "$(fetched 'A@USB\BIG0001')" = 0 ] || bad "BIG0001 was fetched before the settings were chosen: nothing shown of a download in progress"
  xdotool key Return
else
  bad "a second start brought no settings window forward"
fi
waitfor "$wlog" "settings applied: new files into $(win "$target")\\{yyyy}\\{doy}\\{receiver}" 30
grep -qF "discarded   A@USB\\BIG0001" "$wlog" && bad "new settings cut the download in progress"
order=$(grep -nF -e "fetched     A@USB\\BIG0001" -e "settings applied:" "$wlog" | cut -c1-60)
grep -qF "fetched" <<<"$(head -1 <<<"$order")" || bad "the settings were taken before the file in progress ended: $order"
[ "$(fetched 'A@USB\BIG0001')" = 1 ] && cmp -s "$root/Calvex A/BIG0001" "$target/A@USB/BIG0001.qpr" ||
  bad "BIG0001 did not land whole where it was going"
log "$root/Calvex A" LOG0003 1000
waitfor "$wlog" "\\A@USB\\LOG0003.qpr" 30
ls "$target"/[0-9][0-9][0-9][0-9]/[0-9][0-9][0-9]/A@USB/LOG0003.qpr >/dev/null 2>&1 || bad "LOG0003 not by the new layout: $(find "$target" -name 'LOG0003*')"

# Quit during a download: discarded, nothing half-written, the process and its icon gone.
log "$root/Calvex A" BIG0002 400000
downloading "Calvex A" BIG0002 && sleep 1
driver menu q >/dev/null
ends $tool 20; status=$?
[ $status = 0 ] || bad "Quit ended the watch with $status"
waitfor "$wlog" "BIG0002.qpr (stopped)" 1
grep -q "^[0-9:]* watch ended: .* (stopped)$" <(tr -d '\r' <"$wlog") || bad "no summary after Quit"
[ -z "$(find "$target" -name 'BIG0002*' -o -name '*.calvex-partial')" ] || bad "Quit left: $(find "$target" -name 'BIG0002*' -o -name '*partial*')"
sleep 1
tray && bad "an icon is left in the notification area after Quit"
tr -d '\r' <"$wlog"

"$run" reg delete "$key" /f >/dev/null 2>&1
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
rm -rf "$work"
[ $fail -eq 0 ] && echo "PASS: the icon opens its folders, Download now, Pause and Resume, Recent, a second start's settings taken between files, a clean Quit"
exit $fail
