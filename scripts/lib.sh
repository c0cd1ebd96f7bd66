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

# One wineserver for the whole run: without it every Wine program pays the cold start again.
sm_start_wine() {
  mkdir -p "$WINEPREFIX"
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    echo "== creating Wine prefix $WINEPREFIX =="
    timeout 300 wine wineboot -i >/dev/null 2>&1 || true
  fi
  wineserver -p </dev/null >/dev/null 2>&1 || true
  timeout 120 wine cmd /c exit >/dev/null 2>&1 || true
}

sm_stop_wine() {
  wineserver -k 2>/dev/null || true
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

# Places every area's stand-ins in the prefix the way a real installation places the real libraries.
sm_install_sim() {
  sm_install_sim_ivi
}
