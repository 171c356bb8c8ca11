#!/usr/bin/env bash
# demo_check.sh BUILD_DIR: the README's first command on the built tree: MSI into a fresh
# prefix, Explorer walk, copy of a receiver's files. Checks the demo's report line by line.
set -u
build=$1
here=$(cd "$(dirname "$0")/../.." && pwd)
"$here/scripts/demo.sh" --no-build "$build"
status=$?
report="$build/demo-report.txt"
fail=0
source "$(dirname "$0")/lib.sh"
[ $status -eq 0 ] || bad "the demo ended with $status"
# Every file of the receiver, with the size the receiver has and the time its description gives.
receiver="$here/sample-receivers/Calvex Q9 USB"
for file in "$receiver"/*; do
  name=$(basename "$file")
  [ "$name" = receiver.ini ] && continue
  when=$(sed -n "s/^$name=//p" "$receiver/receiver.ini" | tr -d '\r')
  line=$(printf '  %-16s %9s bytes  %s  bytes equal, time equal' "$name.qpr" "$(stat -c %s "$file")" "$when")
  grep -qxF "$line" "$report" || bad "no report line: $line"
done
for shot in calvex-receivers calvex-files progress; do
  grep -qxF "  $build/shots/$shot.png" "$report" || bad "the report names no $shot screenshot"
  [ "$(head -c 8 "$build/shots/$shot.png" 2>/dev/null | od -An -tx1 | tr -d ' ')" = 89504e470d0a1a0a ] ||
    bad "$shot.png is no PNG"
done
grep -q '^Installed CalvexReceiversShellExt.msi' "$report" || bad "the report does not say the MSI was installed"
grep -qE '^[0-9]+ checks passed, 0 failed$' "$report" || bad "the walk reports failures"
[ $fail -eq 0 ] && echo "demo report checked"
exit $fail
