#!/usr/bin/env bash
# Builds the Linux launcher and both Windows architectures and runs every test suite: the host unit
# tests through ctest, the scenario table (tests/table) through pytest for the Linux build with the
# real JVM and once per Windows architecture that Wine can run here; the summary says plainly which
# architectures were tested. Exit code non-zero when any suite failed or nothing could be tested.
set -u
build=${1:-build}
jobs=$(nproc)
passed=0; failed=0; skips=0; tested=(); skipped=(); notrun=(); status=0

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

# The table under Debian's pytest. Where root may, in a network namespace of its own: the hand-off
# port 6152 is machine-wide, and another run on the same machine must not answer our launches.
run_table() {  # platform
  echo "=== $1: the scenario table (pytest)"
  local out cmd isolate=()
  out=$(mktemp)
  cmd="/usr/bin/python3 -m pytest tests/table -p no:cacheprovider -q -rfE --build '$build' --platforms $1"
  unshare -n sh -c "ip link set lo up" 2>/dev/null && isolate=(unshare -n)
  "${isolate[@]}" sh -c "ip link set lo up 2>/dev/null; $cmd" 2>&1 | tee "$out"
  local rc=${PIPESTATUS[0]} line n before=$failed
  line=$(grep -E '[0-9]+ (passed|failed|errors?|skipped).* in [0-9.]+s' "$out" | tail -n 1)
  for n in $(grep -oE '[0-9]+ passed' <<<"$line" | grep -oE '^[0-9]+'); do passed=$((passed + n)); done
  for n in $(grep -oE '[0-9]+ (failed|errors?)' <<<"$line" | grep -oE '^[0-9]+'); do failed=$((failed + n)); done
  for n in $(grep -oE '[0-9]+ skipped' <<<"$line" | grep -oE '^[0-9]+'); do skips=$((skips + n)); done
  rm -f "$out"
  [ "$rc" -eq 0 ] || { status=1; [ "$failed" -gt "$before" ] || failed=$((failed + 1)); }
}

build_dir() {  # dir
  echo "=== building $1"
  cmake --build "$1" -j "$jobs" || { echo "BUILD FAILED: $1"; status=1; return 1; }
}

# What Wine can run is found out by executing its loaders, not by asking dpkg: some machines have
# wine32 installed but cannot execute 32-bit programs at all ("Exec format error").
can_run_arch() {  # arch
  case "$1" in
    i686) /usr/lib/wine/wine --version >/dev/null 2>&1 ;;
    x86_64) /usr/lib/wine/wine64 --version >/dev/null 2>&1 ;;
  esac
}

if build_dir "$build/linux"; then
  run_suite host "$build/linux"
  run_table linux-x86_64
fi

for arch in i686 x86_64; do
  build_dir "$build/$arch" || continue
  if ! can_run_arch "$arch"; then
    if [ "$arch" = i686 ] && ! /lib/ld-linux.so.2 --version >/dev/null 2>&1 && [ -e /lib/ld-linux.so.2 ]; then
      echo "=== i686: built, not run: this machine cannot execute 32-bit programs"
      notrun+=("i686: built, not run: this machine cannot execute 32-bit programs")
    else
      echo "=== $arch: Wine cannot run $arch programs here; its suite is NOT tested"
      skipped+=("$arch"); status=1
    fi
    continue
  fi
  run_table "wine-$arch"
  tested+=("$arch")
done

echo
echo "Windows architectures tested under Wine: ${tested[*]:-none}${skipped:+ (not tested: ${skipped[*]})}"
for line in "${notrun[@]}"; do echo "$line"; done
[ ${#tested[@]} -gt 0 ] || { echo "no Windows architecture was tested"; status=1; }
echo "(skipped: tests that need the Java test application, which only the Linux build hosts)"
echo "all suites: $passed passed, $failed failed, $skips skipped"
exit $status
