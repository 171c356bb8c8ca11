#!/usr/bin/env bash
# fetch_move_kill_check.sh BUILD_DIR: calvex-fetch --move of 62 files from three receivers,
# four of them 1.6 MB (written in two pieces), killed hard 27 times until a last run completes it:
# - at the move's named points, through the tool's test seam (CALVEX_FETCH_KILL_AT,
#   tools/common/KillPoint.h): a file half written, written but not renamed, renamed but not
#   deleted, about to be deleted, deleted but not reported;
# - by kill -9 of the Wine process at spread moments of a download, large and small;
# - the device manager killed (taskkill /F) during a download, large and small, and ending
#   itself in the middle of a delete; the Wine session is restarted after each, as Wine keeps
#   a killed local server registered until then. The tool must end by itself, with exit code 1.
# After every kill each file is whole with the receiver's time in the target, or unchanged on
# its receiver, or both, never neither; nothing under a final name is less than the whole
# file; at a named point the file it names is exactly where the move has got to. The points
# reached are printed as a table: the point, the tool's exit code, the file there and where it
# is, the files whole in the target (and how many of those are still on their receiver), the
# files on the receivers and any partial file.
set -u
build=$(cd "$1" && pwd)  # absolute: the Wine session is ended through WINEPREFIX
run="$build/wine-run"
prefix=${CALVEX_WINEPREFIX:-$build/wineprefix}
work=$(mktemp -d /tmp/calvex-kill-XXXXXX)
root=$work/root source=$work/source target=$work/target
mkdir -p "$root" "$target"
source "$(dirname "$0")/lib.sh"
fail=0
stamp=1794000000

# A at full speed; B at 400,000 bytes a second, so that its two large files download for 4 s
# (long enough to be killed in the middle); C a Brennor receiver, whose files show no ".qpr".
receiver "$root/Calvex A" 1 1000-0001 A 0
receiver "$root/Calvex B" 1 1000-0002 B 400000
receiver "$root/Brennor C" 2 2000-0003 C 0
log "$root/Calvex A" BIG0001 1600000
log "$root/Calvex A" BIG0002 1600000
for i in $(seq -w 1 24); do log "$root/Calvex A" "LOG00$i" $((RANDOM % 20000 + 1)); done
for i in $(seq -w 1 20); do log "$root/Calvex B" "LOG00$i" $(case $i in 10 | 16) echo 1600000 ;; *) echo $((RANDOM % 20000 + 1)) ;; esac); done
for i in $(seq -w 1 16); do log "$root/Brennor C" "LOG00$i" $((RANDOM % 20000 + 1)); done
cp -a "$root" "$source"
files=$(find "$source" -type f ! -name receiver.ini | wc -l)

restart_session() { WINEPREFIX="$prefix" wineserver -k 2>/dev/null; WINEPREFIX="$prefix" wineserver -w 2>/dev/null; }
"$run" "$build/CalvexDeviceSim.exe" /Quit
"$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Root /d "$(win "$root")" /f >/dev/null 2>&1

# Where the move puts a receiver's file: TARGET\<model>@USB\<name>, ".qpr" added for Calvex.
final() { case $1 in Calvex*) echo "$target/${1#* }@USB/$2.qpr" ;; *) echo "$target/${1#* }@USB/$2" ;; esac; }
same() { cmp -s "$1" "$2" && [ "$(stat -c %Y "$1")" = "$(stat -c %Y "$2")" ]; }

