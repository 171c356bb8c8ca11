#!/usr/bin/env bash
# fetch_watch_restart_check.sh BUILD_DIR: the windowless calvex-fetchw --watch, as started at
# logon, started before the device manager is installed and through a restart of it. Files
# logged while it is away come once it is back; a second watch and a batch run into the same
# folder are refused while the first runs on; no download dialog comes on the screen; the end
# of the session stops it during a download without leaving a partial file. It has an icon in
# the notification area and logs a notice after each receiver's pass; with --no-notify it logs
# the notices and shows no icon.
# Guards against a watch that ends for good without the device manager, files fetched twice by
# racing tools, a log without its lines, a logoff that leaves half a file, a watch that says
# nothing when a receiver is done, and an icon that --no-notify does not take away.
set -u
build=$1
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
work=$(mktemp -d /tmp/calvex-restart-XXXXXX)
root=$work/root target=$work/target wlog=$work/watch.log
mkdir -p "$root" "$target"

source "$(dirname "$0")/lib.sh"
fail=0
stamp=1795000000

receiver "$root/Calvex A" 1 1000-0001 A
log "$root/Calvex A" LOG0001 3000
receiver "$root/Brennor C" 2 2000-0003 C
log "$root/Brennor C" LOG0001 4000
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
# Started at logon before the device manager is installed: it waits, and fetches once it is.
"$run" "$build/CalvexDeviceSim.exe" /UnregServer
"$run" "$build/calvex-fetchw.exe" --watch --log "$(win "$wlog")" "$(win "$target")" >"$work/out.txt" 2>&1 &
tool=$!
waitfor "$wlog" "no device manager: it cannot be started (0x80040154): waiting for it" 30
waitfor "$wlog" "no device manager yet (0x80040154)" 20 2
# It asked again 2 s, then 4 s later, by the times of its lines.
pauses=$(tr -d '\r' <"$wlog" | awk '{ split($1, t, ":"); s = t[1] * 3600 + t[2] * 60 + t[3] }
  asked != "" { printf "%s:%d ", asked, s - since; asked = "" }
  / trying the device manager again in / { asked = $(NF - 1); since = s }')
case "$pauses" in "2:"[234]" 4:"[456]" "*) ;; *) bad "pauses before asking again (asked:seconds): $pauses" ;; esac
"$run" "$build/CalvexDeviceSim.exe" /RegServer
waitfor "$wlog" "the device manager is back: every receiver is compared in full" 30
waitfor "$wlog" "fetched     A@USB\\LOG0001" 60
waitfor "$wlog" "fetched     C@USB\\LOG0001" 30
waitfor "$wlog" "A@USB: 1 file in $(win "$target"). Safe to unplug." 30
waitfor "$wlog" "C@USB: 1 file in $(win "$target"). Safe to unplug." 30
tray || bad "no icon in the notification area while the watch runs"

# One at a time: a second watch (logging to the target's own calvex-fetch.log, the windowless
# default) and a batch run into the same folder, spelt otherwise, are refused; the first runs on.
refusal="calvex-fetch: another calvex-fetch is fetching into $(win "$target") already"
"$run" "$build/calvex-fetchw.exe" --watch "$(win "$target")" >/dev/null 2>&1 &
ends $! 30; status=$?
[ $status -eq 2 ] || bad "a second watch ended with $status"
grep -qE "^[0-9:]{8} $(printf '%s' "$refusal" | sed 's/[\\.]/\\&/g')" "$target/calvex-fetch.log" ||
  bad "the second watch's log: $(cat "$target/calvex-fetch.log")"
