#!/usr/bin/env bash
# explorer-walk.sh BUILD_DIR [options]: a person's walk through Wine's own Explorer.
# Opens My Computer, then each brand folder and one of its receivers, by keyboard as a user
# does (type-ahead and Enter); at each level reads what our view's list control shows
# (view_probe) and compares it with the namespace as calvex-shell lists it through the shell.
# In the first brand it widens two columns with the mouse and checks that the receiver's view
# takes the widths over, and it copies a receiver's files out through the view's menu, checking
# each one's bytes and time against the receiver's own file. Exits non-zero on any failure.
#   --install none|regsvr32|msi  how the product gets into the prefix: as it is (default), the
#                                tests' regsvr32 preparation, or a fresh prefix and the MSI
#                                with the simulator feature
#   --prefix DIR                 the Wine prefix (default: the tests' prefix)
#   --shots DIR                  screenshots (default BUILD_DIR/shots)
#   --rate BYTES                 the simulator's download rate while copying, so that the
#                                progress dialog stays up for its screenshot
#   --report FILE                the walk's report: screenshots and each file copied
#   --brands "calvex brennor"    the brand folders to walk (default both)
set -u
build=$1; shift
install=none prefix="" shots=$build/shots rate="" report=/dev/null brands="calvex brennor"
while [ $# -gt 0 ]; do
  case $1 in
    --install) install=$2 ;;
    --prefix) prefix=$2 ;;
    --shots) shots=$2 ;;
    --rate) rate=$2 ;;
    --report) report=$2 ;;
    --brands) brands=$2 ;;
    *) echo "unknown option $1" >&2; exit 2 ;;
  esac
  shift 2