# check ROW POINT AT: every file whole in the target, unchanged on its receiver, or both; AT (a
# receiver folder and name, or empty) is where the named POINT expects it. Adds the table's row.
table=""
check() {
  local row=$1 point=$2 at=$3 whole=0 left=0 both=0 file dir name placed on here="" partials
  for file in "$source"/*/*; do
    name=$(basename "$file") dir=$(basename "$(dirname "$file")")
    [ "$name" = receiver.ini ] && continue
    placed=0 on=0
    if [ -e "$(final "$dir" "$name")" ]; then
      same "$file" "$(final "$dir" "$name")" && placed=1 ||
        bad "$row: $dir/$name is under its final name but not whole with its time"
    fi
    if [ -e "$root/$dir/$name" ]; then
      same "$file" "$root/$dir/$name" && on=1 || bad "$row: $dir/$name changed on the receiver"
    fi
    [ $placed = 0 ] && [ $on = 0 ] && bad "$row: $dir/$name is lost: neither in the target nor on the receiver"
    whole=$((whole + placed)) left=$((left + on)) both=$((both + placed * on))
    [ "$dir/$name" = "$at" ] && here="$([ $placed = 1 ] && echo target)$([ $placed$on = 11 ] && echo +)$([ $on = 1 ] && echo receiver)"
  done
  partials=$(cd "$target" && find . -name '*.calvex-partial' -printf '%P (%s bytes) ' 2>/dev/null)
  [ "$(find "$target" -type f ! -name '*.calvex-partial' | wc -l)" = $whole ] ||
    bad "$row: other files in the target: $(find "$target" -type f ! -name '*.calvex-partial')"
  if [ -n "$at" ]; then
    local partial=$(final "${at%/*}" "${at#*/}").calvex-partial want=""
    case ${point%% *} in
      partway) want=receiver; [ -e "$partial" ] && [ "$(stat -c %s "$partial")" -lt "$(stat -c %s "$source/$at")" ] ||
                 bad "$row: no partial file of $at half written" ;;
      written) want=receiver; cmp -s "$partial" "$source/$at" || bad "$row: the partial file of $at is not whole" ;;
      renamed | deleting) want=target+receiver ;;
      deleted) want=target ;;
    esac
    [ -z "$want" ] || [ "$here" = "$want" ] || bad "$row: at $point $at is in ${here:-neither}, not in $want"
  fi
  table+=$(printf '%-4s %-31s %-4s %-19s %-15s %-22s %s' "$row" "$point" "$status" "${at:--}" "${here:--}" \
    "$whole ($both still left)" "$left${partials:+, partial: $partials}")$'\n'
}

# The receiver folder and name of the file a kill line names: "...\A@USB\LOG0003.qpr", or a bare
# name with the receiver being fetched from the tool's output.
named() {
  local what=${1//\//\\} folder name dir base
  what=${what%.calvex-partial}
  case $what in *\\*) folder=${what%\\*} folder=${folder##*\\} name=${what##*\\} ;;
    *) folder=$(tr -d '\r' <"$out" | grep -o ' -> .*' | tail -1) folder=${folder##*\\} name=$what ;; esac
  name=${name%.qpr}
  for dir in "$source"/*; do base=${dir##*/}; [ "${base#* }@USB" = "$folder" ] && echo "$base/$name"; done
}

