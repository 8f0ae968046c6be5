#!/usr/bin/env bash
# Builds the libFuzzer targets (clang, METAINFO_FUZZ=ON, in build-fuzz/), writes
# the seed inputs, runs each target for SECONDS (default 60) and prints a table
# of executions, speed, coverage and findings per target. Findings are
# minimised and copied into fuzz/regressions/<target>/ under a name that says
# where and what (one file per distinct fault).
#
#   fuzz/run.sh [-j JOBS] [-t TARGET[,TARGET...]] [--no-build] [--triage-only] [SECONDS]
#
# -j 2 runs two targets at once (the default is one after another);
# --triage-only fuzzes nothing and sorts the findings of the last run again.
# The work corpus of each target stays in build-fuzz/fuzz-work/<target>/corpus
# and grows from run to run; FUZZ_WORK moves it, FUZZ_MAX_LEN caps input size.
set -euo pipefail

root=$(cd "$(dirname "$0")/.." && pwd)
build=${FUZZ_BUILD:-$root/build-fuzz}
work=${FUZZ_WORK:-$build/fuzz-work}
all_targets=(detect mp3 mp4 aac asf realmedia avi speech extract avi_parser mp4_maker probe flac ogg matroska aiff ape)
seconds=60
jobs=1
build_first=1
targets=("${all_targets[@]}")
timeout_s=1
rss_mb=2048
max_triage=40
triage_only=0
bin=$build/fuzz
scratch=
pids=()

usage() { sed -n '2,16p' "$0" | sed 's/^# \{0,1\}//'; exit 2; }

# Dictionary of each target: its family's, or several families' for the
# targets that see every format.
dicts_of() {
  case $1 in
    detect) echo mp3 aac mp4 asf realmedia avi speech ;;
    probe) echo mp3 aac mp4 asf realmedia avi speech flac ogg matroska aiff ape ;;
    ogg) echo ogg flac ;;
    ape) echo ape mp3 aac ;;
    extract) echo mp3 aac speech ;;
    avi_parser) echo avi ;;
    mp4_maker) echo mp4 ;;
    *) echo "$1" ;;
  esac
}

# Library frames of a report, innermost first, as "file function" (file
# without folder and suffix, function without namespaces and arguments).
library_frames() {
  grep -E "^ +#[0-9]+ .* in .* $root/src/" <<<"$1" |
    sed -E "s#.* in (.*) $root/src/(.*/)?([A-Za-z0-9_]+)\.(cpp|h):.*#\3 \1#; s/\(anonymous namespace\):://g; s/\(.*//;
            s/ ([A-Za-z_][A-Za-z0-9_]*::)+/ /" || true
}

# Where a hang loops: the innermost library function that three stack
# samples share, preferring the parsers to the file layer of core/.
hang_site() {
  local a f
  a=$(library_frames "$1")
  for f in $(grep -vE '^(file_access|byte_reader) ' <<<"$a" | tr ' ' '~') $(tr ' ' '~' <<<"$a"); do
    if grep -qxF "${f//\~/ }" <<<"$(library_frames "$2")" && grep -qxF "${f//\~/ }" <<<"$(library_frames "$3")"; then
      echo "${f//\~/-}"
      return
    fi
  done
  echo no-library-frame
}

