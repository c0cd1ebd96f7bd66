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
