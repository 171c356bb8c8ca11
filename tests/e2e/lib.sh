# lib.sh: helpers the shell tests share. Source it; a test that calls bad sets fail=0 first
# and ends with it.

# A Unix path as the Windows programs see it: Wine shows the Unix root as drive Z:.
win() { echo "Z:$1" | sed 's|/|\\|g'; }

bad() { fail=1; echo "FAIL: $*"; }

waitfor() {  # waitfor FILE TEXT SECONDS: until FILE holds TEXT; a failure when it does not in time
  for _ in $(seq 1 $(($3 * 10))); do grep -qF -- "$2" "$1" 2>/dev/null && return 0; sleep 0.1; done
  bad "no \"$2\" in $(basename "$1") within $3 s"; return 1
}
