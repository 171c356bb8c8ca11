#!/usr/bin/env bash
# logon_fetch_check.sh BUILD_DIR: the automatic download as a surveyor meets it. The MSI with
# AutoFetch (and the simulated device manager's sample receivers) into a prefix made afresh;
# then a logon (Wine runs the Run values when wineboot starts a session): every sample file
# lands in FETCHDIR once with nothing partial, a log says what happened, a file logged while
# the device manager restarts comes too; installed again with FETCHMOVE and FETCHLAYOUT, the
# next logon moves every file into its place and empties the receivers; an upgrade to the
# next version keeps the folder, moving and the layout; a layout and the logon switch changed
# as the settings window does survive a repair and the upgrade; after /x a logon starts no watch.
# Guards against a logon value that does not start, quotes or points wrongly, a watch that
# needs a console, and a removal that leaves the watch starting at each logon.
set -u
build=$1
export CALVEX_WINEPREFIX="$build/logon-test-prefix" WINEPREFIX="$build/logon-test-prefix"
run="$build/wine-run"
source "$(dirname "$0")/../e2e/lib.sh"
fail=0
"$(dirname "$0")/../wine/prepare-prefix.sh" --fresh "$build" >/dev/null
msi=$(winepath -w "$build/CalvexReceiversShellExt.msi" 2>/dev/null) next=$(winepath -w "$build/next/CalvexReceiversShellExt.msi" 2>/dev/null)
survey="$WINEPREFIX/drive_c/Survey" wlog="$WINEPREFIX/drive_c/Survey/calvex-fetch.log"
installed="$WINEPREFIX/drive_c/Program Files/Calvex/Receivers Shell Extension"
logon() { wineserver -k; wineserver -w; "$run" wineboot; }  # a new session, as at logon
watching() {  # a calvex-fetchw of this prefix runs
  local pid
  for pid in $(pgrep -f 'calvex-fetchw\.exe'); do
    tr '\0' '\n' <"/proc/$pid/environ" 2>/dev/null | grep -qxF "WINEPREFIX=$WINEPREFIX" && return 0
  done
  return 1
}

"$run" msiexec /i "$msi" /qn ADDLOCAL=ALL 'FETCHDIR=C:\Survey' || bad "msiexec /i ended with $?"
expected=$("$run" "$installed/calvex-fetch.exe" --dry-run 'C:\Survey' | tr -d '\r' | sed -n 's/^dry run: \([0-9]*\) to fetch.*/\1/p')
[ "${expected:-0}" -ge 15 ] || bad "the sample receivers offer ${expected:-no} files"
logon
waitfor "$wlog" 'watching the Calvex and Brennor receivers, new files into C:\Survey (Ctrl+C stops)' 60
for _ in $(seq 1 900); do
  [ "$(grep -c '  fetched     ' "$wlog" 2>/dev/null)" -ge "${expected:-1}" ] && break; sleep 0.1
done
fetched=$(find "$survey" -mindepth 2 -type f ! -name '*.calvex-partial' | wc -l)
[ "$fetched" = "$expected" ] || bad "$fetched of $expected sample files in C:\\Survey"
[ "$(grep -c '  fetched     ' "$wlog")" = "$expected" ] || bad "fetched lines: $(grep -c '  fetched     ' "$wlog")"
watching || bad "no watch runs after the logon"

# The device manager's service restarts; a file logged meanwhile comes once it is back.
"$run" "$installed/CalvexDeviceSim.exe" /Quit
waitfor "$wlog" "the device manager is gone (0x" 15
printf 'logged during the restart' >"$installed/sample-receivers/Calvex Q9 USB/LOG0099"
waitfor "$wlog" "the device manager is back: every receiver is compared in full" 40
waitfor "$wlog" 'fetched     Q9 GNSS@USB\LOG0099.qpr' 30
cmp -s "$installed/sample-receivers/Calvex Q9 USB/LOG0099" "$survey/Q9 GNSS@USB/LOG0099.qpr" || bad "LOG0099 differs"
[ -z "$(find "$survey" -name '*.calvex-partial')" ] || bad "partial files: $(find "$survey" -name '*.calvex-partial')"
tr -d '\r' <"$wlog"

