#!/usr/bin/env bash
# fetch_disks_check.sh BUILD_DIR: calvex-fetch on the disks surveyors write to. A small volume
# (a tmpfs, mounted as a Wine drive) that is full before a download starts and that fills up
# while one runs, in a batch with --move and in a watch that goes on once space is freed; a FAT
# stick's times (the file system's name given through CALVEX_FETCH_FILE_SYSTEM: no FAT volume
# can be mounted here); a deep project folder past 260 characters under a dated layout; the
# target deleted under a batch and under a watch and made again. Guards against a full disk
# that is not named, files deleted from a receiver without a whole copy, partial files left,
# FAT copies fetched and kept for ever, deep targets refused, and a FAILED line per file for
# a target that is gone.
set -u
build=$1
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
work=$(mktemp -d /tmp/calvex-disks-XXXXXX)
root=$work/root target=$work/target small=$work/small
mkdir -p "$root" "$target" "$small"
source "$(dirname "$0")/lib.sh"
fail=0
stamp=1793000000
drive="$prefix/dosdevices/q:"
fetch() { "$run" "$build/calvex-fetch.exe" "$@"; }
lines() { tr -d '\r' <"$1"; }
cleanup() {
  "$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
  rm -f "$drive"; umount "$small" 2>/dev/null; rm -rf "$work"
}
trap cleanup EXIT

# A 3 MiB volume as drive Q:. Mounting needs root (CI runs as root): without it there is no
# full disk to show, and that is a failure, not a pass.
mount -t tmpfs -o size=3m calvex-small "$small" || { echo "FAIL: cannot mount a small volume"; exit 1; }
ln -sfn "$small" "$drive"

receiver "$root/Calvex D" 1 1000-0001 D   # the full disk's receiver
sed -i 's/^Rate=.*/Rate=500000/' "$root/Calvex D/receiver.ini"
log "$root/Calvex D" SMALL1 300000
log "$root/Calvex D" HUGE 4000000
receiver "$root/Calvex G" 1 1000-0003 G   # the deep and the deleted target's
# FAT times: copies already in the target, each as a FAT disk could give it back or not.
t=$root/"Calvex T" n=$root/"Calvex N" fat=$target/fat/T@USB ntfs=$target/ntfs/N@USB
receiver "$t" 1 1000-0002 T
receiver "$n" 1 1000-0004 N
printf '[Fail]\r\nIReceiverFile.Download:FAILS=0x80004005\r\n' >>"$t/receiver.ini"
mkdir -p "$fat" "$ntfs"
copy() {  # copy RECEIVER-DIR NAME INTO SECONDS-OFF [BYTES]: the receiver's file as a copy in INTO
  log "$1" $2 3000
  cp -p "$1/$2" "$3/$2.qpr"
  [ -n "${5:-}" ] && truncate -s "$5" "$3/$2.qpr"
  touch -d "@$(($(stat -c %Y "$1/$2") + $4))" "$3/$2.qpr"
}
copy "$t" ODD "$fat" 1         # FAT keeps even seconds
copy "$t" HOUR "$fat" 3600     # as FAT gives it back across a daylight saving change
copy "$t" FAR "$fat" 3         # more than FAT can explain
copy "$t" SIZE "$fat" 1 2999   # in the window, but not the receiver's size
copy "$t" FAILS "$fat" 3       # more than FAT can explain, and its download fails
copy "$n" ODD "$ntfs" 1
copy "$n" HOUR "$ntfs" 3600
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1

# --- Full before the download: not started, said in sizes; the rest moved; HUGE stays.
fetch --move --receiver D@USB 'Q:\Survey' >"$work/full.txt" 2>&1; status=$?
lines "$work/full.txt"
[ $status -eq 1 ] || bad "exit code $status with a file larger than the disk"
grep -qE '^  FAILED      HUGE\.qpr: not enough space on Q:\\ for HUGE\.qpr \(3\.8 MB needed, [0-9.]+ (MB|KB) free\)$' \
  <(lines "$work/full.txt") || bad "no 'not enough space' line"
grep -qF "  moved       SMALL1.qpr  293.0 KB" "$work/full.txt" || bad "SMALL1 was not moved"
[ -f "$root/Calvex D/HUGE" ] || bad "HUGE was deleted from the receiver"
[ -z "$(find "$small" -name '*.calvex-partial')" ] || bad "a partial file was left"

