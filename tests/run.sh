#!/usr/bin/env bash
# Every suite: the host tests through ctest (the pure pieces under ASan and UBSan; 20 s of each fuzz
# target, built by the fuzz preset), a check that every planted fault still applies to the source,
# then the scenario table through pytest, once for every platform this machine can run: the Linux build
# with the real JVM, and each Windows architecture Wine can execute (found by executing its loader).
# Says plainly what it could not run; fails when a suite fails or no Windows build was tested. The
# builds are the CMake presets', in build/<preset>.
set -u
cd "$(dirname "$0")/.." || exit 2
build=build platforms=linux-x86_64 status=0 notes=()
{ cmake --preset linux >/dev/null && cmake --build --preset linux && ctest --preset linux; } || status=1
{ cmake --preset fuzz >/dev/null && cmake --build --preset fuzz && ctest --preset fuzz; } || status=1
/usr/bin/python3 tests/table/faults.py --check || status=1
for arch in i686 x86_64; do
  { cmake --preset "$arch" >/dev/null && cmake --build --preset "$arch"; } || { status=1; continue; }
  loader=/usr/lib/wine/wine; [ "$arch" = x86_64 ] && loader=/usr/lib/wine/wine64
  if "$loader" --version >/dev/null 2>&1; then platforms+=",wine-$arch"
  elif [ "$arch" = i686 ] && [ -e /lib/ld-linux.so.2 ] && ! /lib/ld-linux.so.2 --version >/dev/null 2>&1; then
    notes+=("i686: built, not run: this machine cannot execute 32-bit programs")
  else notes+=("$arch: built, NOT tested: Wine cannot run it here"); status=1; fi
done
[[ $platforms == *wine* ]] || { notes+=("no Windows architecture was tested"); status=1; }
# The Debian package's tests install it into a minimal Debian 12 with its dependencies downloaded
# beforehand, here, where the network is (the table then runs without one).
bash tests/package/prepare-root.sh "$build/linux/package-root" dist/qz-lumiscope-qz57_*_amd64.deb ||
  notes+=("Debian package: not installed: $(cat "$build/linux/package-root/not-ready" 2>/dev/null)")
# In a network namespace of its own where root may: the hand-off port 6152 is machine-wide.
isolate=(); unshare -n true 2>/dev/null && isolate=(unshare -n)
"${isolate[@]}" sh -c 'ip link set lo up 2>/dev/null; exec /usr/bin/python3 -m pytest tests/table -p no:cacheprovider -q -rfEs \
  --build "$0" --platforms "$1"' "$build" "$platforms" || status=1
echo "platforms tested: $platforms"; printf '%s\n' "${notes[@]}"
echo "all suites: $([ $status = 0 ] && echo passed || echo FAILED)"; exit $status
