# Shared set-up steps of the test and demo commands. Sourced, not run.
SM_ROOT="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
SM_NATIVE_BUILD="${SM_NATIVE_BUILD:-$SM_ROOT/build/native}"
SM_WINDOWS_BUILD="${SM_WINDOWS_BUILD:-$SM_ROOT/build/windows}"
export WINEPREFIX="$SM_WINDOWS_BUILD/wineprefix"
export WINEDEBUG=-all
export WINEDLLOVERRIDES="mscoree,mshtml="
export WINEARCH=win64

SM_PACKAGES=(cmake g++ make mingw-w64 g++-mingw-w64-x86-64-posix gcc-mingw-w64-x86-64-posix
             mingw-w64-tools wine wine64 libwine-dev googletest libinih-dev ccache)

sm_install_packages() {
  local missing=()
  for p in "${SM_PACKAGES[@]}"; do
    dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
  done
  if [ "${#missing[@]}" -gt 0 ]; then
    echo "== installing: ${missing[*]} =="
    apt-get update -qq
    DEBIAN_FRONTEND=noninteractive apt-get install -y -qq "${missing[@]}" >/dev/null
  fi
}

sm_configure_native() {
  [ -f "$SM_NATIVE_BUILD/CMakeCache.txt" ] ||
    cmake -S "$SM_ROOT" -B "$SM_NATIVE_BUILD" -DCMAKE_BUILD_TYPE=Debug >/dev/null
}

sm_configure_windows() {
  [ -f "$SM_WINDOWS_BUILD/CMakeCache.txt" ] ||
    cmake -S "$SM_ROOT" -B "$SM_WINDOWS_BUILD" -DCMAKE_BUILD_TYPE=RelWithDebInfo \
      -DCMAKE_TOOLCHAIN_FILE="$SM_ROOT/cmake/mingw-w64-x86_64.cmake" >/dev/null
}

# sm_build NAME TARGET...: builds these targets of the Windows tree, the log in NAME-build.log
# there, shown only when the build fails.
sm_build() {
  local log="$SM_WINDOWS_BUILD/$1-build.log"
  shift
  cmake --build "$SM_WINDOWS_BUILD" -j "$(nproc)" --target "$@" >"$log" 2>&1 || { cat "$log"; return 1; }
}

# One wineserver for the whole run: without it every Wine program pays the cold start again.
sm_start_wine() {
  mkdir -p "$WINEPREFIX"
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    echo "== creating Wine prefix $WINEPREFIX =="
    timeout 300 wine wineboot -i >/dev/null 2>&1 || true
    # The wineserver that ran the first-time setup keeps a second service manager and no RPC
    # service; a local COM server started under it never reaches its clients. A fresh wineserver
    # starts with one of each.
    wineserver -k 2>/dev/null || true
    wineserver -w 2>/dev/null || true
  fi
  wineserver -p </dev/null >/dev/null 2>&1 || true
  timeout 120 wine cmd /c exit >/dev/null 2>&1 || true
}

sm_stop_wine() {
  wineserver -k 2>/dev/null || true
}

# The simulated VXIplug&play drivers laid out as an installation lays out real ones, in C:\VXIPNP of
# the prefix: Win64\Bin\<prefix>_64.dll, the session manager's Win64\QVSessionMgr.ini with the virtual
# instrument BenchDMM (logical name DMM1), and the setup file beside the drivers. VXIPNPPATH is left
# to the caller (the demo sets the environment variable; the registry of the test prefix stays clean).
SM_SIM_VXIPNP_DIR_WINDOWS='C:\VXIPNP'
sm_install_sim_vxipnp() {
  local dir="$WINEPREFIX/drive_c/VXIPNP"
  mkdir -p "$dir/Win64/Bin"
  local prefix
  for prefix in simdmm simscope simnoclose; do
    [ -f "$SM_WINDOWS_BUILD/sim/vxipnp/${prefix}_64.dll" ] &&
      cp "$SM_WINDOWS_BUILD/sim/vxipnp/${prefix}_64.dll" "$dir/Win64/Bin/"
  done
  cp "$SM_ROOT/sim/simsetup.ini" "$dir/Win64/Bin/simsetup.ini"
  # Quoted values of the file use backslash escapes: every backslash of the path is written twice.
  printf '%s\r\n' \
    '[VXIPNP Logical Names]' 'DMM1 = "VPPVInstr->BenchDMM"' '' \
    '[VISA Logical Names]' 'Serial1 = "ASRL1::INSTR"' '' \
    '[VPPVInstr->BenchDMM]' 'ModulePath = "C:\\VXIPNP\\Win64\\Bin\\simdmm_64.dll"' 'Prefix = "simdmm"' \
    'Resource = "GPIB0::14::INSTR"' 'IDQuery = True' 'Reset = True' >"$dir/Win64/QVSessionMgr.ini"
}

