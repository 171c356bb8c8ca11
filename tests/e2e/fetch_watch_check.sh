#!/usr/bin/env bash
# fetch_watch_check.sh BUILD_DIR: calvex-fetch --watch against the simulator's live folder
# events. A receiver plugged in, a file logged on another, a burst of files, a receiver
# unplugged while a file of it downloads and plugged back with a file logged meanwhile, then a
# real Ctrl+C during a download; then a watch with --move and a layout empties the receivers,
# a file logged meanwhile included. Guards against files fetched twice or not at all, partial or
# mistimed files, lost notifications and a tool that does not end.
set -u
build=$1
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
work=$(mktemp -d /tmp/calvex-watch-XXXXXX)
root=$work/root away=$work/away target=$work/target out=$work/out.txt
mkdir -p "$root" "$away" "$target"
source "$(dirname "$0")/lib.sh"
fail=0
stamp=1793000000  # late October: daylight saving time in the tests' zone, which has left by now

# With no receiver plugged in, a batch run has nothing to do: exit code 2 and the reason.
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$away")" /f >/dev/null 2>&1
"$run" "$build/calvex-fetch.exe" "$(win "$target")" >/dev/null 2>"$work/err.txt"; status=$?
[ $status -eq 2 ] || bad "a batch run without receivers ended with $status"
grep -qx "calvex-fetch: no receiver is connected" <(tr -d '\r' <"$work/err.txt") || bad "without receivers: $(cat "$work/err.txt")"

receiver "$root/Calvex A" 1 1000-0001 A
log "$root/Calvex A" LOG0001 3000
receiver "$root/Calvex B" 1 1000-0002 B
log "$root/Calvex B" LOG0001 2000
log "$root/Calvex B" LOG0003 1500
log "$root/Calvex B" LOG0004 1000
receiver "$away/Brennor C" 2 2000-0003 C
log "$away/Brennor C" LOG0001 4000
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
"$run" "$build/calvex-fetch.exe" --watch "$(win "$target")" >"$out" 2>"$work/err.txt" &
tool=$!

waitfor "$out" "B@USB (1000-0002!B!USB) -> " 60
waitfor "$out" "fetched     B@USB\\LOG0001" 30
tray && bad "an icon in the notification area for a watch in a console"
cp -r "$away/Brennor C" "$root/"
waitfor "$out" "Brennor C@USB (2000-0003!C!USB) plugged in -> " 30
log "$root/Calvex A" LOG0002 7000
# Files logged one after the other, so that notifications keep arriving while downloads
# of the same receiver run (2 s each; the folder sends one notification a quiet second on).
for i in 1 2 3 4 5; do log "$root/Calvex A" "BURST$i" 80000; sleep 1.3; done
# B unplugged while a file of it downloads (5 s at its rate), a file logged while it is away.
log "$root/Calvex B" BIG0001 200000
downloading "Calvex B" BIG0001 && sleep 1
mv "$root/Calvex B" "$away/"
waitfor "$out" "Calvex B@USB (1000-0002!B!USB) unplugged" 30
[ -z "$(ls "$target/B@USB" | grep BIG0001)" ] || bad "a cut download left a file: $(ls "$target/B@USB")"
log "$away/Calvex B" LOG0002 1000
# Meanwhile one file got a new time at the same size, one new bytes at the same time: both come
# again once B is back; LOG0004, unchanged, does not.
touch -d "@$((stamp + 86400))" "$away/Calvex B/LOG0001"
head -c 1600 /dev/urandom >"$away/Calvex B/LOG0003.new"
touch -r "$away/Calvex B/LOG0003" "$away/Calvex B/LOG0003.new"
mv "$away/Calvex B/LOG0003.new" "$away/Calvex B/LOG0003"
mv "$away/Calvex B" "$root/"
waitfor "$out" "B@USB (1000-0002!B!USB) plugged in -> " 30
waitfor "$out" "fetched     B@USB\\LOG0002" 30
waitfor "$out" "fetched     B@USB\\LOG0003.qpr  1.6 KB" 30
# Stopped by a real Ctrl+C while a download runs: discarded, and nothing failed.
log "$root/Calvex A" BIG0002 200000
downloading "Calvex A" BIG0002 && sleep 1
kill -INT $tool
ends $tool 10; status=$?
[ $status -eq 0 ] || bad "exit code $status after Ctrl+C with nothing failed"
grep -qF "discarded   A@USB\\BIG0002" "$out" || bad "the download in progress was not discarded"
grep -q "^[0-9:]* watch ended: .* (stopped)$" <(tr -d '\r' <"$out") || bad "no summary"
grep -qvE '^[0-2][0-9]:[0-5][0-9]:[0-5][0-9] ' "$out" && bad "a line without its time"

