#!/usr/bin/env bash
# Shows SessionMgr at work: installs what is missing, builds the DLL and the C++ demo client in
# build/windows, registers the DLL in the private Wine prefix and runs the VBScript client
# (examples/demo.vbs) and the C++ client (examples/DemoClient.cpp), printing what each shows.
# Safe to run again: installed packages, the Wine prefix and the build tree are reused.
set -euo pipefail
root="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
source "$root/scripts/lib.sh"

sm_install_packages
sm_configure_windows
echo "== building SessionMgr.dll and DemoClient.exe in $SM_WINDOWS_BUILD =="
cmake --build "$SM_WINDOWS_BUILD" -j "$(nproc)" --target SessionMgr DemoClient scan_standard ExternalProcessServer ExternalDemoClient >"$SM_WINDOWS_BUILD/demo-build.log" 2>&1 ||
  { cat "$SM_WINDOWS_BUILD/demo-build.log"; exit 1; }

sm_start_wine
trap sm_stop_wine EXIT

out="$SM_WINDOWS_BUILD/demo"
mkdir -p "$out"
dll="$SM_WINDOWS_BUILD/src/server/SessionMgr.dll"
client="$SM_WINDOWS_BUILD/examples/DemoClient.exe"

echo "== registering $dll in $WINEPREFIX =="
# Wine programs write to files, never into pipes or $(...): helpers they start keep the pipe open.
if ! timeout 60 wine regsvr32 /s "$dll" >"$out/regsvr32.txt" 2>&1; then
  echo "regsvr32 failed:"
  cat "$out/regsvr32.txt"
  exit 1
fi
sm_register_external_server

# A simulated instrument setup: a VXIplug&play directory with one driver image and a configuration
# file that names a virtual instrument and two logical names.
setup="$out/instruments"
mkdir -p "$setup/Win64"
cp "$SM_WINDOWS_BUILD/sim/vxipnp/scan_standard.dll" "$setup/Win64/abc_64.dll"
timeout 60 wine winepath -w "$setup" >"$out/instruments.winpath" 2>/dev/null || true
setup_windows="$(tr -d '\r\n' <"$out/instruments.winpath")"
module_path="$setup_windows\\Win64\\abc_64.dll"
# Quoted values of the file use backslash escapes: every backslash of the path is written twice.
printf '%s\n' \
  '[VXIPNP Logical Names]' 'DMM1 = "VPPVInstr->BenchDMM"' '' \
  '[VISA Logical Names]' 'Serial1 = "ASRL1::INSTR"' '' \
  '[VPPVInstr->BenchDMM]' "ModulePath = \"${module_path//\\/\\\\}\"" 'Prefix = "abc"' \
  'Resource = "GPIB0::14::INSTR"' 'IDQuery = True' 'Reset = True' >"$setup/Win64/QVSessionMgr.ini"
# Through the environment rather than the registry, so the prefix the tests share stays untouched.
export VXIPNPPATH="$setup_windows"

status=0

echo
echo "== VBScript client: wine cscript examples/demo.vbs =="
# cscript wants a Windows path, and exits 0 even when the script dies: its last line tells.
timeout 60 wine winepath -w "$root/examples/demo.vbs" >"$out/demo.vbs.winpath" 2>/dev/null || true
script="$(tr -d '\r\n' <"$out/demo.vbs.winpath")"
timeout 120 wine cscript //nologo "$script" >"$out/demo.vbs.txt" 2>&1 || true
tr -d '\r' <"$out/demo.vbs.txt"
if ! tr -d '\r' <"$out/demo.vbs.txt" | grep -qx 'demo.vbs finished'; then
  echo "demo.vbs stopped early (a script error ends cscript silently)"
  status=1
fi

echo
echo "== C++ client: wine DemoClient.exe =="
if ! timeout 120 wine "$client" >"$out/DemoClient.txt" 2>&1; then
  status=1
fi
tr -d '\r' <"$out/DemoClient.txt"
if ! tr -d '\r' <"$out/DemoClient.txt" | grep -qx 'DemoClient finished'; then
  echo "DemoClient.exe failed"
  status=1
fi

echo
echo "== Two client processes, one session: wine ExternalDemoClient.exe first & second =="
# Both start at once; the first request starts the shared external-process server, which leaves
# after its last client.
external_client="$SM_WINDOWS_BUILD/examples/ExternalDemoClient.exe"
timeout 120 wine "$external_client" first >"$out/ExternalDemoClient.first.txt" 2>&1 &
first_pid=$!
timeout 120 wine "$external_client" second >"$out/ExternalDemoClient.second.txt" 2>&1 || status=1
wait "$first_pid" || status=1
tr -d '\r' <"$out/ExternalDemoClient.first.txt"
tr -d '\r' <"$out/ExternalDemoClient.second.txt"

exit "$status"
