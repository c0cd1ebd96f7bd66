#!/bin/sh
# Runs one VBScript or JScript file under Wine's cscript and decides pass or fail from its output.
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
winpath_file="$output.winpath"

rm -f "$output" "$winpath_file"
# cscript needs a Windows path; a Unix path fails silently.
SESSIONMGR_WINE_TIMEOUT=60 "$wine_exec" winepath -w "$script" >"$winpath_file" 2>/dev/null
winpath="$(tr -d '\r\n' <"$winpath_file")"
if [ -z "$winpath" ]; then
  echo "FAIL: winepath gave no Windows path for $script"
  exit 1
fi

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
exit 0
