#!/usr/bin/env bash
# soak-watch.sh [BUILD_DIR] [CYCLES] [FILES] [SECONDS]: a long day of the windowless watch,
# compressed. Against the simulator in a Wine prefix of its own (BUILD_DIR/soak-prefix), six
# receivers are unplugged and plugged in CYCLES times (300) while FILES files (1,000) are logged
# over about SECONDS (600), and the device manager quits twice on the way (a service restart).
# Then: every file once, whole, with its time, nothing partial; and the watch's handles and
# threads (bench/ProcessSampler.cpp) and its private memory (RssAnon, as Linux sees the Wine
# process), sampled every 5 s, flat after the warm-up (within 10%; handles within each stretch
# between restarts, their steps at a restart set beside bench/DeadServerBaseline.cpp's).
# Not part of ctest: it takes 10 to 15 minutes. Figures: bench/README.md.
set -u
here=$(cd "$(dirname "$0")/.." && pwd)
build=$(cd "${1:-$here/build}" && pwd)
cycles=${2:-300} files=${3:-1000} seconds=${4:-600}
if [ -z "${DISPLAY:-}" ]; then exec xvfb-run -a -s "-screen 0 1024x768x24" "$0" "$build" "$cycles" "$files" "$seconds"; fi
export CALVEX_WINEPREFIX=$build/soak-prefix
run="$build/wine-run"
"$here/tests/wine/prepare-prefix.sh" "$build" "$build/CalvexReceiversShellExt.dll" "$build/CalvexDeviceSim.exe" >/dev/null
work=$(mktemp -d /tmp/calvex-soak-XXXXXX)
root=$work/root away=$work/away target=$work/target wlog=$work/watch.log samples=$work/samples.txt memory=$work/memory.txt
mkdir -p "$root" "$away" "$target"
win() { echo "Z:$1" | sed 's|/|\\|g'; }
receivers=6
for i in $(seq 1 $receivers); do
  mkdir -p "$root/Calvex R$i"
  printf '[Receiver]\r\nBrand=1\r\nLabel=Soak\r\nSerialNumber=900-%04d\r\nModel=R%d\r\nPortType=2\r\n' $i $i \
    >"$root/Calvex R$i/receiver.ini"
done
stamp=1790000000 logged=0
log() {  # log DIR: one more file, 500 to 8,000 bytes, a time of its own
  logged=$((logged + 1)) stamp=$((stamp + 37))
  local name
  name=$(printf 'F%05d' $logged)
  head -c $((500 + RANDOM % 7500)) /dev/urandom >"$work/$name.new"
  touch -d "@$stamp" "$work/$name.new"
  mv "$work/$name.new" "$1/$name"
}

"$run" "$build/CalvexDeviceSim.exe" /Quit
# What Wine's COM itself keeps of a device manager that restarts under a held proxy (the
# extension not involved): the floor for the watch's steps at each restart below.
baseline=""
for calls in 1 10; do
  baseline+="$("$run" "$build/bench/calvex_dead_server_baseline.exe" "$(win "$build/CalvexDeviceSim.exe")" 5 $calls |
    tr -d '\r' | sed -n 's/^handles left per restart, with \(.*\)/\1/p'); "
done
echo "Wine's own, per restart of the device manager under one proxy: $baseline"
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1
"$run" "$build/calvex-fetchw.exe" --watch --log "$(win "$wlog")" "$(win "$target")" >/dev/null 2>&1 &
tool=$!
"$run" "$build/bench/calvex_process_sampler.exe" calvex-fetchw.exe 5000 --types >"$samples" &
sampler=$!
started=$(date +%s)
(  # the Wine process's private memory, as Linux counts it
  while kill -0 $tool 2>/dev/null; do
    pid=$(pgrep -f "calvex-fetchw.exe --watch --log .*$(basename "$work")" | head -1)
    [ -n "$pid" ] && echo "$(( $(date +%s) - started )) $(awk '/^RssAnon:/{print $2}' /proc/$pid/status 2>/dev/null)"
    sleep 5
  done >"$memory"
) &
interval_ms=$((seconds * 1000 / cycles)) restarts=""
for c in $(seq 0 $((cycles - 1))); do
  due=$((files * (c + 1) / cycles - files * c / cycles))
  i=$((c % receivers + 1))
  mv "$root/Calvex R$i" "$away/"
  # Half the files come with a receiver plugged back in, half are logged while it is plugged.
  for _ in $(seq 1 $(((due + 1) / 2))); do log "$away/Calvex R$i"; done
  sleep "$(awk "BEGIN{print $interval_ms/2000}")"
  mv "$away/Calvex R$i" "$root/"
  for _ in $(seq 1 $((due / 2))); do log "$root/Calvex R$(((c + 3) % receivers + 1))"; done
  if [ $c = $((cycles / 3)) ] || [ $c = $((cycles * 2 / 3)) ]; then
    echo "cycle $c: the device manager quits"; "$run" "$build/CalvexDeviceSim.exe" /Quit
    restarts+="$(( $(date +%s) - started )) "
  fi
  sleep "$(awk "BEGIN{print $interval_ms/2000}")"
