#!/usr/bin/env bash
# The main job on the bundled samples: installs what the build needs when it
# is missing (as root on a Debian-like system: a C++ compiler, CMake, CLI11
# and nlohmann-json for the metainfo program), builds the library and the
# program, and probes every sample.
set -euo pipefail
cd "$(dirname "$0")/.."

need=()
if command -v dpkg >/dev/null 2>&1; then
  for pkg in cmake g++ make libcli11-dev nlohmann-json3-dev; do
    dpkg -s "$pkg" >/dev/null 2>&1 || need+=("$pkg")
  done
fi
if [ "${#need[@]}" -gt 0 ]; then
  if [ "$(id -u)" -eq 0 ] && command -v apt-get >/dev/null 2>&1; then
    echo "installing: ${need[*]}" >&2
    apt-get update -qq
    DEBIAN_FRONTEND=noninteractive apt-get install -y -qq "${need[@]}" >/dev/null
  else
    echo "missing packages (install them, or run as root): ${need[*]}" >&2
  fi
fi

cmake -S . -B build >/dev/null
cmake --build build -j "$(nproc 2>/dev/null || echo 2)" --target metainfo_cli >/dev/null
./build/metainfo probe "$@" samples/*
