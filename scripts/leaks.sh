#!/usr/bin/env bash
# Runs the leak cycles (bench/LeakCycles.cpp) against the stand-ins installed as an installation
# places them, on the demo bench: 100,000 create/use/release cycles per category unless a count is
# given. Uses the test build tree and its Wine prefix.
#
#   ./scripts/leaks.sh [cycles per category]
set -euo pipefail
root="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
source "$root/scripts/lib.sh"
cycles="${1:-100000}"

sm_install_packages
sm_configure_windows
sm_build leaks SessionMgr bench_leaks simdmm_64 sim_visa32 qvrq rqengine iviconfig ividmm_class simdmm_specific
sm_start_wine
trap sm_stop_wine EXIT
out="$SM_WINDOWS_BUILD/leaks"
mkdir -p "$out"
timeout 60 wine regsvr32 /s "$SM_WINDOWS_BUILD/src/server/SessionMgr.dll" >"$out/regsvr32.txt" 2>&1 ||
  { echo "regsvr32 failed"; cat "$out/regsvr32.txt"; exit 1; }
sm_install_sim
sm_use_demo_bench "$out"
# Wine programs write to files, never into pipes.
status=0
timeout 7200 wine "$SM_WINDOWS_BUILD/bench/bench_leaks.exe" "$cycles" >"$out/leaks.txt" 2>"$out/leaks.err" || status=$?
tr -d '\r' <"$out/leaks.txt"
exit "$status"