done
schedule_end=$(( $(date +%s) - started ))
echo "schedule done in $schedule_end s: $cycles cycles, $logged files; waiting for the watch to catch up"
for _ in $(seq 1 1200); do
  [ "$(find "$target" -type f ! -name '*.calvex-partial' | wc -l)" -ge "$logged" ] && break
  sleep 1
done
caught_up=$(( $(date +%s) - started ))
"$run" wineboot --end-session
for _ in $(seq 1 200); do kill -0 $tool 2>/dev/null || break; sleep 0.1; done
wait $tool; status=$?
wait $sampler
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1

fail=0
bad() { fail=1; echo "FAIL: $*"; }
[ $status -eq 0 ] || bad "the watch ended with $status"
tr -d '\r' <"$wlog" >"$work/watch.txt"
for file in "$root"/*/F*; do
  name=$(basename "$file") dir=$(basename "$(dirname "$file")")
  got="$target/${dir#* }@USB/$name.qpr"
  [ -f "$got" ] || got="$target/${dir#* }@USB/$name"
  if [ ! -f "$got" ]; then bad "$dir/$name was not fetched"; continue; fi
  cmp -s "$file" "$got" || bad "$dir/$name differs"
  [ "$(stat -c %Y "$file")" = "$(stat -c %Y "$got")" ] || bad "$dir/$name has not the device's time"
done
twice=$(grep -oE '  fetched     R[0-9]@USB\\F[0-9]+' "$work/watch.txt" | sort | uniq -d | head -5)
[ -z "$twice" ] || bad "fetched twice: $twice"
[ -z "$(find "$target" -name '*.calvex-partial')" ] || bad "partial files left: $(find "$target" -name '*.calvex-partial')"
[ "$(find "$target" -type f | wc -l)" = "$logged" ] || bad "$(find "$target" -type f | wc -l) files in the target for $logged logged"

echo "--- the watch: $(grep -c '  fetched     ' "$work/watch.txt") fetched, $(grep -c ' plugged in -> ' "$work/watch.txt") plug-ins," \
  "$(grep -c 'unplugged' "$work/watch.txt") unplugs, $(grep -c 'the device manager is back' "$work/watch.txt") reconnections," \
  "$(grep -c '  FAILED' "$work/watch.txt") failed lines, $(grep -c 'discarded' "$work/watch.txt") discarded;" \
  "caught up $caught_up s after the start"
grep -F 'watch ended:' "$work/watch.txt"
# Flat: for threads and private memory, the median of the minute after a 90 s warm-up against
# the median of the schedule's last minute, within 10%. Handles step up at each restart of the
# device manager by what Wine's COM keeps of the dead server (the baseline above), so they are
# judged the same way within each stretch between restarts, and the steps are reported.
python3 - "$samples" "$memory" "$schedule_end" $restarts <<'EOF' || fail=1
import statistics, sys
rows = {}  # by 5 s slot: [seconds, handles, threads, private KB]
for path, first in ((sys.argv[1], 1), (sys.argv[2], 3)):
    for line in open(path).read().split("\n"):
        fields = line.split()
        if len(fields) > 1 and all(f.isdigit() for f in fields):
            slot = int(fields[0]) // 5 * 5
            row = rows.setdefault(slot, [slot, 0, 0, 0])
            for i, value in enumerate(fields[1:]):
                row[first + i] = int(value)
rows = [r for _, r in sorted(rows.items()) if all(r[1:])]
end, restarts = int(sys.argv[3]), [int(t) for t in sys.argv[4:]]
if end < 210:
    sys.exit(f"{len(rows)} samples over {end} s: too short to judge flatness")


def median(col, start, stop):
    values = [r[col] for r in rows if start <= r[0] < stop]
    return statistics.median(values) if values else None


def judge(name, col, start, stop, span):
    a, b = median(col, start, start + span), median(col, stop - span, stop)
    if a is None or b is None:
        print(f"{name:11} no samples in {start}-{stop} s")
        return False
    growth = (b - a) / a * 100
    print(f"{name:11} {a:10.0f} -> {b:10.0f}  ({growth:+.1f}%) over {start}-{stop} s")
    return growth <= 10


print(f"{len(rows)} samples over {rows[-1][0]} s; warm-up 90 s; restarts at {restarts} s")
ok = judge("threads", 2, 90, end, 60)
ok = judge("private KB", 3, 90, end, 60) and ok
for i, (start, stop) in enumerate(zip([90] + [t + 30 for t in restarts], restarts + [end])):
    if stop - start >= 90:
        ok = judge(f"handles {i + 1}", 1, start, stop, 30) and ok
for t in restarts:
    before, after = median(1, t - 30, t), median(1, t + 30, t + 60)
    if before is not None and after is not None:
        print(f"handles at the restart at {t} s: {before:.0f} -> {after:.0f} ({after - before:+.0f})")
sys.exit(0 if ok else 1)
EOF
echo "samples: $samples; log: $wlog"
[ $fail -eq 0 ] && echo "PASS: $logged files once, whole, with their times, through $cycles plug cycles and two restarts"
exit $fail
