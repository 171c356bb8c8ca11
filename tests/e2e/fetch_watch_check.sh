#!/usr/bin/env bash
# fetch_watch_check.sh BUILD_DIR: calvex-fetch --watch against the simulator's live folder
# events. A receiver plugged in, a file logged on another, a burst of files, a receiver
# unplugged while a file of it downloads and plugged back with a file logged meanwhile, then a
# real Ctrl+C during a download. Guards against files fetched twice or not at all, partial or
# mistimed files, lost notifications and a tool that does not end.
set -u
build=$1
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
export TZ=UTC  # the device's local times are compared with the files' times below
work=$(mktemp -d /tmp/calvex-watch-XXXXXX)
root=$work/root away=$work/away target=$work/target out=$work/out.txt
mkdir -p "$root" "$away" "$target"
win() { echo "Z:$1" | sed 's|/|\\|g'; }
fail=0
bad() { fail=1; echo "FAIL: $*"; }
waitfor() {  # waitfor FILE TEXT SECONDS
  for _ in $(seq 1 $(($3 * 10))); do grep -qF -- "$2" "$1" 2>/dev/null && return 0; sleep 0.1; done
  bad "no \"$2\" in $(basename "$1") within $3 s"; return 1
}
ends() {  # ends PID SECONDS: its exit code; killed when it runs longer
  for _ in $(seq 1 $(($2 * 10))); do kill -0 $1 2>/dev/null || break; sleep 0.1; done
  kill -0 $1 2>/dev/null && { bad "still running $2 s on"; kill -9 $1; }
  wait $1
}
simlog() { cat "$prefix"/drive_c/users/*/Temp/CalvexDeviceSim.log 2>/dev/null | grep -F "$(win "$root")"; }
downloading() {  # downloading RECEIVER FILE: until the simulator has started sending it
  for _ in $(seq 1 300); do simlog | grep -qF "$(win "$root/$1/$2")\" started" && return 0; sleep 0.1; done
  bad "the download of $1/$2 never started"; return 1
}
receiver() {  # receiver DIR BRAND SERIAL MODEL: 40,000 bytes a second
  mkdir -p "$1"
  printf '[Receiver]\r\nBrand=%s\r\nLabel=Test\r\nSerialNumber=%s\r\nModel=%s\r\nPortType=2\r\n[Transfer]\r\nRate=40000\r\n' \
    "$2" "$3" "$4" >"$1/receiver.ini"
}
stamp=1795000000
log() {  # log DIR NAME BYTES: a file the receiver logs, with a time of its own, there at once
  stamp=$((stamp + 61))
  head -c "$3" /dev/urandom >"$work/$2.new"
  touch -d "@$stamp" "$work/$2.new"
  mv "$work/$2.new" "$1/$2"
}

receiver "$root/Calvex A" 1 1000-0001 A
log "$root/Calvex A" LOG0001 3000
receiver "$root/Calvex B" 1 1000-0002 B
log "$root/Calvex B" LOG0001 2000
receiver "$away/Brennor C" 2 2000-0003 C
log "$away/Brennor C" LOG0001 4000
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
"$run" "$build/calvex-fetch.exe" --watch "$(win "$target")" >"$out" 2>"$work/err.txt" &
tool=$!

waitfor "$out" "B@USB (1000-0002!B!USB) -> " 60
waitfor "$out" "fetched     B@USB\\LOG0001" 30
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
mv "$away/Calvex B" "$root/"
waitfor "$out" "B@USB (1000-0002!B!USB) plugged in -> " 30
waitfor "$out" "fetched     B@USB\\LOG0002" 30
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

# Every file the receivers hold, once, whole, with its time, and nothing else.
expected=0
for file in "$root"/*/*; do
  name=$(basename "$file") dir=$(basename "$(dirname "$file")")
  [ "$name" = receiver.ini ] && continue
  expected=$((expected + 1))
  got=$(ls "$target/${dir#* }@USB/$name"* 2>/dev/null | head -1)
  if [ -z "$got" ]; then bad "$dir/$name was not fetched"; continue; fi
  cmp -s "$file" "$got" || bad "$dir/$name differs"
  [ "$(stat -c %Y "$file")" = "$(stat -c %Y "$got")" ] || bad "$dir/$name has not the device's time"
  count=$(grep -cE "  fetched     ${dir#* }@USB\\\\$name(\.qpr)?  " "$out")
  [ "$count" = 1 ] || bad "$dir/$name fetched $count times"
done
[ "$(find "$target" -type f | wc -l)" = $expected ] || bad "other files were left: $(find "$target" -type f)"
rm -rf "$work"
[ $fail -eq 0 ] && echo "PASS: every file once, whole, with its time"
exit $fail