row=0 status=0
start() {  # start [VAR=VALUE...]: the move in the background; its output in $out and $err
  row=$((row + 1)) out=$work/out.$row err=$work/err.$row
  env "$@" "$run" "$build/calvex-fetch.exe" --move "$(win "$target")" >"$out" 2>"$err" &
  tool=$!
}
started() { simlog | grep -cF "$(win "$root/$1/$2")\" started"; }
sim_exits() { cat "$prefix"/drive_c/users/*/Temp/CalvexDeviceSim.log | grep -cF "exiting abruptly: IReceiverFile.Delete on \"$1\""; }
simpid() { simlog | grep -o '\[[0-9]*\] server started' | tail -1 | tr -dc 0-9; }

kill_at() {  # kill_at POINT N: the tool ends itself at the N-th pass of POINT
  start CALVEX_FETCH_KILL_AT="$1:$2"
  { ends $tool 120; } 2>/dev/null; status=$?
  local line=$(tr -d '\r' <"$err" | grep "^calvex-fetch: killed at $1 $2: ")
  [ $status -eq 9 ] && [ -n "$line" ] || bad "row $row: $1 $2 was not reached (exit code $status)"
  local at=""
  [ $1 = partway ] && at=$(cd "$target" && find . -name '*.calvex-partial' -printf '%T@ %P\n' | sort -n | tail -1 | cut -d' ' -f2-)
  check $row "$1 $2" "$(named "${at:-${line#*: killed at $1 $2: }}")"
}
left() { ls "$root/$1" | grep -vx receiver.ini | sed -n "${2}p"; }  # left RECEIVER K: its K-th file still there
in_download() {  # in_download BEFORE RECEIVER FILE: true once its download has started again
  local i
  for i in $(seq 1 600); do
    [ "$(started "$2" "$3")" -gt "$1" ] && return 0
    kill -0 $tool 2>/dev/null || break
    sleep 0.1
  done
  bad "row $row: the download of $2/$3 never started"; return 1
}
kill_downloading() {  # kill_downloading RECEIVER FILE [SECONDS]: kill -9 SECONDS (0.5) after its download started
  local before=$(started "$1" "$2")
  start
  in_download "$before" "$1" "$2" && sleep "${3:-0.5}"
  kill -9 $tool 2>/dev/null
  { ends $tool 20; } 2>/dev/null; status=$?
  [ $status -eq 137 ] || bad "row $row: the tool ended (exit code $status) before it was killed"
  check $row "kill -9 ${3:-0.5} s into its download" "$1/$2"
}
# The device manager dies: the tool must end by itself, in time, saying that files failed.
dm_ended() {  # dm_ended LABEL FILE
  ends $tool 120; status=$?
  [ $status -eq 1 ] || bad "row $row: the tool ended with $status when the device manager died"
  grep -q "^  FAILED  " "$out" || bad "row $row: no FAILED line when the device manager died"
  check $row "$1" "$2"
  restart_session
}
dm_kill_downloading() {  # dm_kill_downloading RECEIVER FILE: taskkill /F once its download started
  local before=$(started "$1" "$2")
  start
  in_download "$before" "$1" "$2" && "$run" taskkill /F /PID "$(simpid)" >/dev/null 2>&1
  dm_ended "server killed in its download" "$1/$2"
}
dm_exit_deleting() {  # dm_exit_deleting RECEIVER FILE: the server ends itself on that file's Delete
  local ini="$root/$1/receiver.ini"
  cp "$ini" "$work/ini"
  printf '[Exit]\r\nIReceiverFile.Delete:%s=1\r\n' "$2" >>"$ini"
  local exits=$(sim_exits "$2")
  start
  dm_ended "server ends in its delete" "$1/$2"
  [ "$(sim_exits "$2")" -gt "$exits" ] || bad "row $row: the server did not end in $2's delete"
  cp "$work/ini" "$ini"
}

# In the order the files go. A timed kill lands a file or two after its own; the files it
# waits for are taken from what is left, so that the schedule holds whatever they hit.
kill_at partway 1                                  # A's BIG0001 half written
kill_at written 1                                  # whole, not renamed
kill_at renamed 1                                  # in place, not yet deleted
kill_at deleting 1                                 # already in the target, about to be deleted
kill_at deleted 1                                  # deleted, not reported
kill_at partway 1                                  # A's BIG0002
kill_downloading "Calvex A" BIG0002 0.1            # in the middle of its download
kill_at deleted 2
kill_downloading "Calvex A" "$(left "Calvex A" 3)" 0.2
kill_at written 3
kill_at renamed 2
kill_at deleting 3
kill_at deleted 4
kill_downloading "Calvex A" "$(left "Calvex A" 2)" 0.1
dm_kill_downloading "Calvex A" "$(left "Calvex A" 2)"
kill_at written 2
kill_at deleted 3
dm_kill_downloading "Calvex B" LOG0010             # 1.6 MB at 400,000 bytes a second
kill_at partway 1                                  # B's LOG0010
kill_downloading "Calvex B" LOG0016 2
dm_exit_deleting "Calvex B" LOG0018
kill_at renamed 3
kill_at deleting 2
kill_downloading "Brennor C" "$(left "Brennor C" 3)" 0.2
kill_at written 2
kill_at deleted 3
kill_downloading "Brennor C" "$(left "Brennor C" 2)" 0.3

# The last run completes the move: every file whole in the target, the receivers empty.
start
ends $tool 300; status=$?
[ $status -eq 0 ] || bad "the last run ended with $status: $(cat "$out" "$err")"
check last "complete" ""
[ -z "$(find "$root" -type f ! -name receiver.ini)" ] || bad "left on the receivers: $(find "$root" -type f ! -name receiver.ini)"
[ -z "$(find "$target" -name '*.calvex-partial')" ] || bad "partial files left: $(find "$target" -name '*.calvex-partial')"

printf '%-4s %-31s %-4s %-19s %-15s %-22s %s\n' row point exit file "is in" "whole in target" "on the receivers"
printf '%s' "$table"
"$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Root /f >/dev/null 2>&1
"$run" "$build/CalvexDeviceSim.exe" /Quit
[ $fail -eq 0 ] && rm -rf "$work"
[ $fail -eq 0 ] && echo "PASS: a move of $files files killed at $((row - 1)) points lost nothing and completed"
exit $fail
