#!/usr/bin/env bash
# Builds the library, the metainfo tool and the whole test suite for a 32-bit
# target and runs them there: armhf with Debian's cross compiler under
# qemu-user, i386 with gcc -m32 natively. Then compares what the target's
# "metainfo probe --json" says with what the host's says, file by file, over
# samples/, the tests' byte-built files of every format, ../shared/corpus/ and
# sparse files of 3 and 5 GiB.
#
#   tools/cross-test.sh [armhf|i386] [SPARSE_DIR] [--clean]
#
# SPARSE_DIR (or $METAINFO_SPARSE_DIR; build-<target>/sparse by default) is
# filled by the host's SparseFiles tests, then compared with the rest. --clean rebuilds everything, so that every
# compiler warning is shown again. As root, installs what the target needs:
# Debian's multilib and armhf cross compilers exclude each other, so one set
# replaces the other. Exits 1 when a test fails or an answer differs, 2 when
# nothing could be built.
set -uo pipefail
caller_dir=$PWD
cd "$(dirname "$0")/.."
root=$PWD

target=armhf
sparse_dir=${METAINFO_SPARSE_DIR:-}
clean=""
for arg in "$@"; do
  case $arg in
    armhf|i386) target=$arg ;;
    --clean) clean=--clean-first ;;
    -h|--help) sed -n '2,15p' "$0" | sed 's/^# \{0,1\}//'; exit 0 ;;
    -*) echo "unknown option: $arg" >&2; exit 2 ;;
    *) sparse_dir=$arg ;;
  esac
done

# A relative SPARSE_DIR is taken from where the script was started.
[ -n "$sparse_dir" ] && [ "${sparse_dir#/}" = "$sparse_dir" ] && sparse_dir=$caller_dir/$sparse_dir
bdir=$root/build-$target
[ -n "$sparse_dir" ] || sparse_dir=$bdir/sparse
hostdir=$root/build
jobs=2
mkdir -p "$bdir"
start_all=$(date +%s)
phase_times=()
phase_start=$start_all
end_phase() {
  local now; now=$(date +%s)
  phase_times+=("$1 $((now - phase_start))s")
  phase_start=$now
}
say() { printf '== %s\n' "$*"; }
die() { printf 'cross-test: %s\n' "$*" >&2; exit 2; }

# ---------------------------------------------------------------- packages

installed() { [ "$(dpkg-query -W -f='${db:Status-Abbrev}' "$1" 2>/dev/null)" = "ii " ]; }

# apt-get, waiting while another apt or dpkg holds the lock.
apt_log=$bdir/apt.log
apt_run() {
  local try out
  for try in 1 2 3 4 5 6 7 8 9 10; do
    out=$(DEBIAN_FRONTEND=noninteractive apt-get -y -qq -o DPkg::Lock::Timeout=120 "$@" 2>&1)
    local rc=$?
    printf '%s\n' "$out" >>"$apt_log"
    [ $rc -eq 0 ] && return 0
    if printf '%s' "$out" | grep -qiE 'could not get lock|unable to acquire|is held by'; then
      echo "   apt is busy (lock held), retrying in 20 s"
      sleep 20
      continue
    fi
    printf '%s\n' "$out" | tail -5 >&2
    return 1
  done
  return 1
}

common_pkgs=(cmake make g++ libgtest-dev googletest ffmpeg)
case $target in
  armhf)
    want=("${common_pkgs[@]}" crossbuild-essential-armhf g++-arm-linux-gnueabihf qemu-user qemu-user-binfmt)
    drop=(gcc-multilib g++-multilib) ;;
  i386)
    want=("${common_pkgs[@]}" gcc-multilib g++-multilib)
    # Every gcc-N for armhf conflicts with gcc-multilib; the cross meta
    # packages go with them.
    mapfile -t drop < <(dpkg-query -W -f='${Package}\n' 'gcc-*-arm-linux-gnueabihf' 2>/dev/null)
    drop+=(crossbuild-essential-armhf gcc-arm-linux-gnueabihf g++-arm-linux-gnueabihf) ;;
esac