"$run" "$build/calvex-fetch.exe" "$(win "$target" | tr a-z A-Z)\\" >/dev/null 2>"$work/batch.err"; status=$?
[ $status -eq 2 ] || bad "a batch run into the watched folder, in capitals, ended with $status"
grep -qiF "$refusal" "$work/batch.err" || bad "the batch run's stderr: $(cat "$work/batch.err")"
# A dry run writes nothing: it is let through.
"$run" "$build/calvex-fetch.exe" --dry-run "$(win "$target")" >/dev/null 2>&1; status=$?
[ $status -eq 0 ] || bad "a dry run into the watched folder ended with $status"
kill -0 $tool 2>/dev/null || bad "the first watch did not run on"
# Without a console, what stops it before the target's log is open is said where the user looks.
fallback=$(echo "$prefix"/drive_c/users/*/AppData/Local)/calvex-fetch.log
rm -f "$fallback"
"$run" "$build/calvex-fetchw.exe" --watch --bogus "$(win "$target")" >/dev/null 2>&1; status=$?
[ $status -eq 2 ] || bad "a mistyped option ended with $status"
touch "$work/a-file"
"$run" "$build/calvex-fetchw.exe" --watch "$(win "$work/a-file")" >/dev/null 2>&1; status=$?
[ $status -eq 2 ] || bad "a target that is a file ended with $status"
grep -q "^[0-9:]\{8\} calvex-fetch: unknown option --bogus" "$fallback" &&
  grep -qF "calvex-fetch: target not writable: $(win "$work/a-file")" "$fallback" || bad "the fallback log: $(cat "$fallback")"
rm -f "$target/calvex-fetch.log"

# The device manager quits (a service restart); files logged meanwhile come once it is back.
"$run" "$build/CalvexDeviceSim.exe" /Quit
waitfor "$wlog" "the device manager is gone (0x" 6  # it asks every 2 s
log "$root/Calvex A" LOG0002 5000
log "$root/Brennor C" LOG0002 6000
waitfor "$wlog" "the device manager is back: every receiver is compared in full" 40 2
waitfor "$wlog" "fetched     A@USB\\LOG0002" 30
waitfor "$wlog" "fetched     C@USB\\LOG0002" 30

# The session ends while a file downloads: discarded, a summary, the process gone.
log "$root/Calvex A" BIG0001 200000
downloading "Calvex A" BIG0001 && sleep 1
# Nothing in the user's way: the product's download dialog runs, but off the screen.
dialogs=$(xdotool search --name "^File Download$" 2>/dev/null)
[ -n "$dialogs" ] || bad "no download dialog while BIG0001 downloads"
for w in $dialogs; do
  xdotool getwindowgeometry "$w" | grep -q "Position: -32000,-32000" || bad "on the screen: $(xdotool getwindowgeometry "$w")"
done
"$run" wineboot --end-session
ends $tool 20; status=$?
[ $status -eq 0 ] || bad "exit code $status at the end of the session"
waitfor "$wlog" "discarded   A@USB\\BIG0001.qpr (stopped)" 1
grep -q "^[0-9:]* watch ended: .* (stopped)$" <(tr -d '\r' <"$wlog") || bad "no summary"
grep -vE '^(---- [0-9-]+ ----)?$' <(tr -d '\r' <"$wlog") | grep -qvE '^[0-2][0-9]:[0-5][0-9]:[0-5][0-9] ' &&
  bad "a log line without its time"
tr -d '\r' <"$wlog"

# Every file but the one cut off, once, whole, with its time; nothing partial.
rm "$root/Calvex A/BIG0001"
landed "$wlog"

# --no-notify: the same notices in the log, no icon.
tray && bad "an icon is left in the notification area after the watch ended"
quiet=$work/quiet.log
"$run" "$build/calvex-fetchw.exe" --watch --no-notify --log "$(win "$quiet")" "$(win "$target")" >/dev/null 2>&1 &
tool=$!
waitfor "$quiet" "A@USB: 2 files in $(win "$target"). Safe to unplug." 60
tray && bad "an icon in the notification area with --no-notify"
"$run" wineboot --end-session
ends $tool 20 >/dev/null
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
rm -rf "$work"
[ $fail -eq 0 ] && echo "PASS: through a restart of the device manager, one watch per folder, a clean end of session, a notice per receiver, an icon unless --no-notify"
exit $fail
