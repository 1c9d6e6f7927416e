#!/usr/bin/env bash
# Builds the host and both Windows architectures and runs every test suite through ctest.
# The Wine suites run only where Wine can run that architecture; the summary says plainly which
# architectures were tested. Exit code non-zero when any suite failed or nothing could be tested.
set -u
build=${1:-build}
jobs=$(nproc)
passed=0; failed=0; tested=(); skipped=(); status=0

run_suite() {  # name dir [ctest args...]
  local name=$1 dir=$2; shift 2
  echo "=== $name: ctest in $dir"
  local out
  out=$(mktemp)
  (cd "$dir" && ctest --output-on-failure --no-tests=error "$@") 2>&1 | tee "$out"
  local rc=${PIPESTATUS[0]}
  local line
  line=$(grep -E 'tests passed, [0-9]+ tests? failed out of [0-9]+' "$out" | tail -n 1)
  if [ -n "$line" ]; then
    local f t
    f=$(sed -E 's/.* ([0-9]+) tests? failed out of ([0-9]+).*/\1/' <<<"$line")
    t=$(sed -E 's/.* failed out of ([0-9]+).*/\1/' <<<"$line")
    passed=$((passed + t - f)); failed=$((failed + f))
  fi
  rm -f "$out"
  [ "$rc" -eq 0 ] || status=1
}

build_dir() {  # dir
  echo "=== building $1"
  cmake --build "$1" -j "$jobs" || { echo "BUILD FAILED: $1"; status=1; return 1; }
}

can_run_arch() {  # arch
  case "$1" in
    i686) dpkg -s wine32:i386 >/dev/null 2>&1 ;;
    x86_64) command -v wine64 >/dev/null 2>&1 || [ -x /usr/lib/wine/wine64 ] ;;
  esac
}

if build_dir "$build/host"; then run_suite host "$build/host"; fi

for arch in i686 x86_64; do
  if ! can_run_arch "$arch"; then
    echo "=== $arch: Wine cannot run $arch programs on this machine; its suite is NOT tested"
    skipped+=("$arch"); status=1
    continue
  fi
  if build_dir "$build/$arch"; then
    run_suite "wine-$arch" "$build/$arch"
    tested+=("$arch")
  fi
done

echo
echo "Windows architectures tested under Wine: ${tested[*]:-none}${skipped:+ (not tested: ${skipped[*]})}"
echo "all suites: $passed passed, $failed failed"
exit $status
