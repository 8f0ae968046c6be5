#!/usr/bin/env bash
# How fast `metainfo scan` fills a library database, against exiftool and
# MediaInfo reading the same tree.
#
#   bench/scan_bench.sh [--files N] [--dir DIR] [--build DIR] [--no-install]
#
# Generates a few dozen small media files with ffmpeg, lame and sox, copies
# them into a tree of N files (default 20000; each MP3 and WAVE copy gets an
# ID3v1 title of its own, so the files differ in bytes and size), then times:
# a full scan into a new database, a rescan of the unchanged tree,
# `exiftool -r -fast2 -json` and `mediainfo --Output=JSON` over the tree, and
# the scan's peak memory at a tenth of the files and at all of them. Every
# tool reads a tree the page cache holds already. Prints a table.
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/.." && pwd)
files=20000
dir=${TMPDIR:-/tmp}/metainfo-scan-bench
build=$root/build
install=1
while [ $# -gt 0 ]; do
  case $1 in
    --files) files=$2; shift 2 ;;
    --dir) dir=$2; shift 2 ;;
    --build) build=$2; shift 2 ;;
    --no-install) install=0; shift ;;
    *) echo "usage: bench/scan_bench.sh [--files N] [--dir DIR] [--build DIR] [--no-install]" >&2; exit 2 ;;
  esac
done

if [ $install -eq 1 ] && [ "$(id -u)" -eq 0 ]; then
  need=()
  for pkg in ffmpeg lame sox libimage-exiftool-perl mediainfo time libsqlite3-dev; do
    dpkg -s "$pkg" >/dev/null 2>&1 || need+=("$pkg")
  done
  if [ "${#need[@]}" -gt 0 ]; then
    apt-get update -qq >/dev/null
    DEBIAN_FRONTEND=noninteractive apt-get install -y -qq "${need[@]}" >/dev/null
  fi
fi
for tool in ffmpeg lame sox exiftool mediainfo /usr/bin/time; do
  command -v "$tool" >/dev/null || { echo "scan_bench: $tool is missing" >&2; exit 1; }
done

metainfo=$build/metainfo
if [ ! -x "$metainfo" ]; then
  cmake -S "$root" -B "$build" -DCMAKE_BUILD_TYPE=RelWithDebInfo >/dev/null
  cmake --build "$build" -j2 --target metainfo_cli >/dev/null
fi

# The seeds: a few dozen short files of the families the library reads.
seeds=$dir/seeds
if [ ! -f "$seeds/.done" ]; then
  mkdir -p "$seeds"
  ff=(ffmpeg -nostdin -hide_banner -loglevel error -y)
  for i in $(seq 1 8); do
    freq=$((220 * i)); secs=$((1 + i % 3))
    sox -n -r 16000 -c 1 -b 16 "$seeds/tone$i.wav" synth "$secs" sine "$freq" 2>/dev/null
    lame --quiet -b $((16 * (1 + i % 4))) --tt "Tone $i" --ta "Bench" --tl "Seeds" --tn "$i/8" \
      "$seeds/tone$i.wav" "$seeds/tone$i.mp3"
    "${ff[@]}" -i "$seeds/tone$i.wav" -c:a aac -b:a 64k -metadata title="Tone $i" "$seeds/tone$i.m4a"
    "${ff[@]}" -i "$seeds/tone$i.wav" -c:a aac -b:a 48k -f adts "$seeds/tone$i.aac"
    "${ff[@]}" -i "$seeds/tone$i.wav" -c:a wmav2 -b:a 64k -metadata title="Tone $i" "$seeds/tone$i.wma"
  done
  for i in 1 2 3 4; do
    "${ff[@]}" -f lavfi -i "testsrc=size=96x64:rate=10:duration=$i" -f lavfi -i "sine=f=440:d=$i" \
      -c:v mpeg4 -c:a aac -shortest "$seeds/clip$i.mp4"
    "${ff[@]}" -f lavfi -i "testsrc=size=96x64:rate=10:duration=$i" -f lavfi -i "sine=f=440:d=$i" \
      -c:v mpeg4 -c:a mp3 -shortest "$seeds/clip$i.avi"
  done
  touch "$seeds/.done"