# The routine finished: installed again with FETCHMOVE and FETCHLAYOUT, the next logon files
# every receiver's files by brand and receiver, empties each receiver once every copy is whole,
# and says so per receiver.
wineserver -k; wineserver -w
"$run" msiexec /i "$msi" /qn ADDLOCAL=ALL FETCHMOVE=1 'FETCHLAYOUT={brand}\{receiver}' || bad "msiexec /i with FETCHMOVE ended with $?"
left() { find "$installed/sample-receivers" -type f ! -name receiver.ini | wc -l; }
unlisted=$(($(left) - expected - 1))  # a receiver without a label is not listed: its file stays
logon
for _ in $(seq 1 900); do [ "$(left)" = $unlisted ] && break; sleep 0.1; done
[ "$(left)" = $unlisted ] || bad "$(($(left) - unlisted)) files still on the listed receivers after the logon with FETCHMOVE=1"
moved=$(find "$survey/Calvex" "$survey/Brennor" -type f ! -name '*.calvex-partial' 2>/dev/null | wc -l)
[ "$moved" = $((expected + 1)) ] || bad "$moved of $((expected + 1)) files filed by brand and receiver"
cmp -s "$survey/Q9 GNSS@USB/LOG0099.qpr" "$survey/Calvex/Q9 GNSS@USB/LOG0099.qpr" || bad "LOG0099 filed wrongly"
waitfor "$wlog" "Q9 GNSS@USB: 8 files in C:\Survey, 8 deleted from the receiver. Safe to unplug." 30

# Another layout chosen in the settings window (which stores it so): a repair keeps it, and the
# next logon files a new file by it.
key='HKCU\Software\Calvex\Receivers Shell Extension'
stored() { "$run" reg query "$key" /v "$1" 2>/dev/null | tr -d '\r' | sed -n "s/^ *$1 *REG_SZ *//p"; }
wineserver -k; wineserver -w
"$run" reg add "$key" /v FetchLayout /d '{yyyy}\{receiver}' /f >/dev/null 2>&1
"$run" msiexec /i "$msi" /qn REINSTALL=ALL REINSTALLMODE=omus || bad "the repair ended with $?"
[ "$(stored FetchLayout)" = '{yyyy}\{receiver}' ] || bad "the repair changed the chosen layout to $(stored FetchLayout)"
printf 'logged after the repair' >"$installed/sample-receivers/Calvex Q9 USB/LOG0098"
logon
for _ in $(seq 1 600); do [ -n "$(find "$survey" -name LOG0098.qpr)" ] && break; sleep 0.1; done
[ -f "$survey/$(date +%Y)/Q9 GNSS@USB/LOG0098.qpr" ] || bad "LOG0098 not filed by the chosen layout: $(find "$survey" -name LOG0098.qpr)"

# "Start at logon" turned off in the window: a repair keeps it off, and a logon starts no watch.
wineserver -k; wineserver -w
"$run" reg add "$key" /v FetchStartAtLogon /d 0 /f >/dev/null 2>&1
"$run" msiexec /i "$msi" /qn REINSTALL=ALL REINSTALLMODE=omus || bad "the repair ended with $?"
logon
sleep 5
watching && bad "a watch started at logon with start at logon off after a repair"

# Upgraded to the next version without any property: the logon value starts the program, which
# reads the folder, moving, the layout and the switch, all as they were.
# (Windows carries the installed features over; Wine's msiexec does not, so they are named.)
wineserver -k; wineserver -w
"$run" msiexec /i "$next" /qn ADDLOCAL=ALL || bad "the upgrade ended with $?"
value=$("$run" reg query 'HKCU\Software\Microsoft\Windows\CurrentVersion\Run' /v 'Calvex receivers watch' 2>/dev/null | tr -d '\r')
case $value in *'calvex-fetchw.exe" --logon'*) ;; *) bad "the logon value after the upgrade: $value" ;; esac
kept="$(stored FetchDir)|$(stored FetchMove)|$(stored FetchLayout)|$(stored FetchStartAtLogon)"
[ "$kept" = 'C:\Survey|1|{yyyy}\{receiver}|0' ] || bad "the settings after the upgrade: $kept"
"$run" reg add "$key" /v FetchStartAtLogon /d 1 /f >/dev/null 2>&1
[ -n "$(find "$WINEPREFIX/drive_c" -name 'Calvex receivers download.lnk')" ] || bad "no Start menu entry"

# Removed: the logon value goes, the fetched files and the log stay, a logon starts nothing.
"$run" msiexec /x "$next" /qn || bad "msiexec /x ended with $?"
logon
sleep 5
watching && bad "a watch still starts at logon after the removal"
[ -f "$wlog" ] && [ -f "$survey/Q9 GNSS@USB/LOG0099.qpr" ] || bad "the removal took the fetched files or the log"
wineserver -k || true
rm -rf "$WINEPREFIX"
[ $fail -eq 0 ] && echo "PASS: installed, a logon fetched $expected files and one more through a restart; with FETCHMOVE every receiver emptied into its place; removed, nothing starts"
exit $fail
