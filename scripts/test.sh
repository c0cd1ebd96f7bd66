#!/usr/bin/env bash
# Installs what is missing, builds the native (sanitized) and the Windows build, and runs every test.
# Safe to run again: installed packages, the Wine prefix and the build trees are reused.
set -euo pipefail
root="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
source "$root/scripts/lib.sh"

sm_install_packages
sm_configure_native
sm_configure_windows
cmake --build "$SM_NATIVE_BUILD" -j "$(nproc)"
cmake --build "$SM_WINDOWS_BUILD" -j "$(nproc)"

echo "== native tests (sanitized) =="
(cd "$SM_NATIVE_BUILD" && ctest --output-on-failure)

echo "== Windows tests under Wine =="
sm_start_wine
trap sm_stop_wine EXIT
sm_install_sim
sm_register_external_server
(cd "$SM_WINDOWS_BUILD" && ctest --output-on-failure)