# Started again: only the discarded file is new.
"$run" "$build/calvex-fetch.exe" --watch "$(win "$target")" >"$out.2" 2>"$work/err.txt" &
tool=$!
waitfor "$out.2" "fetched     A@USB\\BIG0002" 30
kill -INT $tool
ends $tool 10; status=$?
[ $status -eq 0 ] || bad "exit code $status when stopped the second time"
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
tr -d '\r' <"$out"; echo "--- started again:"; tr -d '\r' <"$out.2"
cat "$out.2" >>"$out"

# Every file the receivers hold, once (the two changed while away twice), whole, with its time,
# and nothing else.
landed "$out" "Calvex B/LOG0001" "Calvex B/LOG0003"

# A file that fails is tried once more at once, then given up until the full comparison a minute
# on: a file logged later on its receiver does not bring it back. A watch that saw a failure ends with 1. A batch stopped by Ctrl+C
# discards the download in progress, goes no further and ends with 1.
"$run" "$build/CalvexDeviceSim.exe" /Quit
failing=$work/failing
receiver "$failing/Calvex F" 1 1000-0009 F
printf 'FailAtPercent=50\r\n' >>"$failing/Calvex F/receiver.ini"
log "$failing/Calvex F" BAD1 20000
receiver "$failing/Calvex G" 1 1000-0010 G
log "$failing/Calvex G" BIG 200000
log "$failing/Calvex G" SMALL 1000
receiver "$failing/Calvex H" 1 1000-0011 H
log "$failing/Calvex H" LOG1 1000
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$failing")" /f >/dev/null 2>&1
"$run" "$build/calvex-fetch.exe" --receiver G@USB "$(win "$work/batch")" >"$out.4" 2>/dev/null &
tool=$!
root=$failing downloading "Calvex G" BIG && sleep 1
kill -INT $tool
ends $tool 10; status=$?
[ $status -eq 1 ] || bad "exit code $status of a batch stopped by Ctrl+C"
grep -qF "discarded   BIG.qpr (stopped)" "$out.4" && grep -q " (interrupted)$" <(tr -d '\r' <"$out.4") || bad "a batch stopped: $(cat "$out.4")"
[ -z "$(find "$work/batch" -type f)" ] || bad "a stopped batch left: $(find "$work/batch" -type f)"
# Ended hard (the Task Manager): the file in progress is not under its name.
"$run" "$build/calvex-fetch.exe" --receiver G@USB "$(win "$work/batch")" >/dev/null 2>&1 &
tool=$!
root=$failing downloading "Calvex G" BIG 2 && sleep 1
kill -9 $tool; wait $tool
[ -e "$work/batch/G@USB/BIG.qpr" ] && bad "a download ended hard looks complete"
# On a terminal each download shows a live bar (percent, bytes, rate), redrawn in place, then
# the file's line: script(1) gives the tool a terminal.
script -q -c "'$run' '$build/calvex-fetch.exe' --receiver G@USB '$(win "$work/bar")'" "$work/bar.txt" >/dev/null 2>&1
bars=$(tr '\r' '\n' <"$work/bar.txt" | grep -cE '^  BIG\.qpr \[[#.]{20}\] [0-9]+%  [0-9]+/200000 bytes  [0-9.]+ (bytes|KB|MB)/s')
[ "$bars" -ge 2 ] && grep -qaF $'\r  BIG.qpr [' "$work/bar.txt" && grep -qaF "  fetched     BIG.qpr  195.3 KB" "$work/bar.txt" ||
  bad "no live bar on a terminal ($bars bars): $(tr '\r' '\n' <"$work/bar.txt" | head -5)"
