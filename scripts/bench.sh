#!/usr/bin/env bash
# Builds the benchmarks in optimised trees of their own (Release, no sanitizers: build/bench-native
# and build/bench-windows), registers that tree's DLL in its own Wine prefix, runs every benchmark
# and prints one table: each figure, its reference measured in the same run, the ratio and the goal.
# Every ratio comes from one run; on a loaded machine run it again before trusting a single row.
set -euo pipefail
root="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
export SM_NATIVE_BUILD="${SM_BENCH_NATIVE_BUILD:-$root/build/bench-native}"
export SM_WINDOWS_BUILD="${SM_BENCH_WINDOWS_BUILD:-$root/build/bench-windows}"
source "$root/scripts/lib.sh"
jobs="${SM_BENCH_JOBS:-2}"

sm_install_packages
[ -f "$SM_NATIVE_BUILD/CMakeCache.txt" ] ||
  cmake -S "$root" -B "$SM_NATIVE_BUILD" -DCMAKE_BUILD_TYPE=Release -DSESSIONMGR_SANITIZE=OFF >/dev/null
[ -f "$SM_WINDOWS_BUILD/CMakeCache.txt" ] ||
  cmake -S "$root" -B "$SM_WINDOWS_BUILD" -DCMAKE_BUILD_TYPE=Release \
    -DCMAKE_TOOLCHAIN_FILE="$root/cmake/mingw-w64-x86_64.cmake" >/dev/null

out="$SM_WINDOWS_BUILD/bench-results"
mkdir -p "$out"
echo "== building the benchmarks (Release) in $SM_NATIVE_BUILD and $SM_WINDOWS_BUILD =="
cmake --build "$SM_NATIVE_BUILD" -j "$jobs" --target bench_ini_read >"$out/build-native.log" 2>&1 ||
  { cat "$out/build-native.log"; exit 1; }
cmake --build "$SM_WINDOWS_BUILD" -j "$jobs" --target SessionMgr ExternalProcessServer bench_lock_handoff \
  bench_regeneration bench_lookup bench_external_call simdmm_64 sim_visa32 qvrq rqengine iviconfig ividmm_class \
  simdmm_specific \
  >"$out/build-windows.log" 2>&1 || { cat "$out/build-windows.log"; exit 1; }

sm_start_wine
trap sm_stop_wine EXIT
# The stand-ins of every category, placed as an installation places them: without the IVI
# configuration library every IVI operation, GetNames("") included, fails.
sm_install_sim
# Wine programs write to files, never into pipes: helpers they start keep a pipe open.
timeout 120 wine regsvr32 /s "$SM_WINDOWS_BUILD/src/server/SessionMgr.dll" >"$out/regsvr32.txt" 2>&1 ||
  { echo "regsvr32 failed"; cat "$out/regsvr32.txt"; exit 1; }
sm_register_external_server

run_native() {  # name program...
  local name="$1"; shift
  echo "   $name"
  "$@" >"$out/$name.txt" 2>&1 || echo "ROW|$name|$name failed (see $out/$name.txt)|-|-|-|not measured: failed|-" >>"$out/$name.txt"
}
run_wine() {  # name timeout program arguments...
  local name="$1" limit="$2"; shift 2
  echo "   $name"
  SESSIONMGR_WINE_TIMEOUT="$limit" "$SM_WINDOWS_BUILD/wine-exec" "$@" >"$out/$name.txt" 2>&1 ||
    echo "ROW|$name|$name failed (see $out/$name.txt)|-|-|-|not measured: failed|-" >>"$out/$name.txt"
}

echo "== running (figures go to $out) =="
run_wine bench_lookup 900 "$SM_WINDOWS_BUILD/bench/bench_lookup.exe"
run_wine bench_lock_handoff 900 "$SM_WINDOWS_BUILD/bench/bench_lock_handoff.exe" "${SM_BENCH_HANDOFFS:-1000}"
run_native bench_ini_read "$SM_NATIVE_BUILD/bench/bench_ini_read"
run_wine bench_regeneration 900 "$SM_WINDOWS_BUILD/bench/bench_regeneration.exe"
run_wine bench_external_call 600 "$SM_WINDOWS_BUILD/bench/bench_external_call.exe" "${SM_BENCH_EXTERNAL_CALLS:-500}"

rows="$out/rows.txt"
cat "$out"/bench_*.txt | tr -d '\r' | grep '^ROW|' >"$rows" || true

echo
echo "== SessionMgr benchmarks ($(date -u '+%Y-%m-%d %H:%M UTC'), load average $(cut -d' ' -f1-3 /proc/loadavg)) =="
sort -t'|' -k2,2 "$rows" | awk -F'|' '
  function met(ratio, goal,   op, limit) {
    if (ratio !~ /^[0-9.]+$/) return "-"
    split(goal, part, " "); op = part[1]; limit = part[2] + 0
    if (op == "<=") return (ratio + 0 <= limit) ? "met" : "NOT met"
    if (op == ">=") return (ratio + 0 >= limit) ? "met" : "NOT met"
    return "-"
  }
  BEGIN { printf "%-3s | %-68s | %-11s | %-58s | %-11s | %-8s | %-6s | %s\n", "#", "figure", "value", "reference (same run)", "value", "ratio", "goal", "result" }
  { printf "%-3s | %-68s | %-11s | %-58s | %-11s | %-8s | %-6s | %s\n", $2, $3, $4, $5, $6, $7, $8, met($7, $8) }'
echo
cat "$out"/bench_*.txt | tr -d '\r' | grep '^NOTE|' | sed 's/^NOTE|/note: /' || true