fi

# The tree: folders of 500 files; MP3 and WAVE copies end in an ID3v1 title of their own.
tree=$dir/tree$files
if [ ! -f "$tree/.done" ]; then
  rm -rf "$tree"
  python3 - "$seeds" "$tree" "$files" <<'EOF'
import os, sys
seeds, tree, count = sys.argv[1], sys.argv[2], int(sys.argv[3])
names = sorted(n for n in os.listdir(seeds) if not n.startswith("."))
data = {n: open(os.path.join(seeds, n), "rb").read() for n in names}
for i in range(count):
    name = names[i % len(names)]
    folder = os.path.join(tree, "d%03d" % (i // 500))
    os.makedirs(folder, exist_ok=True)
    body = data[name]
    if name.endswith((".mp3", ".wav")):
        body += b"TAG" + ("Copy %d of %s" % (i, name)).encode().ljust(30, b"\0")[:30] + bytes(94) + b"\xff"
    base, ext = os.path.splitext(name)
    with open(os.path.join(folder, "%s-%05d%s" % (base, i, ext)), "wb") as f:
        f.write(body)
EOF
  touch "$tree/.done"
fi
tenth=$(ls -d "$tree"/d* | head -n $(( (files / 10 + 499) / 500 )))
tenth_files=$(find $tenth -type f | wc -l)

# seconds PEAK_KB: runs a command under /usr/bin/time -v.
measure() {
  /usr/bin/time -v -o "$dir/time.txt" "$@" >/dev/null 2>"$dir/stderr.txt" || true
  awk -F': ' '/Elapsed \(wall clock\)/ { n = split($2, t, ":"); s = 0; for (i = 1; i <= n; ++i) s = s * 60 + t[i]; secs = s }
              /Maximum resident set size/ { kb = $2 }
              END { printf "%.2f %d\n", secs, kb }' "$dir/time.txt"
}

db=$dir/bench.db
rm -f "$db" "$db"-wal "$db"-shm "$db".lock
find "$tree" -type f -exec cat {} + >/dev/null  # the page cache holds the tree for every tool alike
read -r full_s full_kb < <(measure "$metainfo" scan "$tree" --db "$db")
read -r again_s again_kb < <(measure "$metainfo" scan "$tree" --db "$db")
rm -f "$db" "$db"-wal "$db"-shm
# shellcheck disable=SC2086
read -r small_s small_kb < <(measure "$metainfo" scan $tenth --db "$db")
read -r exif_s exif_kb < <(measure exiftool -r -fast2 -json "$tree")
read -r mi_s mi_kb < <(measure mediainfo --Output=JSON "$tree")
rows=$(sqlite3 "$db" "SELECT count(*) FROM files" 2>/dev/null || echo "?")

rate() { awk -v n="$1" -v s="$2" 'BEGIN { printf "%.0f", (s > 0 ? n / s : 0) }'; }
echo "machine: $(nproc) cores, $(uname -sr); $files files ($(du -sh "$tree" | cut -f1)) in $tree"
printf "%-34s %8s %8s %10s %12s\n" "run" "files" "seconds" "files/s" "peak RSS MB"
row() { printf "%-34s %8s %8s %10s %12.1f\n" "$1" "$2" "$3" "$(rate "$2" "$3")" "$(awk -v k="$4" 'BEGIN { print k / 1024 }')"; }
row "metainfo scan (new database)" "$files" "$full_s" "$full_kb"
row "metainfo scan (unchanged rescan)" "$files" "$again_s" "$again_kb"
row "metainfo scan (a tenth, new db)" "$tenth_files" "$small_s" "$small_kb"
row "exiftool -r -fast2 -json" "$files" "$exif_s" "$exif_kb"
row "mediainfo --Output=JSON" "$files" "$mi_s" "$mi_kb"
echo "rows in the tenth's database: $rows"
awk -v a="$full_s" -v b="$exif_s" -v c="$mi_s" \
  'BEGIN { printf "scan is %.1fx exiftool and %.1fx mediainfo in files/s\n", b / a, c / a }'
