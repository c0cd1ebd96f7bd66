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
cmake --build "$SM_WINDOWS_BUILD" -j "$(nproc)" --target SessionMgr DemoClient VxipnpDemo simdmm_64 VisaDemo sim_visa32 qvrq rqengine RQDemo \
  IviDemo iviconfig ividmm_class simdmm_specific \
  ExternalProcessServer ExternalDemoClient sessionmgr >"$SM_WINDOWS_BUILD/demo-build.log" 2>&1 ||
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

# The simulated instruments, installed as a real installation places them: a VXIplug&play directory
# C:\VXIPNP with the simulated driver simdmm and a configuration file that names the virtual
# instrument BenchDMM and the logical names DMM1 and Serial1.
sm_install_sim
# Through the environment rather than the registry, so the prefix the tests share stays untouched.
export VXIPNPPATH="$SM_SIM_VXIPNP_DIR_WINDOWS"
# Every stand-in reads the one demo bench (docs/simulated-setup.md).
timeout 60 wine winepath -w "$root/sim/simsetup.ini" >"$out/simsetup.winpath" 2>/dev/null || true
export SM_SIM_SETUP="$(tr -d '\r\n' <"$out/simsetup.winpath")"

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
echo "== VXIplug&play: wine cscript examples/vxipnp-demo.vbs and wine VxipnpDemo.exe =="
timeout 60 wine winepath -w "$root/examples/vxipnp-demo.vbs" >"$out/vxipnp-demo.vbs.winpath" 2>/dev/null || true
script="$(tr -d '\r\n' <"$out/vxipnp-demo.vbs.winpath")"
timeout 120 wine cscript //nologo "$script" >"$out/vxipnp-demo.vbs.txt" 2>&1 || true
tr -d '\r' <"$out/vxipnp-demo.vbs.txt"
if ! tr -d '\r' <"$out/vxipnp-demo.vbs.txt" | grep -qx 'vxipnp-demo.vbs finished'; then
  echo "vxipnp-demo.vbs stopped early (a script error ends cscript silently)"
  status=1
fi
timeout 120 wine "$SM_WINDOWS_BUILD/examples/VxipnpDemo.exe" >"$out/VxipnpDemo.txt" 2>&1 || status=1
tr -d '\r' <"$out/VxipnpDemo.txt"
if ! tr -d '\r' <"$out/VxipnpDemo.txt" | grep -qx 'VxipnpDemo finished'; then
  echo "VxipnpDemo.exe failed"
  status=1
fi

echo "== VISA: examples/visa-demo.vbs and VisaDemo.exe share VISA sessions of the simulated visa32.dll =="
# The simulated bench: the VISA library answers from sim/simsetup.ini.
timeout 60 wine winepath -w "$root/sim/simsetup.ini" >"$out/simsetup.winpath" 2>/dev/null || true
timeout 60 wine winepath -w "$root/examples/visa-demo.vbs" >"$out/visa-demo.vbs.winpath" 2>/dev/null || true
export SM_SIM_SETUP="$(tr -d '\r\n' <"$out/simsetup.winpath")"
timeout 120 wine cscript //nologo "$(tr -d '\r\n' <"$out/visa-demo.vbs.winpath")" >"$out/visa-demo.vbs.txt" 2>&1 || true
timeout 120 wine "$SM_WINDOWS_BUILD/examples/VisaDemo.exe" >"$out/VisaDemo.txt" 2>&1 || status=1
for piece in visa-demo.vbs VisaDemo; do
  tr -d '\r' <"$out/$piece.txt"
  if ! tr -d '\r' <"$out/$piece.txt" | grep -qx "$piece finished"; then
    echo "$piece stopped early"
    status=1
  fi
  echo
done

echo "== Switch routes and a switch session: wine RQDemo.exe, then wine cscript examples/rq-demo.vbs =="
# The switch stand-ins read the demo bench, named through the environment like the VXIplug&play path.
timeout 60 wine winepath -w "$root/sim/simsetup.ini" >"$out/simsetup.winpath" 2>/dev/null || true
export SM_SIM_SETUP="$(tr -d '\r\n' <"$out/simsetup.winpath")"
if ! timeout 120 wine "$SM_WINDOWS_BUILD/examples/RQDemo.exe" >"$out/RQDemo.txt" 2>&1; then
  status=1
fi
tr -d '\r' <"$out/RQDemo.txt"
echo
timeout 60 wine winepath -w "$root/examples/rq-demo.vbs" >"$out/rq-demo.vbs.winpath" 2>/dev/null || true
script="$(tr -d '\r\n' <"$out/rq-demo.vbs.winpath")"
timeout 120 wine cscript //nologo "$script" >"$out/rq-demo.vbs.txt" 2>&1 || true
tr -d '\r' <"$out/rq-demo.vbs.txt"
if ! tr -d '\r' <"$out/rq-demo.vbs.txt" | grep -qx 'rq-demo.vbs finished'; then
  echo "rq-demo.vbs stopped early (a script error ends cscript silently)"
  status=1
fi


echo "== IVI over the bench sim/simsetup.ini: wine IviDemo.exe, then wine cscript examples/ivi-demo.vbs =="
# The stand-ins read the bench named by SM_SIM_SETUP; without it the IVI store is empty.
timeout 60 wine winepath -w "$root/examples/ivi-demo.vbs" >"$out/ivi-demo.vbs.winpath" 2>/dev/null || true
timeout 60 wine winepath -w "$root/sim/simsetup.ini" >"$out/simsetup.winpath" 2>/dev/null || true
bench="$(tr -d '\r\n' <"$out/simsetup.winpath")"
SM_SIM_SETUP="$bench" timeout 120 wine "$SM_WINDOWS_BUILD/examples/IviDemo.exe" >"$out/IviDemo.txt" 2>&1 || true
SM_SIM_SETUP="$bench" timeout 120 wine cscript //nologo "$(tr -d '\r\n' <"$out/ivi-demo.vbs.winpath")" \
  >"$out/ivi-demo.vbs.txt" 2>&1 || true
for file in IviDemo.txt:'IviDemo finished' ivi-demo.vbs.txt:'ivi-demo.vbs finished'; do
  tr -d '\r' <"$out/${file%%:*}"
  if ! tr -d '\r' <"$out/${file%%:*}" | grep -qx "${file#*:}"; then
    echo "${file%%:*}: the client stopped early"
    status=1
  fi
done

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