# The simulated VISA library goes where a VISA installation puts visa32.dll: the system directory, so
# the product finds it by bare name through the normal DLL search order. No setup file is placed
# beside it: without SM_SIM_SETUP the library sees an empty bench (VISA installed, no instrument).
sm_install_sim_visa() {
  local built="$SM_WINDOWS_BUILD/sim/visa/visa32.dll"
  [ -f "$built" ] || { echo "sm_install_sim_visa: $built is not built" >&2; return 1; }
  cp "$built" "$WINEPREFIX/drive_c/windows/system32/visa32.dll"
}

# The switch product as its installer lays it out: "qvrq.dll" and the automation engine in the
# system directory (the library is loaded by its bare name) and the engine registered as an
# in-process COM server. No setup file goes beside them, so the prefix's default bench is empty and
# tests of other areas see no switch names; the demo and the tests name theirs in SM_SIM_SETUP.
# Run again, it repairs what a test left hidden or unregistered.
sm_install_sim_rq() {
  local system32="$WINEPREFIX/drive_c/windows/system32" log="$SM_WINDOWS_BUILD/sim/rq/install.txt"
  rm -f "$system32/qvrq.dll.hidden"
  cp "$SM_WINDOWS_BUILD/sim/rq/qvrq.dll" "$SM_WINDOWS_BUILD/sim/rq/rqengine.dll" "$system32/"
  if ! timeout 60 wine regsvr32 /s 'C:\windows\system32\rqengine.dll' >"$log" 2>&1; then
    echo "registering the switch engine failed:"; cat "$log"; return 1
  fi
}

# IVI: the configuration library in the system directory (the only place the product looks), the
# class driver where the system finds it by name, the specific driver at the module path the demo
# bench names ("C:\Program Files\IVI Foundation\IVI\Bin\simdmm_64.dll"). No setup file goes beside
# them, so the store is empty unless SM_SIM_SETUP names one.
sm_install_sim_ivi() {
  local built="$SM_WINDOWS_BUILD/sim/ivi" system="$WINEPREFIX/drive_c/windows/system32"
  local bin="$WINEPREFIX/drive_c/Program Files/IVI Foundation/IVI/Bin"
  [ -f "$built/iviconfig.dll" ] || return 0
  mkdir -p "$bin"
  cp -f "$built/iviconfig.dll" "$built/IviDmm_64.dll" "$system/"
  cp -f "$built/simdmm_64.dll" "$bin/"
}


# Points the product and the stand-ins of this shell at the demo bench: the VXIplug&play directory
# through the environment (the registry of the shared prefix stays untouched) and sim/simsetup.ini.
# The argument is a scratch folder (Wine programs write to files, never into $(...)).
sm_use_demo_bench() {
  export VXIPNPPATH="$SM_SIM_VXIPNP_DIR_WINDOWS"
  timeout 60 wine winepath -w "$SM_ROOT/sim/simsetup.ini" >"$1/simsetup.winpath" 2>/dev/null || true
  export SM_SIM_SETUP="$(tr -d '\r\n' <"$1/simsetup.winpath")"
}

# Every stand-in, installed into the Wine prefix (which must exist) the way a real installation places it.
sm_install_sim() {
  sm_install_sim_vxipnp
  sm_install_sim_visa
  sm_install_sim_rq
  sm_install_sim_ivi
}

# Registers the shared external-process server (a local COM server EXE) in the current prefix, the
# way an installation does: the server registers itself. The DLL's own registration (regsvr32)
# supplies the type library that marshals the server's interface.
sm_register_external_server() {
  local server="$SM_WINDOWS_BUILD/apps/ExternalProcessServer/ExternalProcessServer.exe"
  local log="$SM_WINDOWS_BUILD/external-server-registration.txt"
  if ! timeout 60 wine "$server" /RegServer >"$log" 2>&1; then
    echo "ExternalProcessServer.exe /RegServer failed:"
    cat "$log"
    return 1
  fi
}

