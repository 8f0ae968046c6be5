#!/usr/bin/env bash
# The benchmark: libmetainfo against TagLib, libavformat, MediaInfoLib and
# mutagen on the samples, ../shared/corpus and generated files.
#
#   bench/run.sh [--no-install] [--rounds N] [--files DIR] [--build DIR]
#
# Installs the peers' Debian packages (unless --no-install), generates the
# files (kept in DIR, default /tmp/metainfo-bench-files, so reruns skip it),
# builds the benchmark in Release and prints the tables: time per job, ratio
# to each peer, bytes read per job, system calls per job, and scaling with
# the file's duration. Timings are this machine's; the machine is printed.
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/.." && pwd)
install=1
rounds=5
files=${TMPDIR:-/tmp}/metainfo-bench-files
build=$root/build-bench
while [ $# -gt 0 ]; do
  case $1 in
    --no-install) install=0; shift ;;
    --rounds) rounds=$2; shift 2 ;;
    --files) files=$2; shift 2 ;;
    --build) build=$2; shift 2 ;;
    *) echo "usage: bench/run.sh [--no-install] [--rounds N] [--files DIR] [--build DIR]" >&2; exit 2 ;;
  esac
done

if [ $install -eq 1 ]; then
  sudo=""; [ "$(id -u)" -ne 0 ] && sudo=sudo
  $sudo apt-get update -qq >/dev/null
  DEBIAN_FRONTEND=noninteractive $sudo apt-get install -y -qq cmake g++ make pkg-config ffmpeg lame sox \
    strace libcli11-dev libtag1-dev libavformat-dev libmediainfo-dev python3-mutagen >/dev/null
fi

echo "== generating files in $files" >&2
python3 "$here/make_files.py" "$files"

echo "== building in $build (Release)" >&2
cmake -S "$here" -B "$build" -DCMAKE_BUILD_TYPE=Release >/dev/null
cmake --build "$build" -j "$(nproc)" --target probe_bench >/dev/null
bench=("$build/probe_bench" --mutagen-worker "$here/mutagen_worker.py")
sets=("$root/samples" "$files/set")
[ -d "$root/../shared/corpus" ] && sets+=("$root/../shared/corpus")

echo "# libmetainfo benchmark, $(date -u +%Y-%m-%d)"
echo
echo "Machine: $(lscpu | sed -n 's/^Model name: *//p' | head -1), $(nproc) cores, $(uname -sr);" \
  "$rounds rounds after a warm-up, median of the rounds per file; peers: TagLib $(pkg-config --modversion taglib)," \
  "libavformat $(pkg-config --modversion libavformat), MediaInfoLib $(pkg-config --modversion libmediainfo 2>/dev/null || echo -)," \
  "mutagen $(/usr/bin/python3 -c 'import mutagen; print(mutagen.version_string)' 2>/dev/null || echo -)."
"${bench[@]}" --rounds "$rounds" "${sets[@]}" "$files/scaling"

# System calls per job, counted by strace over one job per file; a run with
# no file gives what starting the program costs.
calls() {   # syscall-summary file, name
  awk -v n="$2" '$NF == n { print $4; found = 1 } END { if (!found) print 0 }' "$1"
}
count() {   # peer, family -> "reads seeks"
  local out=$build/strace.txt
  strace -f -c -o "$out" -e trace=read,pread64,readv,preadv,lseek "${bench[@]}" --once --peers "$1" --family "$2" "${sets[@]}" >/dev/null 2>&1 || true
  local r=$(( $(calls "$out" read) + $(calls "$out" pread64) + $(calls "$out" readv) + $(calls "$out" preadv) ))
  local s=$(calls "$out" lseek)
  strace -f -c -o "$out" -e trace=read,pread64,readv,preadv,lseek "${bench[@]}" --once --peers "$1" --family none "${sets[@]}" >/dev/null 2>&1 || true
  r=$(( r - $(calls "$out" read) - $(calls "$out" pread64) - $(calls "$out" readv) - $(calls "$out" preadv) ))
  s=$(( s - $(calls "$out" lseek) ))
  echo "$r $s"
}
peers=(metainfo taglib-fast lavf-open lavf-info)
pkg-config --exists libmediainfo && peers+=(mediainfo)
echo
echo "System calls per job: reads / seeks"
echo
printf '| %-10s | files |' family
for p in "${peers[@]}"; do printf ' %15s |' "$p"; done
printf '\n|------------|------:|'
for p in "${peers[@]}"; do printf '%s' '----------------:|'; done
echo
for family in AAC AMR ASF AVI EVRC MP3 MP4 QCP RealMedia WAVE; do
  n=$("${bench[@]}" --count --family "$family" "${sets[@]}")
  [ "$n" -gt 0 ] || continue
  printf '| %-10s | %5d |' "$family" "$n"
  for p in "${peers[@]}"; do
    read -r r s < <(count "$p" "$family")
    printf ' %15s |' "$(awk -v r="$r" -v s="$s" -v n="$n" 'BEGIN { printf "%.1f / %.1f", r / n, s / n }')"
  done
  echo
done
