#!/usr/bin/env bash
# check_imports.sh DLL [WINDOWLESS_EXE]: the module exports exactly its four entry points and
# imports nothing but Windows system DLLs (the C and C++ runtimes are linked in statically); the
# tool started at logon is a Windows program, so no console flashes up.
set -euo pipefail
dll=$1
dump=$(x86_64-w64-mingw32-objdump -p "$dll")
imports=$(sed -n 's/^\s*DLL Name: //p' <<<"$dump" | tr 'A-Z' 'a-z' | sort)
allowed="advapi32.dll comctl32.dll gdi32.dll kernel32.dll msvcrt.dll ole32.dll oleaut32.dll shell32.dll shlwapi.dll user32.dll version.dll"
status=0
for name in $imports; do
  if ! grep -qw "$name" <<<"$allowed"; then echo "FAIL: imports $name"; status=1; fi
done
exports=$(awk '/\[Ordinal\/Name Pointer\] Table/{on=1;next} on&&/^[ \t]*\[/{print $NF} on&&/^$/{exit}' <<<"$dump" | sort | tr '\n' ' ')
if [ "$exports" != "DllCanUnloadNow DllGetClassObject DllRegisterServer DllUnregisterServer " ]; then
  echo "FAIL: exports are: $exports"; status=1
fi
if [ $# -gt 1 ] && ! grep -qE '^Subsystem\s+0+2\s' <<<"$(x86_64-w64-mingw32-objdump -p "$2")"; then
  echo "FAIL: $(basename "$2") is not a Windows program (it would open a console)"; status=1
fi
echo "imports: $(tr '\n' ' ' <<<"$imports")"
echo "exports: $exports"
[ $status -eq 0 ] && echo "1 passed, 0 failed" || echo "0 passed, 1 failed"
exit $status