done
here=$(cd "$(dirname "$0")/.." && pwd)
mkdir -p "$shots"
rm -f "$shots"/*.png  # a picture of an earlier walk must not pass for this one's
run="$build/wine-run"
[ -n "$prefix" ] && export CALVEX_WINEPREFIX=$prefix
export WINEPREFIX=${prefix:-$(sed -n 's/^export WINEPREFIX="${CALVEX_WINEPREFIX:-\(.*\)}"$/\1/p' "$run")}
export WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml=" WINEARCH=win64
export TZ=${CALVEX_TEST_TZ:-America/New_York}  # as wine-run: the receivers' local times are checked below
pass=0 fail=0
ok() { pass=$((pass + 1)); }
bad() { fail=$((fail + 1)); echo "FAIL: $*"; }
say() { echo "$*" | tee -a "$report"; }
: >"$report"

samples=$here/sample-receivers
case $install in
  none) ;;
  regsvr32) "$here/tests/wine/prepare-prefix.sh" "$build" "$build/CalvexReceiversShellExt.dll" \
              "$build/CalvexDeviceSim.exe" >/dev/null || { echo "FAIL: regsvr32 registration"; exit 1; } ;;
  msi)
    "$here/tests/wine/prepare-prefix.sh" --fresh "$build" >/dev/null || { echo "FAIL: no fresh prefix"; exit 1; }
    "$run" msiexec /i "$(winepath -w "$build/CalvexReceiversShellExt.msi" 2>/dev/null)" /qn ADDLOCAL=ALL
    code=$?
    [ $code -eq 0 ] || { echo "FAIL: msiexec /i ended with $code"; exit 1; }
    say "Installed CalvexReceiversShellExt.msi (with the simulated device manager) into $WINEPREFIX"
    samples="$WINEPREFIX/drive_c/Program Files/Calvex/Receivers Shell Extension/sample-receivers" ;;
  *) echo "unknown install $install" >&2; exit 2 ;;
esac
if [ -n "$rate" ]; then
  "$run" reg add 'HKCU\Software\Calvex\DeviceSim' /v Rate /t REG_DWORD /d "$rate" /f >/dev/null 2>&1
fi

tree=$("$run" "$build/calvex-shell.exe" tree 2>/dev/null | tr -d '\r')
probe() { "$run" "$build/view_probe.exe" 2>/dev/null | tr -d '\r'; }

# Waits until the view shows the wanted column titles (Explorer needs a moment per level).
wait_columns() {
  local want=$1 i
  for i in $(seq 1 40); do
    view=$(probe)
    grep -qxF "columns: $want" <<<"$view" && return 0
    sleep 0.5
  done
  return 1
}

# Types a name's first letters into the focused list and opens the item with Enter.
open_item() {
  xdotool type --delay 80 "$1"
  xdotool key Return
}

# The window Wine's Explorer opens has no frame here: it sits at the top left of the screen.
click_list() { xdotool mousemove "$1" "$2" click 1; sleep 0.5; }
# Drags a header divider of our list from x to x2, as a user widening a column.
drag_divider() {
  xdotool mousemove "$1" 92 sleep 0.3 mousedown 1 sleep 0.3 mousemove $((($1 + $2) / 2)) 92 sleep 0.2 \
    mousemove "$2" 92 sleep 0.3 mouseup 1
  sleep 0.5
}

"$run" explorer >/dev/null 2>&1 &
explorer=$!
cleanup() {
  kill "$explorer" 2>/dev/null; "$run" taskkill /f /im explorer.exe >/dev/null 2>&1
  [ "$install" = msi ] && wineserver -k  # the prefix is this walk's own
}
trap cleanup EXIT
for i in $(seq 1 60); do xdotool search --name '^Desktop$' >/dev/null 2>&1 && break; sleep 0.5; done
sleep 2

# One brand folder: open it from My Computer, check its receivers, open one, check its files.
walk_brand() {
  local brand=$1 root=$2 receiver=$3 shot=$4
  click_list 400 300
  open_item "$brand"
  if ! wait_columns "Name|Serial number|Model|Port"; then
    bad "$brand: no receivers view"; return
  fi
  ok
  if [ -n "$widen" ]; then
    # Name from 100 to 150, then "Serial number" from 100 to 130: the widths every column but
    # "Time" and the "Time" column get from now on, in every view of the process.
    drag_divider 257 307
    drag_divider 407 437
    view=$(probe)
    grep -qxF "widths: 150|130|100|100" <<<"$view" && ok || bad "$brand: dragged widths: $(grep '^widths' <<<"$view")"
  fi
  import -window root "$shots/$shot-receivers.png"
  # Every receiver the shell lists under this root is a row: display name, serial, model, port.
  local section
  section=$(sed -n "/$root/,/^::/p" <<<"$tree" | grep '^  \[+\]')
  while IFS= read -r line; do
    local display key serial model port
    display=$(sed 's/^  \[+\] \(.*\)    Calvex Receivers\\.*$/\1/' <<<"$line")
    key=$(sed 's/^.*Calvex Receivers\\//' <<<"$line")
    IFS='!' read -r serial model port <<<"$key"
    model=${model//#//}
    if grep -qxF "row: $display|$serial|$model|$port" <<<"$view"; then ok; else bad "$brand: no row $display|$serial|$model|$port"; fi
  done <<<"$section"
  local rows
  rows=$(grep -c '^row: ' <<<"$view")
  [ "$rows" -eq "$(grep -c . <<<"$section")" ] && ok || bad "$brand: $rows rows for $(grep -c . <<<"$section") receivers"

  click_list 400 400
  open_item "${receiver:0:3}"
  if ! wait_columns "Name|Size|Time"; then
    bad "$brand: no files view for $receiver"; return
  fi
  ok
  sleep 1
  view=$(probe)
  if [ -n "$widen" ]; then
    grep -qxF "widths: 150|150|130" <<<"$view" && ok || bad "$brand: files level widths: $(grep '^widths' <<<"$view")"
  fi
  import -window root "$shots/$shot-files.png"
  local files
  files=$(sed -n "/$root/,/^::/p" <<<"$tree" | sed -n "/\[+\] $receiver/,/\[+\]/p" | grep '^     -  ' |
    sed 's/^     -  \(.*\)    Calvex Receivers\\.*$/\1/')
  while IFS= read -r name; do
    [ -z "$name" ] && continue
    if grep -qE "^row: $(sed 's/[][\.*^$/]/\\&/g' <<<"$name")\|[0-9.]+ (bytes|KB|MB|GB)\|[0-9]" <<<"$view"; then ok
    else bad "$brand: no row for $name with a size and a time"; fi
  done <<<"$files"
  grep -q "Invalid DateTime" <<<"$view" && bad "$brand: a time did not convert" || ok
  [ -n "$copy_from" ] && copy_all "$copy_from"
  # Back to My Computer: the toolbar's Up button, twice.
  xdotool mousemove 81 40 click 1; sleep 1.5
  xdotool mousemove 81 40 click 1; sleep 1.5
}

# Waits for the download's progress dialog and photographs it while it runs.
progress_shot() {
  local i
  for i in $(seq 1 50); do
    if xdotool search --name '^File Download$' >/dev/null 2>&1; then
      sleep 1.5  # until the bar has moved and the dialog is painted
      import -window root "$shots/progress.png"; ok; return
    fi
    sleep 0.2
  done
  bad "no progress dialog while copying"
}

# Copies every file of the open receiver as a user does (select all, right-click menu, Copy),
# pastes them with calvex-paste and compares each with the receiver's own file: bytes and time.
copy_all() {
  local folder=$1 target
  target=$(mktemp -d)
  click_list 400 400
  xdotool key Home shift+End; sleep 0.5
  xdotool key shift+F10; sleep 1  # the menu opens at the top left: a keyboard menu has no point
  import -window root "$shots/copy-menu.png"
  xdotool key c; sleep 1
  local out=$target.out
  "$run" "$build/calvex-paste.exe" "$(winepath -w "$target" 2>/dev/null)" >"$out" 2>/dev/null &
  local paste=$!
  [ -n "$rate" ] && progress_shot
  wait $paste
  tr -d '\r' <"$out"; rm -f "$out"
  say "Copied the files of $(basename "$folder") out through Copy and calvex-paste:"
  local file name
  for file in "$folder"/*; do
    name=$(basename "$file")
    [ "$name" = receiver.ini ] && continue
    local copied="$target/$name.qpr"
    local same="bytes equal" timed="time equal" when
    if cmp -s "$file" "$copied"; then ok; else same="BYTES DIFFER"; bad "copied $name.qpr differs from the receiver's file or is missing"; fi
    when=$(sed -n "s/^$name=//p" "$folder/receiver.ini")
    if [ -n "$when" ] && [ "$(stat -c %Y "$copied" 2>/dev/null)" = "$(date -d "$when" +%s)" ]; then ok
    else timed="TIME DIFFERS"; bad "copied $name.qpr does not carry the time $when"; fi
    say "$(printf '  %-16s %9s bytes  %s  %s, %s' "$name.qpr" "$(stat -c %s "$copied" 2>/dev/null)" \
      "$(date -d "@$(stat -c %Y "$copied" 2>/dev/null || echo 0)" '+%Y-%m-%d %H:%M:%S')" "$same" "$timed")"
  done
  [ "$(ls -A "$target" | grep -c 'calvex-partial')" -eq 0 ] && ok || bad "a temporary file was left in the target"
  rm -rf "$target"
}

click_list 400 300
open_item "My"
sleep 2
if [[ " $brands " == *" calvex "* ]]; then
  copy_from="$samples/Calvex Q9 USB" widen=1
  walk_brand "Calvex" "E102076F" "Q9 GNSS@USB" "calvex"
fi
if [[ " $brands " == *" brennor "* ]]; then
  copy_from="" widen=""
  walk_brand "Brennor" "E65CDE76" "HVL3-GNSS@USB" "brennor"
fi

[ -n "$rate" ] && "$run" reg delete 'HKCU\Software\Calvex\DeviceSim' /v Rate /f >/dev/null 2>&1
[ $fail -eq 0 ] || { echo "--- the namespace"; echo "$tree"; echo "--- the last view"; echo "$view"; }
say "Screenshots:"
for shot in calvex-receivers calvex-files progress; do
  [ -s "$shots/$shot.png" ] && say "  $shots/$shot.png"
done
say "$pass checks passed, $fail failed"
[ $fail -eq 0 ]
