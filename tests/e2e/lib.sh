# lib.sh: helpers the shell tests share. Source it; a test that calls bad sets fail=0 first
# and ends with it.

# A Unix path as the Windows programs see it: Wine shows the Unix root as drive Z:.
win() { echo "Z:$1" | sed 's|/|\\|g'; }

bad() { fail=1; echo "FAIL: $*"; }
# Wine's stand-alone notification area: a window of its own, shown while it holds an icon.
tray() { xdotool search --onlyvisible --name '^Wine System Tray$' 2>/dev/null | grep -q .; }

waitfor() {  # waitfor FILE TEXT SECONDS [TIMES]: until FILE holds TEXT (TIMES times); a failure when it does not in time
  for _ in $(seq 1 $(($3 * 10))); do
    [ "$(grep -cF -- "$2" "$1" 2>/dev/null)" -ge "${4:-1}" ] && return 0; sleep 0.1
  done
  bad "no \"$2\" ${4:+($4 times) }in $(basename "$1") within $3 s"; return 1
}

# The watch tests' receivers: they use $prefix (the Wine prefix), $root (the simulator's tree),
# $work (scratch space) and $stamp (the last file time given, in seconds since 1970).
ends() {  # ends PID SECONDS: its exit code; killed when it runs longer
  for _ in $(seq 1 $(($2 * 10))); do kill -0 $1 2>/dev/null || break; sleep 0.1; done
  kill -0 $1 2>/dev/null && { bad "still running $2 s on"; kill -9 $1; }
  wait $1
}
simlog() { cat "$prefix"/drive_c/users/*/Temp/CalvexDeviceSim.log 2>/dev/null | grep -F "$(win "$root")"; }
downloading() {  # downloading RECEIVER FILE [TIMES]: until the simulator has started sending it (TIMES times)
  for _ in $(seq 1 300); do
    [ "$(simlog | grep -cF "$(win "$root/$1/$2")\" started")" -ge "${3:-1}" ] && return 0; sleep 0.1
  done
  bad "the download of $1/$2 never started"; return 1
}
receiver() {  # receiver DIR BRAND SERIAL MODEL [RATE]: 40,000 bytes a second unless given (0: full speed)
  mkdir -p "$1"
  printf '[Receiver]\r\nBrand=%s\r\nLabel=Test\r\nSerialNumber=%s\r\nModel=%s\r\nPortType=2\r\n[Transfer]\r\nRate=%s\r\n' \
    "$2" "$3" "$4" "${5:-40000}" >"$1/receiver.ini"
}
log() {  # log DIR NAME BYTES: a file the receiver logs, with a time of its own, there at once
  stamp=$((stamp + 61))
  head -c "$3" /dev/urandom >"$work/$2.new"
  touch -d "@$stamp" "$work/$2.new"
  mv "$work/$2.new" "$1/$2"
}
landed() {  # landed LOG [DIR/NAME...]: every file of $root in $target once (the named ones twice
  # by LOG's lines), whole, with the device's time, and nothing else in $target
  local log=$1 expected=0 file name dir got count want twice; shift
  for file in "$root"/*/*; do
    name=$(basename "$file") dir=$(basename "$(dirname "$file")")
    [ "$name" = receiver.ini ] && continue
    expected=$((expected + 1))
    got=$(ls "$target/${dir#* }@USB/$name"* 2>/dev/null | head -1)
    if [ -z "$got" ]; then bad "$dir/$name was not fetched"; continue; fi
    cmp -s "$file" "$got" || bad "$dir/$name differs"
    [ "$(stat -c %Y "$file")" = "$(stat -c %Y "$got")" ] || bad "$dir/$name has not the device's time"
    count=$(grep -cE "  fetched     ${dir#* }@USB\\\\$name(\.qpr)?  " "$log") want=1
    for twice in "$@"; do [ "$dir/$name" = "$twice" ] && want=2; done
    [ "$count" = $want ] || bad "$dir/$name fetched $count times"
  done
  [ "$(find "$target" -type f | wc -l)" = $expected ] || bad "other files were left: $(find "$target" -type f)"
}
