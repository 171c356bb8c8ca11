#!/usr/bin/env bash
# shell_tree_check.sh BUILD_DIR: the README's main job, checked. calvex-shell walks both brand
# folders through Wine's shell against the sample receivers; each line below must appear,
# each forbidden one must not.
set -u
build=$1
out=$("$build/wine-run" "$build/calvex-shell.exe" tree 2>/dev/null | tr -d '\r')
pass=0 fail=0
expect() {
  if grep -qF -- "$1" <<<"$out"; then pass=$((pass + 1)); else fail=$((fail + 1)); echo "FAIL: missing: $1"; fi
}
refuse() {
  if grep -qF -- "$1" <<<"$out"; then fail=$((fail + 1)); echo "FAIL: unexpected: $1"; else pass=$((pass + 1)); fi
}
expect "::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}"
expect "::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}"
expect "[+] Q7/RTK@COM3    Calvex Receivers\\5211-40125!Q7#RTK!COM3"       # "/" kept as "#" in the key
expect "[+] Q9 GNSS@USB"                                                     # USB port text
expect "[+] Q7/L1-L2@Unknown"                                                # unknown port type
expect " -  LOG0001.qpr    Calvex Receivers\\5302-00871!Q9 GNSS!USB\\LOG0001.qpr"  # Calvex files get .qpr
expect " -  20261103A.T02.qpr    Calvex Receivers\\HV3-0042117!HVL3-GNSS!USB"      # so do Brennor HVL3 files
expect " -  LOG0001    Calvex Receivers\\R2-77810!R2#Net!COM4\\LOG0001"      # other Brennor models keep the name
expect " -  Mesure été.log"                                                  # odd names served as they are
refuse "R2-77811"                                                            # the receiver with an empty label
# Each brand folder lists only its own receivers.
calvex=$(sed -n '/E102076F/,/E65CDE76/p' <<<"$out")
brennor=$(sed -n '/E65CDE76/,$p' <<<"$out")
if grep -q "HVL3" <<<"$calvex" || grep -q "Q7/RTK" <<<"$brennor"; then
  fail=$((fail + 1)); echo "FAIL: a receiver is listed under the other brand"
else
  pass=$((pass + 1))
fi
[ $fail -eq 0 ] || printf '%s\n' "$out"
echo "$pass passed, $fail failed"
[ $fail -eq 0 ]
