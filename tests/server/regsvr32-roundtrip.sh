#!/bin/sh
# Unregisters and registers the DLL with regsvr32, as installers do: both must exit with 0 and the
# registry must follow. Whatever happens, the DLL is left registered for the tests that come after.
# Usage: regsvr32-roundtrip.sh WINE_EXEC DLL WORK_DIR
set -u
wine_exec="$1"
dll="$2"
work="$3"
mkdir -p "$work"

register_again() { "$wine_exec" regsvr32 /s "$dll" >"$work/reregister.out" 2>&1; }
fail() {
  echo "FAIL: $*"
  for output in "$work"/*.out; do echo "--- $output"; cat "$output"; done
  register_again
  exit 1
}

"$wine_exec" regsvr32 /s /u "$dll" >"$work/unregister.out" 2>&1
code=$?
[ "$code" -eq 0 ] || fail "regsvr32 /u exited with $code"
"$wine_exec" reg query 'HKCR\SessionMgr.InstrSessionMgr' >"$work/after-unregister.out" 2>&1
code=$?
[ "$code" -ne 0 ] || fail "the ProgID key is still there after regsvr32 /u"

"$wine_exec" regsvr32 /s "$dll" >"$work/register.out" 2>&1
code=$?
[ "$code" -eq 0 ] || fail "regsvr32 exited with $code"
"$wine_exec" reg query 'HKCR\SessionMgr.InstrSessionMgr\CurVer' /ve >"$work/after-register.out" 2>&1
code=$?
[ "$code" -eq 0 ] || fail "no CurVer key after regsvr32 (reg exited with $code)"
grep -q 'REG_SZ *SessionMgr\.InstrSessionMgr\.1' "$work/after-register.out" ||
  fail "CurVer does not name SessionMgr.InstrSessionMgr.1"

echo "regsvr32 round trip: ok"