"$run" "$build/calvex-fetch.exe" --watch --brand calvex "$(win "$work/watched")" >"$out.4" 2>/dev/null &
tool=$!
# H unplugged and plugged back while the watch downloads G's BIG: the watch does not see it go,
# and talks to H as it is now when it comes to it.
root=$failing downloading "Calvex G" BIG 4  # after the three batches above
mv "$failing/Calvex H" "$work/"; sleep 1.5; mv "$work/Calvex H" "$failing/"
waitfor "$out.4" "fetched     H@USB\\LOG1.qpr" 30
grep -q "FAILED      H@USB" "$out.4" && bad "H, plugged back while the watch was busy: $(grep 'H@USB' "$out.4")"
waitfor "$out.4" "FAILED      F@USB\\BAD1.qpr" 30 2
log "$failing/Calvex F" BAD2 20000
waitfor "$out.4" "FAILED      F@USB\\BAD2.qpr" 30
# Tried again at the full comparison, a minute after the start.
waitfor "$out.4" "FAILED      F@USB\\BAD1.qpr" 75 3
kill -INT $tool
ends $tool 10; status=$?
[ $status -eq 1 ] || bad "exit code $status of a watch that saw files fail"
[ "$(grep -c "trying once more" "$out.4")" = 1 ] && [ "$(grep -cF 'FAILED      F@USB\BAD1.qpr' "$out.4")" = 3 ] ||
  bad "not tried twice, then once a minute: $(cat "$out.4")"

# --move with a layout: every file is fetched again into its new place and deleted on the
# receiver, and so is one logged while watching. The copies made above are the reference.
"$run" "$build/CalvexDeviceSim.exe" /Quit
sed -i 's/^Rate=.*/Rate=0/' "$root"/*/receiver.ini
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
files=$(find "$root" -type f ! -name receiver.ini | wc -l)
"$run" "$build/calvex-fetch.exe" --watch --move --layout '{brand}\{receiver}' "$(win "$target")" >"$out.3" 2>"$work/err.txt" &
tool=$!
waitfor "$out.3" "  moved       " 60 "$files"
log "$root/Calvex A" MOVED 5000
cp -p "$root/Calvex A/MOVED" "$work/MOVED.sent"
waitfor "$out.3" "  moved       Calvex\\A@USB\\MOVED.qpr  4.9 KB" 30
kill -INT $tool
ends $tool 10; status=$?
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
echo "--- with --move:"; tr -d '\r' <"$out.3"
[ $status -eq 0 ] || bad "exit code $status after a watch with --move"
grep -q "watch ended: $((files + 1)) fetched, 0 failed, $((files + 1)) deleted, " "$out.3" || bad "no summary with the deleted files"
left=$(find "$root" -type f ! -name receiver.ini)
[ -z "$left" ] || bad "left on the receivers: $left"
cmp -s "$work/MOVED.sent" "$target/Calvex/A@USB/MOVED.qpr" || bad "the file logged while watching is not whole"
for copy in "$target"/*@USB/*; do
  case $copy in "$target"/C@USB/*) brand=Brennor ;; *) brand=Calvex ;; esac
  moved=$target/$brand/${copy#$target/}
  cmp -s "$copy" "$moved" && [ "$(stat -c %Y "$copy")" = "$(stat -c %Y "$moved")" ] || bad "$moved is not whole"
done
rm -rf "$work"
[ $fail -eq 0 ] && echo "PASS: every file once, whole, with its time; moved, once proven"
exit $fail
