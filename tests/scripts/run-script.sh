#!/bin/sh
# run-script.sh WINE_EXEC SCRIPT OUTPUT: runs one VBScript file under Wine's cscript (through the
# build's wine-exec wrapper) and decides pass or fail from its output. cscript exits 0 on a syntax or
# runtime error, so a script passes only when it printed "fails=0" and no line starting with "FAIL".
# The output goes to a file (a Wine program's output is never piped) and is printed for ctest's log.
set -u
wine_exec="$1"
script="$2"
output="$3"

# cscript needs a Windows path (a Unix path fails silently); a Wine prefix maps / to drive Z:.
winpath="Z:$(printf '%s' "$script" | tr '/' '\\')"
rm -f "$output"
SESSIONMGR_WINE_TIMEOUT=120 "$wine_exec" cscript //nologo "$winpath" >"$output" 2>&1
status=$?
tr -d '\r' <"$output"

fail() { echo "FAIL: $1"; exit 1; }
[ "$status" -eq 0 ] || fail "cscript exited with $status (124: timed out)"
! tr -d '\r' <"$output" | grep -q '^FAIL' || fail "the script reported failures"
tr -d '\r' <"$output" | grep -qx 'fails=0' ||
  fail "no 'fails=0' line: the script stopped early (syntax error, or a runtime error outside On Error Resume Next)"
