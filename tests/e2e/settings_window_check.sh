#!/usr/bin/env bash
# settings_window_check.sh BUILD_DIR: calvex-fetchw's settings window driven by keyboard as a
# person would, its controls read from outside (settings_probe). A damaged stored layout shows
# the default; a folder that does not exist holds OK back and is made by "Make it"; a pattern
# error shows in place in --layout's words and holds OK back; a common layout shows its pattern
# and the example of where a connected receiver's file lands; OK stores the choice, which the
# next start shows again; Cancel stores nothing. The logon start honours "start at logon" off,
# and with it on watches the stored folder, logging the damaged value it replaced.
# Guards against a window that lets a bad folder or pattern through, loses the choice, says
# nothing about a refusal, or a logon start that ignores the window.
set -u
build=$1
run="$build/wine-run"
source "$(dirname "$0")/lib.sh"
cwin() { echo "C:${1#$prefix/drive_c}" | sed 's|/|\\|g'; }
fail=0
work=$(mktemp -d /tmp/calvex-settings-XXXXXX)
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
# The folder to be made on drive C:, as a surveyor's would be (and so in the README's picture).
root=$work/root first=$work/first made="$prefix/drive_c/Surveys/Campaign 7" wlog=$work/watch.log shots=$build/shots
key='HKCU\Software\Calvex\Receivers Shell Extension'
mkdir -p "$root" "$first" "$shots"
receiver "$root/Calvex R8" 1 1000-0008 R8
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
"$run" reg delete "$key" /f >/dev/null 2>&1
"$run" reg add "$key" /v FetchDir /d "$(win "$first")" /f >/dev/null 2>&1
"$run" reg add "$key" /v FetchLayout /d '{receiver}\{doy2}' /f >/dev/null 2>&1

probe() { "$run" "$build/settings_probe.exe" 2>/dev/null | tr -d '\r'; }
shows() {  # shows NAME=VALUE...: until the window shows them all; at once a failure when it is gone
  local want seen
  for _ in $(seq 1 40); do
    seen=$(probe) want=0
    [ -n "$seen" ] || { bad "no settings window to show $*"; return 1; }
    for line in "$@"; do grep -qxF -- "$line" <<<"$seen" || want=1; done
    [ $want = 0 ] && return 0; sleep 0.25
  done
  bad "the window does not show: $* (it shows: $(tr '\n' ' ' <<<"$seen"))"
}
stored() { "$run" reg query "$key" /v "$1" 2>/dev/null | tr -d '\r' | sed -n "s/^ *$1 *REG_SZ *//p"; }
keys() { sleep 0.3; xdotool key --delay 80 "$@"; }
typed() { sleep 0.3; xdotool type --delay 40 -- "$1"; }
open() {
  "$run" "$build/calvex-fetchw.exe" --settings >/dev/null 2>&1 &
  tool=$!
  for _ in $(seq 1 300); do
    window=$(xdotool search --onlyvisible --name '^Calvex receivers download settings$' 2>/dev/null | head -1)
    [ -n "$window" ] && break; sleep 0.1
  done
  [ -n "$window" ] || { bad "no settings window"; return 1; }
  xdotool windowactivate "$window" 2>/dev/null; xdotool windowfocus "$window" 2>/dev/null
}
today=$(TZ=${CALVEX_TEST_TZ:-America/New_York} date +%F) year=$(TZ=${CALVEX_TEST_TZ:-America/New_York} date +%Y)
doy=$(TZ=${CALVEX_TEST_TZ:-America/New_York} date +%j)

open
shows "target=$(win "$first")" "problem=" "layout=by receiver" "pattern={receiver}" "ok=1" "move=0" "notify=1" "logon=1" \
  "example=A file that R8@USB logs on $today goes to $(win "$first")\\R8@USB"
