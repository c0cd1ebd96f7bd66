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

# Every stand-in placed into the Wine prefix the way a real installation places it.
sm_install_sim() {
  sm_install_sim_rq
}
