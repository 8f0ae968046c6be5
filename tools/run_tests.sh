#!/usr/bin/env bash
# Installs what the build and the tests need (when run as root on a Debian-like
# system), then builds and runs the whole suite several ways: plain with gcc
# (warnings as errors), under AddressSanitizer + UndefinedBehaviorSanitizer with
# gcc and with clang, and under ThreadSanitizer (clang). Every build
# also checks that each public header compiles on its own and replays the
# fuzzing regression inputs.
set -euo pipefail
cd "$(dirname "$0")/.."

need=()
have_pkg() { dpkg -s "$1" >/dev/null 2>&1; }
if command -v dpkg >/dev/null 2>&1; then
  for pkg in cmake g++ make clang clang-tidy clang-format libclang-rt-dev libgtest-dev ffmpeg pkg-config libcli11-dev nlohmann-json3-dev python3-pytest python3-mutagen lame sox libsqlite3-dev \
    pybind11-dev python3-dev python3-dask python3-distributed python3-pandas; do
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
export ASAN_OPTIONS=detect_leaks=1
export UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1
export TSAN_OPTIONS=halt_on_error=1:second_deadlock_stack=1

# run_suite DIR C-COMPILER C++-COMPILER CTEST-FILTER [CMAKE OPTIONS...]
run_suite() {
  local dir=$1 cc=$2 cxx=$3 filter=$4
  shift 4
  CC=$cc CXX=$cxx cmake -S . -B "$dir" -DCMAKE_BUILD_TYPE=RelWithDebInfo -DMETAINFO_WERROR=ON "$@" >/dev/null
  cmake --build "$dir" -j "$jobs"
  if [ -n "$filter" ]; then
    ctest --test-dir "$dir" --output-on-failure -j "$jobs" -R "$filter"
  else
    ctest --test-dir "$dir" --output-on-failure -j "$jobs"
  fi
}

start=$(date +%s)
echo "== plain build (gcc)"
run_suite build gcc g++ "" -DCMAKE_EXPORT_COMPILE_COMMANDS=ON
echo "== clang-format: the sources follow .clang-format"
find src include tools tests fuzz bench python/src -type f \( -name '*.cpp' -o -name '*.h' -o -name '*.inl' \) -print0 |
  xargs -0 clang-format --dry-run --Werror
echo "== clang-tidy (bugprone, CERT) on src/"
find src -name '*.cpp' -print0 | xargs -0 -P "$jobs" -n 8 clang-tidy -p build --quiet 2>/dev/null
echo "== AddressSanitizer + UndefinedBehaviorSanitizer (gcc)"
run_suite build-asan gcc g++ "" -DMETAINFO_ASAN=ON -DMETAINFO_UBSAN=ON
echo "== AddressSanitizer + UndefinedBehaviorSanitizer (clang)"
run_suite build-clang-asan clang clang++ "" -DMETAINFO_ASAN=ON -DMETAINFO_UBSAN=ON
echo "== ThreadSanitizer (clang)"
run_suite build-tsan clang clang++ "" -DMETAINFO_TSAN=ON
echo "== all suites passed in $(( $(date +%s) - start )) s"
