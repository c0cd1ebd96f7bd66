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
sm_build demo SessionMgr DemoClient VxipnpDemo simdmm_64 VisaDemo sim_visa32 qvrq rqengine RQDemo IviDemo iviconfig \
  ividmm_class simdmm_specific ExternalProcessServer ExternalDemoClient sessionmgr

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

# The simulated instruments, installed as a real installation places them: a VXIplug&play directory
# C:\VXIPNP with the simulated driver simdmm and a configuration file that names the virtual
# instrument BenchDMM and the logical names DMM1 and Serial1; the VISA, switch and IVI stand-ins
# where their installers put them. Every stand-in reads the one demo bench, sim/simsetup.ini.
sm_install_sim
sm_use_demo_bench "$out"

status=0

# show NAME COMMAND...: runs one demo client, prints what it printed, and checks its last line
# "NAME finished" (cscript exits 0 even when a script dies, so only that line tells).
show() {
  local name="$1"; shift
  timeout 120 wine "$@" >"$out/$name.txt" 2>&1 || true
  tr -d '\r' <"$out/$name.txt"
  if ! tr -d '\r' <"$out/$name.txt" | grep -qx "$name finished"; then
    echo "$name stopped early"
    status=1
  fi
  echo
}
# script NAME.vbs: a VBScript client of examples/ under cscript, which wants a Windows path.
script() {
  timeout 60 wine winepath -w "$root/examples/$1" >"$out/$1.winpath" 2>/dev/null || true
  show "$1" cscript //nologo "$(tr -d '\r\n' <"$out/$1.winpath")"
}

echo "== Custom sessions, locks and listings: examples/demo.vbs and DemoClient.exe =="
script demo.vbs
show DemoClient "$client"
echo "== VXIplug&play: examples/vxipnp-demo.vbs and VxipnpDemo.exe =="
script vxipnp-demo.vbs
show VxipnpDemo "$SM_WINDOWS_BUILD/examples/VxipnpDemo.exe"
echo "== VISA: examples/visa-demo.vbs and VisaDemo.exe share VISA sessions of the simulated visa32.dll =="
script visa-demo.vbs
show VisaDemo "$SM_WINDOWS_BUILD/examples/VisaDemo.exe"
echo "== Switch routes and a switch session: RQDemo.exe and examples/rq-demo.vbs =="
show RQDemo "$SM_WINDOWS_BUILD/examples/RQDemo.exe"
script rq-demo.vbs
echo "== IVI over the bench sim/simsetup.ini: IviDemo.exe and examples/ivi-demo.vbs =="
show IviDemo "$SM_WINDOWS_BUILD/examples/IviDemo.exe"
script ivi-demo.vbs

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

echo
echo "== The station tool: sessionmgr.exe list, then sessionmgr.exe state =="
tool="$SM_WINDOWS_BUILD/apps/StationTool/sessionmgr.exe"
for command in list state; do
  if ! timeout 120 wine "$tool" "$command" >"$out/sessionmgr-$command.txt" 2>&1; then
    echo "sessionmgr $command failed"
    status=1
  fi
  echo "-- sessionmgr $command"
  tr -d '\r' <"$out/sessionmgr-$command.txt"
done

exit "$status"