say "packages for $target"
missing=(); remove=()
for p in "${want[@]}"; do installed "$p" || missing+=("$p"); done
for p in "${drop[@]}"; do installed "$p" && remove+=("$p-"); done
if [ ${#missing[@]} -eq 0 ] && [ ${#remove[@]} -eq 0 ]; then
  echo "   all installed"
elif [ "$(id -u)" -ne 0 ]; then
  die "missing: ${missing[*]}${remove:+; conflicting: ${remove[*]%-}} (run as root to install)"
else
  echo "   installing: ${missing[*]:-none}; removing: ${remove[*]:-none}"
  : >"$apt_log"
  apt_run update || die "apt-get update failed (see $apt_log)"
  apt_run install --no-install-recommends "${missing[@]}" "${remove[@]}" \
    || die "apt-get install failed (see $apt_log)"
fi

# How target programs are started. ARM programs run under qemu against the
# cross toolchain's libraries; the kernel's binfmt handler lets programs the
# tests start themselves (the metainfo tool) run the same way.
run_target=()
binfmt_note=""
if [ "$target" = armhf ]; then
  sysroot=/usr/arm-linux-gnueabihf
  export QEMU_LD_PREFIX=$sysroot
  run_target=(qemu-arm -L "$sysroot")
  bf=/proc/sys/fs/binfmt_misc
  [ -e $bf/register ] || mount -t binfmt_misc binfmt_misc $bf 2>/dev/null
  if [ ! -e $bf/qemu-arm ] && [ -w $bf/register ] && [ -f /usr/lib/binfmt.d/qemu-arm.conf ]; then
    grep -v '^#' /usr/lib/binfmt.d/qemu-arm.conf >$bf/register 2>/dev/null
  fi
  [ -e $bf/qemu-arm ] && ! grep -q '^enabled' $bf/qemu-arm && echo 1 >$bf/qemu-arm 2>/dev/null
  if [ -e $bf/qemu-arm ] && grep -q '^enabled' $bf/qemu-arm; then
    binfmt_note="ARM programs run directly through binfmt_misc (qemu-arm)"
  else
    binfmt_note="no binfmt_misc handler for ARM: tests that start the tool themselves will fail"
  fi
  echo "   $binfmt_note"
fi
end_phase install

# ---------------------------------------------------------------- builds

toolchain=$root/cmake/toolchains/$target.cmake
[ -f "$toolchain" ] || die "no toolchain file $toolchain"

# GoogleTest from Debian's sources, built for the target with its toolchain.
gtest_prefix=$bdir/googletest
if [ ! -f "$gtest_prefix/lib/cmake/GTest/GTestConfig.cmake" ]; then
  say "GoogleTest for $target"
  { cmake -S /usr/src/googletest -B "$bdir/googletest-build" -DCMAKE_TOOLCHAIN_FILE="$toolchain" \
      -DCMAKE_BUILD_TYPE=Release -DBUILD_GMOCK=OFF -DCMAKE_INSTALL_PREFIX="$gtest_prefix" \
      -DCMAKE_INSTALL_LIBDIR=lib \
    && cmake --build "$bdir/googletest-build" -j $jobs \
    && cmake --install "$bdir/googletest-build"; } >"$bdir/googletest.log" 2>&1 \
    || { tail -20 "$bdir/googletest.log"; die "GoogleTest did not build for $target"; }
fi

# The host's tool (and tests, which write the sparse files) for the comparison.
say "host build ($hostdir)"
host_targets=(--target metainfo_cli --target metainfo_tests --target metainfo_make_seeds)
{ [ -f "$hostdir/CMakeCache.txt" ] || cmake -S . -B "$hostdir" -DCMAKE_BUILD_TYPE=RelWithDebInfo; } \
  >"$bdir/host-build.log" 2>&1 \
  && cmake --build "$hostdir" -j $jobs "${host_targets[@]}" >>"$bdir/host-build.log" 2>&1 \
  || { tail -20 "$bdir/host-build.log"; die "the host build failed"; }
end_phase host-build

# The Java binding has no target JDK: it is left out. Warnings are errors
# here too: where 32-bit sizes narrow, -Wconversion says so.
say "build for $target ($bdir)"
cmake -S . -B "$bdir" -DCMAKE_TOOLCHAIN_FILE="$toolchain" -DCMAKE_BUILD_TYPE=RelWithDebInfo \
  -DCMAKE_DISABLE_FIND_PACKAGE_JNI=ON -DGTest_DIR="$gtest_prefix/lib/cmake/GTest" -DMETAINFO_WERROR=ON \
  >"$bdir/configure.log" 2>&1 \
  || { tail -20 "$bdir/configure.log"; die "configuring for $target failed"; }
cmake --build "$bdir" -j $jobs $clean >"$bdir/build.log" 2>&1
build_rc=$?
warnings=$(grep -E '^[^ ]+:[0-9]+:[0-9]+: warning:' "$bdir/build.log" | sed "s|^$root/||" | sort -u)
warning_count=0
[ -n "$warnings" ] && warning_count=$(printf '%s\n' "$warnings" | wc -l)
if [ "$warning_count" -gt 0 ]; then
  echo "   $warning_count warning(s) from the files compiled in this run:"
  printf '%s\n' "$warnings" | sed 's/^/   /'
fi
if [ $build_rc -ne 0 ]; then
  grep -E 'error|Error' "$bdir/build.log" | head -20
  die "the build for $target failed (see $bdir/build.log)"
fi
end_phase build

# ---------------------------------------------------------------- the suite

say "test suite on $target"
# The tests' temporary folders go under the build folder, which is emptied
# afterwards whatever the tests left. The target's SparseFiles tests keep
# their files there too, never in the folder the host's tests fill.
test_tmp=$bdir/tmp
rm -rf "$test_tmp"; mkdir -p "$test_tmp"
TMPDIR=$test_tmp env -u METAINFO_SPARSE_DIR ctest --test-dir "$bdir" -j $jobs --timeout 900 --output-on-failure \
  >"$bdir/ctest.log" 2>&1
ctest_rc=$?
left_behind=$(find "$test_tmp" -mindepth 1 -maxdepth 1 | wc -l)
rm -rf "$test_tmp"

total=$(sed -nE 's/.*tests? failed out of ([0-9]+).*/\1/p' "$bdir/ctest.log" | tail -1)
failed=$(sed -nE 's/.* ([0-9]+) tests? failed out of.*/\1/p' "$bdir/ctest.log" | tail -1)
failed_list=$(sed -n '/^The following tests FAILED:/,/^[^[:space:]]/p' "$bdir/ctest.log" | grep -E '^\s+[0-9]+ - ')
skipped_list=$(grep -E '^\s+[0-9]+ - .*\((Skipped|Not Run|Disabled)\)' "$bdir/ctest.log")
skipped=0; [ -n "$skipped_list" ] && skipped=$(printf '%s\n' "$skipped_list" | wc -l)
suite_ok=1
if [ -z "$total" ]; then
  suite_ok=0; total=0; failed=0; passed=0
  tail -20 "$bdir/ctest.log"
  echo "   ctest printed no summary (see $bdir/ctest.log)"
else
  passed=$((total - failed - skipped))
  [ "$failed" -eq 0 ] && [ $ctest_rc -eq 0 ] || suite_ok=0
fi
echo "   $passed passed, $failed failed, $skipped skipped of $total"
if [ -n "$failed_list" ]; then
  echo "   failed:"
  printf '%s\n' "$failed_list" | sed -E 's/^\s+/     /'
  echo "   (their output: $bdir/ctest.log)"
fi
if [ -n "$skipped_list" ]; then
  echo "   skipped, with the reason each test gave:"
  awk '/^[0-9]+\/[0-9]+ Test: /{name=$3} /: Skipped$/{getline msg; print "     " name ": " msg}' \
    "$bdir/Testing/Temporary/LastTest.log"
fi
[ "$left_behind" -gt 0 ] && echo "   tests left $left_behind temporary folder(s) behind (removed)"
end_phase suite

# ---------------------------------------------------------------- sparse files

sparse_note=""
host_sparse_ok=1
if [ -n "$sparse_dir" ]; then
  say "large sparse files in $sparse_dir"
  mkdir -p "$sparse_dir"
  if "$hostdir/tests/metainfo_tests" --gtest_list_tests --gtest_filter='SparseFiles*' \
      | grep -q '^  '; then
    METAINFO_SPARSE_DIR=$sparse_dir "$hostdir/tests/metainfo_tests" --gtest_filter='SparseFiles*' \
      >"$bdir/sparse.log" 2>&1 || host_sparse_ok=0
    sparse_note="written by the host's SparseFiles tests ($([ $host_sparse_ok = 1 ] && echo passed || echo FAILED, see $bdir/sparse.log))"
  else
    sparse_note="no SparseFiles test in the host build yet: compared what the folder holds"
  fi
  echo "   $sparse_note"
fi
end_phase sparse

# ---------------------------------------------------------------- comparison

say "comparison: host metainfo probe --json against $target"
files=()
for f in samples/*; do [ -f "$f" ] && files+=("$f"); done
rm -rf "$bdir/fixtures"
if "$hostdir/fuzz/metainfo_make_seeds" "$bdir/fixtures" >/dev/null 2>&1; then
  mapfile -t -O ${#files[@]} files < <(find "$bdir/fixtures/detect" -type f | LC_ALL=C sort)
else
  echo "   the byte-built files could not be written: they are left out"
fi
if [ -d ../shared/corpus ]; then
  mapfile -t -O ${#files[@]} files < <(find ../shared/corpus -type f | LC_ALL=C sort)
else
  echo "   no ../shared/corpus: the corpus is left out"
fi
if [ -n "$sparse_dir" ] && [ -d "$sparse_dir" ]; then
  mapfile -t -O ${#files[@]} files < <(find "$sparse_dir" -type f | LC_ALL=C sort)
fi

# One line per file: the exit status, then what the tool printed.
probe_line() {
  local out rc
  out=$("$@" 2>&1 | tr '\n' ' ')
  rc=${PIPESTATUS[0]}
  printf 'exit=%s %s\n' "$rc" "${out% }"
}

# The keys whose values differ between two lines of probe_line.
differing_keys() {
  command -v python3 >/dev/null 2>&1 || return 0
  python3 -c '
import json, sys
def parse(line):
    status, _, rest = line.partition(" ")
    try:
        return status, json.loads(rest)
    except ValueError:
        return status, None
def show(v):
    if v is None:
        return "absent"
    if isinstance(v, dict):
        return "{%d keys}" % len(v)
    return json.dumps(v)
def walk(h, t, prefix):
    for key in list(h) + [k for k in t if k not in h]:
        a, b = h.get(key), t.get(key)
        if isinstance(a, dict) and isinstance(b, dict):
            walk(a, b, prefix + key + ".")
        elif a != b:
            print("key %s%s: host %s, target %s" % (prefix, key, show(a), show(b)))
(hs, hv), (ts, tv) = parse(sys.argv[1]), parse(sys.argv[2])
if hs != ts:
    print("key (exit status): host %s, target %s" % (hs[5:], ts[5:]))
if isinstance(hv, dict) and isinstance(tv, dict):
    walk(hv, tv, "")
' "$1" "$2"
}

cmp_dir=$bdir/compare
mkdir -p "$cmp_dir"
: >"$cmp_dir/host.txt"; : >"$cmp_dir/target.txt"; : >"$cmp_dir/differences.txt"
differences=0
for f in "${files[@]}"; do
  h=$(probe_line "$hostdir/metainfo" probe --json "$f")
  t=$(probe_line "${run_target[@]}" "$bdir/metainfo" probe --json "$f")
  printf '%s\n' "$h" >>"$cmp_dir/host.txt"
  printf '%s\n' "$t" >>"$cmp_dir/target.txt"
  [ "$h" = "$t" ] && continue
  differences=$((differences + 1))
  { echo "DIFF $f"
    echo "  host:   $h"
    echo "  target: $t"
    differing_keys "$h" "$t" | sed 's/^/  /'
  } >>"$cmp_dir/differences.txt"
done
compared=${#files[@]}
echo "   $compared files compared, $differences differences"
[ "$differences" -gt 0 ] && sed 's/^/   /' "$cmp_dir/differences.txt"
echo "   (outputs: $cmp_dir/host.txt, $cmp_dir/target.txt)"
end_phase compare

# ---------------------------------------------------------------- summary

elapsed=$(( $(date +%s) - start_all ))
case $target in
  armhf) describe="armhf (arm-linux-gnueabihf-g++ $(arm-linux-gnueabihf-g++ -dumpfullversion 2>/dev/null), $(qemu-arm --version | head -1 | sed -E 's/.*version ([^ ]+).*/qemu-arm \1/'))" ;;
  i386)  describe="i386 (g++ $(g++ -dumpfullversion 2>/dev/null) -m32, native)" ;;
esac
result=PASS
[ $suite_ok -eq 1 ] && [ "$differences" -eq 0 ] && [ $host_sparse_ok -eq 1 ] || result=FAIL
echo
say "cross-test summary"
echo "target:      $describe"
[ -n "$binfmt_note" ] && echo "binfmt:      $binfmt_note"
echo "warnings:    $warning_count (files compiled in this run; --clean shows all)"
echo "suite:       $passed passed, $failed failed, $skipped skipped"
[ -n "$failed_list" ] && printf '%s\n' "$failed_list" | sed -E 's/^\s+[0-9]+ - /             failed: /; s/ \(Failed\)$//'
echo "comparison:  $compared files compared, $differences differences"
[ -n "$sparse_note" ] && echo "sparse:      $sparse_note"
echo "time:        ${elapsed}s (${phase_times[*]})"
echo "result:      $result"
[ $result = PASS ]
