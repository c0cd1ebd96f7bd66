#!/bin/sh
# Runs one VBScript file under Wine's cscript and decides pass or fail from its output.
#
#   run-script.sh WINE_EXEC SCRIPT OUTPUT
#
# WINE_EXEC is the build's wine-exec wrapper (private prefix, timeout). cscript exits 0 on a syntax or
# runtime error and prints nothing about it, so its exit code proves nothing: a script passes only when
# it printed the line "fails=0" and no line starting with "FAIL". The output goes to a file (a Wine
# program's output is never piped) and is printed afterwards for ctest's log.
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

if [ "$status" -ne 0 ]; then
  echo "FAIL: cscript exited with $status (124: timed out)"
  exit 1
fi
if tr -d '\r' <"$output" | grep -q '^FAIL'; then
  echo "FAIL: the script reported failures"
  exit 1
fi
if ! tr -d '\r' <"$output" | grep -qx 'fails=0'; then
  echo "FAIL: no 'fails=0' line: the script stopped early (syntax error, or a runtime error outside On Error Resume Next)"
  exit 1
fi