# Name of a finding, from one report (a hang: three, taken at different times):
# where (the first frame in the library's src/, or the function a hang loops
# in) and what (the failed check, the undefined behaviour, a leak, or the kind
# the sanitizer's or libFuzzer's summary gives). Empty when the input did not
# fail again.
describe() {
  local report=$1 what where
  if what=$(grep -m1 -o 'metainfo fuzz check failed: .*' <<<"$report"); then
    what=check-${what#metainfo fuzz check failed: }
  elif what=$(grep -m1 -o 'runtime error: .*' <<<"$report"); then
    what=$(sed -E 's/^runtime error: //; s/\(aka [^)]*\)//g; s/[0-9]+//g; s/ (for|of|in) type.*//' <<<"$what")
  elif grep -q 'LeakSanitizer: detected memory leaks' <<<"$report"; then
    what=leak
  elif what=$(grep -m1 -oE 'SUMMARY: [A-Za-z]+: (deadly signal|[A-Za-z-]+)' <<<"$report"); then
    what=${what#SUMMARY: *: }
  else
    return 0
  fi
  if [ "$what" = timeout ] && [ $# -gt 2 ]; then
    where=$(hang_site "$report" "$2" "$3")
  else
    where=$(grep -m1 -oE "$root/src/[A-Za-z0-9_/.-]+\.(cpp|h):[0-9]+" <<<"$report") || where=no-library-frame
    where=$(sed -E 's#.*/##; s/\.(cpp|h):/-/' <<<"$where")
  fi
  what=$(tr 'A-Z' 'a-z' <<<"$what" | sed -E 's/[^a-z0-9]+/-/g; s/^-//; s/-$//' | cut -c1-48 | sed 's/-$//')
  echo "$where-$what"
}

reproduce() {  # target file [seconds] -> the report of one run of it
  "$bin/fuzz_$1" -timeout="${3:-$((timeout_s * 2))}" -rss_limit_mb=$rss_mb "$2" 2>&1 || true
}

name_of() {  # target file -> name of its finding, empty when it passes
  local report
  report=$(reproduce "$1" "$2")
  if grep -q 'SUMMARY: libFuzzer: timeout' <<<"$report"; then
    describe "$report" "$(reproduce "$1" "$2" "$timeout_s")" "$(reproduce "$1" "$2" $((timeout_s * 3)))"
  else
    describe "$report"
  fi
}

# Distinct findings of a run, minimised, into fuzz/regressions/<target>/.
triage() {
  local t=$1 dir=$work/$1 seen="" n=0 f name min report
  mkdir -p "$dir/min" "$root/fuzz/regressions/$t"
  : >"$dir/new-regressions"
  compgen -G "$dir/artifacts/*-*" >/dev/null || return 0
  # Faults the committed regression inputs already show (of any target, when
  # they show them through this one) are not new.
  for f in "$root"/fuzz/regressions/*/*; do
    [ -f "$f" ] || continue
    name=$(name_of "$t" "$f")
    [ -z "$name" ] || seen="$seen $name"
  done
  for f in "$dir"/artifacts/{crash,timeout,oom,leak}-*; do
    [ -e "$f" ] || continue
    n=$((n + 1))
    [ $n -le $max_triage ] || { echo "  ($t: more than $max_triage artifacts, the rest not triaged)"; break; }
    name=$(name_of "$t" "$f")
    [ -n "$name" ] || { echo "  ($t: ${f##*/} does not fail again alone)"; continue; }
    case " $seen " in *" $name "*) continue ;; esac
    seen="$seen $name"
    compgen -G "$root/fuzz/regressions/*/$name" >/dev/null && continue
    min=$dir/min/$name
    rm -f "$min"
    "$bin/fuzz_$t" -minimize_crash=1 -max_total_time=60 -timeout=$((timeout_s * 2)) -rss_limit_mb=$rss_mb \
      -exact_artifact_path="$min" "$f" >"$dir/min/$name.log" 2>&1 || true
    # A minimised input that fails differently keeps the original.
    if [ ! -s "$min" ] || [ "$(name_of "$t" "$min")" != "$name" ]; then cp "$f" "$min"; fi
    cp "$min" "$root/fuzz/regressions/$t/$name"
    reproduce "$t" "$min" >"$dir/min/$name.report"
    echo "$name" >>"$dir/new-regressions"
  done
}

run_target() {
  local t=$1 dir=$work/$1
  mkdir -p "$dir/corpus"
  rm -rf "$dir/artifacts"
  mkdir -p "$dir/artifacts"
  local args=(-fork=1 -ignore_crashes=1 -ignore_timeouts=1 -ignore_ooms=1 -print_funcs=0
              -max_total_time="$seconds" -timeout=$timeout_s -rss_limit_mb=$rss_mb
              -dict="$work/dicts/$t.dict" -artifact_prefix="$dir/artifacts/")
  [ -z "${FUZZ_MAX_LEN:-}" ] || args+=(-max_len="$FUZZ_MAX_LEN")
  "$bin/fuzz_$t" "${args[@]}" "$dir/corpus" "$work/seeds/$t" >"$dir/fuzz.log" 2>&1 || true
  triage "$t"
}

count() { { find "$1" -maxdepth 1 -name "$2-*" 2>/dev/null || true; } | wc -l; }