# --- Full during the download: the disk fills (from elsewhere) while the file is on its way.
full_while() {  # full_while NAME: fills the volume once NAME's download has started
  downloading "Calvex D" "$1" "${2:-1}" && head -c 2400000 /dev/zero >"$small/filler" 2>/dev/null
}
log "$root/Calvex D" MID 1200000
"$run" "$build/calvex-fetch.exe" --move --receiver D@USB 'Q:\Survey' >"$work/mid.txt" 2>&1 &
tool=$!
full_while MID
ends $tool 60; status=$?
lines "$work/mid.txt"
[ $status -eq 1 ] || bad "exit code $status when the disk filled during a download"
grep -qF "  FAILED      MID.qpr: the disk is full (0x80070070)" "$work/mid.txt" || bad "the full disk is not named"
[ -f "$root/Calvex D/MID" ] || bad "MID was deleted from the receiver with the disk full"
[ -z "$(find "$small" -name '*.calvex-partial')" ] || bad "a partial file was left on the full disk"
[ -e "$small/Survey/D@USB/MID.qpr" ] && bad "MID.qpr is there, on a full disk"

# --- A watch on the full disk: HUGE and MID not started (tried twice, then given up); freed, and
# MID2 logged, the disk fills during MID2's download; freed again, MID and MID2 come at the next
# full comparison. HUGE, larger than the whole volume, is never started.
"$run" "$build/calvex-fetch.exe" --watch --receiver D@USB 'Q:\Watched' >"$work/watch.txt" 2>&1 &
tool=$!
waitfor "$work/watch.txt" "trying once more" 60
waitfor "$work/watch.txt" "FAILED      D@USB\\MID.qpr: not enough space on Q:\\ for MID.qpr (1.1 MB needed, " 30
rm -f "$small/filler"
log "$root/Calvex D" MID2 1200000
full_while MID2
waitfor "$work/watch.txt" "FAILED      D@USB\\MID2.qpr: the disk is full (0x80070070)" 30
rm -f "$small/filler"
waitfor "$work/watch.txt" "fetched     D@USB\\MID2.qpr  1.1 MB" 90
waitfor "$work/watch.txt" "fetched     D@USB\\MID.qpr  1.1 MB" 30
kill -INT $tool; ends $tool 10
lines "$work/watch.txt"
for name in MID MID2; do cmp -s "$root/Calvex D/$name" "$small/Watched/D@USB/$name.qpr" || bad "$name is not whole after space was freed"; done
[ -z "$(find "$small" -name '*.calvex-partial')" ] || bad "the watch left a partial file"
rm -f "$drive"; umount "$small"

# --- FAT: a copy within the disk's two seconds, or a daylight saving hour off, is up to date and
# proven for --move; one off by more is fetched again and is no proof for a delete, even when
# its download then fails; its size must match whatever the time. On NTFS a second is a difference.
export CALVEX_FETCH_FILE_SYSTEM=FAT32
fetch --dry-run --receiver T@USB "$(win "$target/fat")" >"$work/fat.txt" 2>&1
fetch --move --receiver T@USB "$(win "$target/fat")" >>"$work/fat.txt" 2>&1; status=$?
unset CALVEX_FETCH_FILE_SYSTEM
lines "$work/fat.txt"
for line in "  up to date  ODD.qpr" "  up to date  HOUR.qpr" "  would fetch FAR.qpr  " "  would fetch SIZE.qpr  " \
            "  deleted     ODD.qpr (already in the target)" "  deleted     HOUR.qpr (already in the target)" \
            "  moved       FAR.qpr  2.9 KB" "  moved       SIZE.qpr  2.9 KB" "  FAILED      FAILS.qpr: "; do
  [ "$(grep -cF -- "$line" "$work/fat.txt")" = 1 ] || bad "on FAT, not once: $line"
done
[ $status -eq 1 ] || bad "exit code $status on FAT with a failed download"
[ "$(ls "$t" | tr '\n' ' ')" = "FAILS receiver.ini " ] || bad "left on the receiver on FAT: $(ls "$t")"
fetch --dry-run --receiver N@USB "$(win "$target/ntfs")" >"$work/ntfs.txt" 2>&1
lines "$work/ntfs.txt"
grep -qF "  would fetch ODD.qpr  " "$work/ntfs.txt" && grep -qF "  would fetch HOUR.qpr  " "$work/ntfs.txt" ||
  bad "on NTFS a copy a second or an hour off counted as up to date"

