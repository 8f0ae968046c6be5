#!/usr/bin/env bash
# Compares what the C interface answers before and after a change, file by
# file: the "exact" object of "metainfo probe --json", "maker", "frames" and the
# C interface's "cut 1 3", over the byte-built fixtures, the samples,
# ../shared/corpus and any folders given (e.g. the benchmark's files). The
# accurate answers (probe's other keys) are free to change.
#
#   bench/compare.sh [--base REV] [FOLDER...]
#
# REV (default HEAD) is built from a temporary worktree, the working tree as
# it stands; both in Release. Exits 0 when every answer is byte-identical,
# 1 otherwise (the differing files and a diff of their answers are printed).
set -euo pipefail

root=$(cd "$(dirname "$0")/.." && pwd)
base=HEAD
if [ "${1:-}" = "--base" ]; then base=$2; shift 2; fi
work=${TMPDIR:-/tmp}/metainfo-compare.$$
mkdir -p "$work"
cleanup() {
  git -C "$root" worktree remove --force "$work/base-src" >/dev/null 2>&1 || true
  rm -rf "$work"
}
trap cleanup EXIT

build() {   # source folder, build folder
  cmake -S "$1" -B "$2" -DCMAKE_BUILD_TYPE=Release -DMETAINFO_TESTS=OFF >/dev/null
  cmake --build "$2" -j 2 --target metainfo_cli metainfo_make_seeds >"$2.log" 2>&1 || { cat "$2.log"; return 1; }
}

git -C "$root" worktree add --detach "$work/base-src" "$base" >/dev/null 2>&1
echo "== building $base and the working tree"
build "$work/base-src" "$work/base"
build "$root" "$work/now"

"$work/now/fuzz/metainfo_make_seeds" "$work/fixtures" >/dev/null
folders=("$work/fixtures/detect" "$root/samples" "$@")
[ -d "$root/../shared/corpus" ] && folders+=("$root/../shared/corpus")
mapfile -t files < <(find "${folders[@]}" -type f | LC_ALL=C sort)

exact_only() {
  python3 -c 'import json, sys
for line in sys.stdin:
    print(json.dumps(json.loads(line)["exact"], sort_keys=True) if line.startswith("{") else line, end="\n")'
}

answers() {   # metainfo binary, file
  "$1" probe --json "$2" 2>/dev/null | exact_only || true
  "$1" maker "$2" 2>&1 || true
  "$1" frames "$2" 2>&1 | head -c 65536 || true
  rm -f "$work/cut"
  # The C interface's cut: "--exact" where the program also cuts by frames.
  local exact=()
  "$1" cut --help 2>&1 | grep -q -- --exact && exact=(--exact)
  "$1" cut "${exact[@]}" "$2" 1 3 "$work/cut" 2>&1 || true
  [ -f "$work/cut" ] && md5sum <"$work/cut"
  true
}

differences=0
for f in "${files[@]}"; do
  before=$(answers "$work/base/metainfo" "$f")
  after=$(answers "$work/now/metainfo" "$f")
  if [ "$before" != "$after" ]; then
    differences=$((differences + 1))
    echo "-- $f"
    diff <(echo "$before") <(echo "$after") | sed 's/^/   /' || true
  fi
done
echo "== ${#files[@]} files compared, $differences differences ($base against the working tree)"
[ "$differences" -eq 0 ]