print_table() {
  local t dir last execs cov ft corp secs rate found fresh
  echo
  printf '%-11s %10s %7s %6s %6s %6s  %-21s %s\n' target execs exec/s cov ft corp "crash/timeout/oom/leak" "new regressions"
  for t in "${targets[@]}"; do
    dir=$work/$t
    last=$(grep -sE '^#[0-9]+: cov:' "$dir/fuzz.log" | tail -1 || true)
    execs=$(sed -E 's/^#([0-9]+):.*/\1/' <<<"$last")
    cov=$(sed -E 's/.* cov: ([0-9]+).*/\1/' <<<"$last")
    ft=$(sed -E 's/.* ft: ([0-9]+).*/\1/' <<<"$last")
    corp=$(sed -E 's/.* corp: ([0-9]+).*/\1/' <<<"$last")
    secs=$(sed -E 's/.* time: ([0-9]+)s.*/\1/' <<<"$last")
    rate=$([ -n "$execs" ] && [ "${secs:-0}" -gt 0 ] && echo $((execs / secs)) || echo -)
    found="$(count "$dir/artifacts" crash)/$(count "$dir/artifacts" timeout)/$(count "$dir/artifacts" oom)/$(count "$dir/artifacts" leak)"
    fresh=$(paste -sd' ' "$dir/new-regressions" 2>/dev/null || true)
    printf '%-11s %10s %7s %6s %6s %6s  %-21s %s\n' "$t" "${execs:--}" "$rate" "${cov:--}" "${ft:--}" "${corp:--}" \
      "$found" "${fresh:--}"
  done
}

cleanup() {
  local p
  for p in "${pids[@]}"; do kill_tree "$p"; done
  wait 2>/dev/null || true
  [ -z "$scratch" ] || rm -rf "$scratch"
}

kill_tree() {
  local child
  for child in $(pgrep -P "$1" || true); do kill_tree "$child"; done
  kill "$1" 2>/dev/null || true
}

main() {
  local t d
  while [ $# -gt 0 ]; do
    case $1 in
      -j) jobs=$2; shift 2 ;;
      -j*) jobs=${1#-j}; shift ;;
      -t) IFS=, read -r -a targets <<<"$2"; shift 2 ;;
      --no-build) build_first=0; shift ;;
      --triage-only) triage_only=1; build_first=0; shift ;;
      -h|--help) usage ;;
      [0-9]*) seconds=$1; shift ;;
      *) usage ;;
    esac
  done

  if [ "$build_first" = 1 ]; then
    echo "== building the fuzz targets in $build"
    CC=clang CXX=clang++ cmake -S "$root" -B "$build" -DCMAKE_BUILD_TYPE=RelWithDebInfo \
      -DMETAINFO_FUZZ=ON -DMETAINFO_TESTS=OFF >/dev/null
    cmake --build "$build" -j 2 >/dev/null
  fi
  for t in "${targets[@]}"; do
    [ -x "$bin/fuzz_$t" ] || { echo "no target $t (targets: ${all_targets[*]})" >&2; exit 2; }
  done

  mkdir -p "$work"
  scratch=$(mktemp -d /dev/shm/metainfo-fuzz-run.XXXXXX 2>/dev/null || mktemp -d)
  trap cleanup EXIT
  trap 'exit 130' INT TERM
  # The targets' scratch files and libFuzzer's fork-mode folders live there.
  export METAINFO_FUZZ_TMP=$scratch TMPDIR=$scratch
  export ASAN_OPTIONS=${ASAN_OPTIONS:-detect_leaks=1:dedup_token_length=3}
  export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1:dedup_token_length=3}

  if [ "$triage_only" = 1 ]; then
    for t in "${targets[@]}"; do echo "== triage $t"; triage "$t"; done
    print_table
    return
  fi

  echo "== seeds"
  rm -rf "$work/seeds"
  rm -rf "$work/media"
  "$root/fuzz/make_media.sh" "$work/media"
  "$bin/metainfo_make_seeds" "$work/seeds" "$root/samples" "$work/media" "$root/../shared/corpus"
  mkdir -p "$work/dicts"
  for t in "${targets[@]}"; do
    : >"$work/dicts/$t.dict"
    for d in $(dicts_of "$t"); do cat "$root/fuzz/dicts/$d.dict" >>"$work/dicts/$t.dict"; done
  done

  echo "== fuzzing ${targets[*]}: ${seconds}s each, $jobs at a time (logs in $work/<target>/fuzz.log)"
  for t in "${targets[@]}"; do
    while [ "$(jobs -rp | wc -l)" -ge "$jobs" ]; do wait -n || true; done
    echo "  start $t"
    run_target "$t" &
    pids+=($!)
  done
  wait || true
  pids=()
  print_table
}

# The whole file is read before anything runs, so that editing it does not
# disturb a run in progress.
main "$@"
exit
