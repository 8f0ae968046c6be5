#!/usr/bin/env bash
# Installs what the build and the tests need (when run as root on a Debian-like
# system), builds the library, and runs the whole test suite twice: plain, and
# under AddressSanitizer with UndefinedBehaviorSanitizer.
set -euo pipefail
cd "$(dirname "$0")/.."

need=()
have_pkg() { dpkg -s "$1" >/dev/null 2>&1; }
if command -v dpkg >/dev/null 2>&1; then
  for pkg in cmake g++ make libgtest-dev ffmpeg; do
    have_pkg "$pkg" || need+=("$pkg")
  done
  # The Java binding is built and tested in a real JVM when a JDK is there.
  command -v javac >/dev/null 2>&1 || need+=(default-jdk-headless)
fi
if [ "${#need[@]}" -gt 0 ]; then
  if [ "$(id -u)" -eq 0 ] && command -v apt-get >/dev/null 2>&1; then
    echo "installing: ${need[*]}"
    apt-get update -qq
    DEBIAN_FRONTEND=noninteractive apt-get install -y -qq "${need[@]}" >/dev/null
  else
    echo "missing packages (install them, or run as root): ${need[*]}" >&2
  fi
fi

jobs=$(nproc 2>/dev/null || echo 2)

run_suite() {
  local dir=$1; shift
  cmake -S . -B "$dir" -DCMAKE_BUILD_TYPE=RelWithDebInfo "$@" >/dev/null
  cmake --build "$dir" -j "$jobs"
  ctest --test-dir "$dir" --output-on-failure -j "$jobs"
}

echo "== plain build"
run_suite build
echo "== AddressSanitizer + UndefinedBehaviorSanitizer build"
ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
  run_suite build-asan -DMETAINFO_ASAN=ON -DMETAINFO_UBSAN=ON