# A folder that is not there yet: refused in place, offered to be made; Enter does nothing.
keys ctrl+a; typed "$(cwin "$made")"
shows "problem=This folder does not exist yet." "make=1" "ok=0"
import -window "$window" "$shots/settings-missing-folder.png" 2>/dev/null
keys Return; sleep 1
kill -0 $tool 2>/dev/null || bad "Enter closed the window with a folder that does not exist"
keys alt+m
shows "problem=" "make=0" "ok=1"
[ -d "$made" ] || bad "\"Make it\" made no folder"
# A pattern of one's own with an error: the same words as --layout's, and OK held back.
keys alt+w End alt+p ctrl+a; typed '{receiver}\{doy2}'
shows "layout=a pattern of my own" "example=This pattern cannot be used: unknown field {doy2}" "ok=0"
import -window "$window" "$shots/settings-pattern-error.png" 2>/dev/null
# A common layout instead: its pattern shown, and where R8's file of today would land.
keys alt+w Home Down Down
shows "layout=by year and day, then receiver" "pattern={yyyy}\\{doy}\\{receiver}" "ok=1" \
  "example=A file that R8@USB logs on $today goes to $(cwin "$made")\\$year\\$doy\\R8@USB"
# Browse... opens the shell's folder picker on the folder; closing it changes nothing.
keys alt+r
for _ in $(seq 1 100); do
  picker=$(xdotool search --onlyvisible --name "^Folder for the receivers' files$" 2>/dev/null | head -1)
  [ -n "$picker" ] && break; sleep 0.1
done
[ -n "$picker" ] || bad "Browse... opened no folder picker"
sleep 1; import -window root "$shots/settings-browse.png" 2>/dev/null
keys Escape
shows "target=$(cwin "$made")" "ok=1"
keys alt+e alt+n alt+s
shows "move=1" "notify=0" "logon=0"
sleep 0.5
import -window "$window" "$shots/settings-window.png" 2>/dev/null || bad "no screenshot of the window"
keys Return
ends $tool 10 >/dev/null; status=$?
[ $status = 0 ] || bad "OK ended the window with $status"
[ "$(stored FetchDir)" = "$(cwin "$made")" ] || bad "FetchDir stored: $(stored FetchDir)"
[ "$(stored FetchLayout)" = '{yyyy}\{doy}\{receiver}' ] || bad "FetchLayout stored: $(stored FetchLayout)"
[ "$(stored FetchMove)$(stored FetchNotify)$(stored FetchStartAtLogon)" = 100 ] ||
  bad "switches stored: $(stored FetchMove)$(stored FetchNotify)$(stored FetchStartAtLogon)"

# The next start shows the choice again; Cancel keeps it as it was.
open
shows "target=$(cwin "$made")" "layout=by year and day, then receiver" "pattern={yyyy}\\{doy}\\{receiver}" "move=1" \
  "notify=0" "logon=0" "ok=1"
keys alt+e Escape
ends $tool 10 >/dev/null; status=$?
[ $status = 1 ] || bad "Cancel ended the window with $status"
[ "$(stored FetchMove)" = 1 ] || bad "Cancel stored moving off"

# The logon start with "start at logon" off ends at once; on, it watches the stored folder and
# logs the damaged value it did without.
"$run" "$build/calvex-fetchw.exe" --logon --log "$(win "$wlog")" >/dev/null 2>&1 &
ends $! 15; status=$?
[ $status = 0 ] && [ ! -e "$wlog" ] || bad "the logon start with start at logon off ended with $status, log: $(ls "$wlog" 2>&1)"
"$run" reg add "$key" /v FetchStartAtLogon /d 1 /f >/dev/null 2>&1
"$run" reg add "$key" /v FetchNotify /d maybe /f >/dev/null 2>&1
"$run" "$build/calvex-fetchw.exe" --logon --log "$(win "$wlog")" >/dev/null 2>&1 &
tool=$!
waitfor "$wlog" "settings: FetchNotify is damaged (\"maybe\" is neither 1 nor 0), on is used" 30
waitfor "$wlog" "new files into $(cwin "$made")" 30
"$run" taskkill /f /im calvex-fetchw.exe >/dev/null 2>&1
ends $tool 15 >/dev/null

"$run" reg delete "$key" /f >/dev/null 2>&1
"$run" "$build/CalvexDeviceSim.exe" /Quit
rm -rf "$work" "$prefix/drive_c/Surveys"
[ $fail -eq 0 ] && echo "PASS: the settings window refused a missing folder and a bad pattern in place, stored the choice, showed it again; the logon start followed it"
exit $fail
