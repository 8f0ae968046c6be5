#!/usr/bin/env bash
# Files per second of metainfo.dask.scan on a LocalCluster of 1, 2 and 4
# worker processes (one thread each), against `metainfo scan` and one Python
# process probing alone, over a generated tree.
#
#   bench/dask_bench.sh [--files N] [--dir DIR] [--build DIR] [--tree DIR]
#
# --tree measures an existing tree instead; by default that is the tree of
# bench/scan_bench.sh when it has made one (the scan's and Dask's figures
# are then over the same 20,000 files).
#
# The tree: N copies (default 2000) of the repository's samples/ and, when
# present, ../shared/corpus, in folders of 100; each MP3 and WAVE copy ends in
# an ID3v1 title of its own, so the files differ. The page cache holds the
# tree before each run; the cluster's start is not timed (bench/dask_bench.py).
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/.." && pwd)
files=2000
dir=${TMPDIR:-/tmp}/metainfo-dask-bench
build=$root/build
tree=
scan_tree=${TMPDIR:-/tmp}/metainfo-scan-bench/tree20000
[ -f "$scan_tree/.done" ] && tree=$scan_tree
while [ $# -gt 0 ]; do
  case $1 in
    --files) files=$2; shift 2 ;;
    --dir) dir=$2; shift 2 ;;
    --build) build=$2; shift 2 ;;
    --tree) tree=$2; shift 2 ;;
    *) echo "usage: bench/dask_bench.sh [--files N] [--dir DIR] [--build DIR] [--tree DIR]" >&2; exit 2 ;;
  esac
done
python=/usr/bin/python3
if ! ls "$build"/python/metainfo/_core*.so >/dev/null 2>&1; then
  cmake -S "$root" -B "$build" -DCMAKE_BUILD_TYPE=RelWithDebInfo >/dev/null
  cmake --build "$build" -j2 --target metainfo_py metainfo_cli >/dev/null
fi

mkdir -p "$dir"
[ -n "$tree" ] || tree=$dir/tree$files
if [ ! -f "$tree.done" ] && [ ! -f "$tree/.done" ]; then
  rm -rf "$tree"
  "$python" - "$root" "$tree" "$files" <<'PY'
import os, sys
root, tree, count = sys.argv[1], sys.argv[2], int(sys.argv[3])
seeds = [os.path.join(root, "samples", n) for n in sorted(os.listdir(os.path.join(root, "samples")))]
corpus = os.path.join(os.path.dirname(root), "shared", "corpus")
for folder, _, names in sorted(os.walk(corpus)):
    seeds += [os.path.join(folder, n) for n in sorted(names) if n != "README.md"]
data = [(os.path.basename(p), open(p, "rb").read()) for p in seeds]
for i in range(count):
    name, body = data[i % len(data)]
    folder = os.path.join(tree, "d%03d" % (i // 100))
    os.makedirs(folder, exist_ok=True)
    if name.endswith((".mp3", ".wav")):
        body += b"TAG" + ("Copy %d of %s" % (i, name)).encode().ljust(30, b"\0")[:30] + bytes(94) + b"\xff"
    base, ext = os.path.splitext(name)
    with open(os.path.join(folder, "%s-%05d%s" % (base, i, ext)), "wb") as f:
        f.write(body)
PY
  touch "$tree.done"
fi

find "$tree" -type f -exec cat {} + >/dev/null
db=$dir/bench.db
rm -f "$db" "$db"-wal "$db"-shm "$db".lock
start=$(date +%s.%N)
"$build/metainfo" scan "$tree" --db "$db" >/dev/null 2>&1 || true
scan_s=$(echo "$(date +%s.%N) - $start" | bc)

PYTHONPATH=$build/python "$python" "$here/dask_bench.py" "$tree" "$scan_s"