# --- A deep project folder: target, dated layout and name past 260 characters.
deep=$work/deep/$(printf 'p%.0s' $(seq 1 120))/$(printf 'q%.0s' $(seq 1 100))
log "$root/Calvex G" LOG0001 5000
mkdir -p "$deep"  # the project folder, synced from a cloud drive
fetch --layout '{receiver}\{yyyy}\{doy}' --log "$(win "$deep/fetch.log")" --receiver G@USB "$(win "$deep")" >"$work/deep.txt" 2>&1; status=$?
fetch --move --layout '{receiver}\{yyyy}\{doy}' --receiver G@USB "$(win "$deep")" >>"$work/deep.txt" 2>&1; status=$((status + $?))
lines "$work/deep.txt"
placed=$(find "$deep" -name LOG0001.qpr)
[ $status -eq 0 ] && [ -n "$placed" ] && [ $(($(echo "$(win "$placed")" | wc -c) - 1)) -gt 260 ] || bad "no deep file ($status): $placed"
grep -qF "  deleted     G@USB\\" "$work/deep.txt" && grep -qF "LOG0001.qpr (already in the target)" "$work/deep.txt" || bad "the deep copy was not proven"
grep -qF "  fetched     G@USB\\" "$deep/fetch.log" || bad "no log in the deep target"

# --- The target deleted under a batch with --move (a download on its way) and under a watch:
# one line, nothing failed per file, nothing deleted; the watch goes on once it is made again.
gone=$work/gone
sed -i 's/^Rate=.*/Rate=40000/' "$root/Calvex G/receiver.ini"
for i in 1 2 3; do log "$root/Calvex G" "SLOW$i" 120000; done
mkdir -p "$gone"
"$run" "$build/calvex-fetch.exe" --move --receiver G@USB "$(win "$gone")" >"$work/gone.txt" 2>&1 &
tool=$!
downloading "Calvex G" SLOW1 && rm -rf "$gone"
ends $tool 60; status=$?
lines "$work/gone.txt"
[ $status -eq 1 ] || bad "exit code $status with the target deleted"
[ "$(grep -c "FAILED" "$work/gone.txt")" = 1 ] && grep -qF "  FAILED      the target cannot be reached: $(win "$gone") (0x8007000" "$work/gone.txt" &&
  grep -q "); nothing more is fetched$" <(lines "$work/gone.txt") || bad "not one line for a target that is gone"
[ "$(ls "$root/Calvex G" | grep -c SLOW)" = 3 ] || bad "a file was deleted from the receiver with the target gone"
mkdir -p "$gone"
"$run" "$build/calvex-fetch.exe" --watch --receiver G@USB "$(win "$gone")" >"$work/gonewatch.txt" 2>&1 &
tool=$!
waitfor "$work/gonewatch.txt" "fetched     G@USB\\SLOW3.qpr" 60
rm -rf "$gone"
log "$root/Calvex G" AFTER 1000
waitfor "$work/gonewatch.txt" "the target cannot be reached: $(win "$gone") (0x8007000" 30
sleep 3; mkdir -p "$gone"
waitfor "$work/gonewatch.txt" "the target is back: $(win "$gone")" 75
waitfor "$work/gonewatch.txt" "fetched     G@USB\\AFTER.qpr" 60
waitfor "$work/gonewatch.txt" "fetched     G@USB\\SLOW3.qpr" 60 2
kill -INT $tool; ends $tool 10
lines "$work/gonewatch.txt"
grep -q "FAILED" "$work/gonewatch.txt" && bad "a FAILED line while the target was gone"
[ "$(grep -c "the target cannot be reached" "$work/gonewatch.txt")" = 1 ] || bad "the target's loss said more than once"
for name in SLOW1 SLOW2 SLOW3 AFTER; do
  cmp -s "$root/Calvex G/$name" "$gone/G@USB/$name.qpr" || bad "$name is not whole in the target made again"
done
[ $fail -eq 0 ] && echo "PASS: full disks named, FAT times kept, deep targets written, a lost target said once"
exit $fail
