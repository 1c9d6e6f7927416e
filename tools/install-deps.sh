#!/usr/bin/env bash
# Installs everything the build and the test suite need on a fresh Debian 12 machine.
# Run as root. Safe to run again: apt skips what is already there.
#
# 32-bit Wine (wine32:i386) is tried with a plain install first. When the mirror's i386 and amd64
# security indexes disagree, the plain install cannot resolve the Multi-Arch "same" libraries; the
# fallback then pins the security suite down and takes the point-release versions of the packages
# libwine:i386 pulls in. The script says which way it went. If neither works, the 64-bit build is
# still tested and the test run says that i686 was skipped.
set -u
export DEBIAN_FRONTEND=noninteractive
log() { printf '[install-deps] %s\n' "$*"; }

APT_OPTS=(-y -q -o Dpkg::Use-Pty=0)

BASE_PKGS=(
  cmake ninja-build make python3
  g++-mingw-w64-i686 g++-mingw-w64-x86-64 binutils-mingw-w64-i686 binutils-mingw-w64-x86-64
  wine wine64 xvfb xdotool x11-utils imagemagick xcompmgr
  g++ libx11-dev
  openbox wmctrl fonts-symbola              # the Linux desktop: window manager, demo, emoji glyphs
  libx11-6 libxext6 libxi6 libxrender1 libxtst6  # what the private runtime's Swing needs at run time
  python3-pytest python3-xlib strace iproute2 util-linux  # the scenario table, in network namespaces of its own
  python3-matplotlib time                   # make bench: the plot, peak memory
  clang libclang-rt-dev  # libFuzzer: the fuzz targets of tests/host
  openjdk-17-jdk-headless                   # jni.h, javac, jlink and the jmods of the private runtime
  dpkg-dev nsis                             # make package: dpkg-shlibdeps for the Debian package, makensis
  lintian appstream desktop-file-utils      # the package checks
  debootstrap                               # a minimal Debian 12 to install the package into
  binutils                                  # strip: the private runtime's native files
  openjdk-17-jre                            # make bench: Debian's own java with Swing, beside the launcher
)

if ! dpkg --print-foreign-architectures | grep -qx i386; then
  dpkg --add-architecture i386
fi
log "apt-get update"
apt-get update -q || log "apt-get update reported errors (continuing; a partial index is common on a syncing mirror)"

log "installing base packages"
apt-get install "${APT_OPTS[@]}" --no-install-recommends "${BASE_PKGS[@]}" || {
  log "base install failed"; exit 1; }

have_wine32() { dpkg -s wine32:i386 >/dev/null 2>&1; }

if have_wine32; then
  log "32-bit Wine already installed"
else
  log "installing 32-bit Wine (plain)"
  if apt-get install "${APT_OPTS[@]}" --no-install-recommends wine32:i386; then
    log "32-bit Wine: plain install worked"
  else
    log "32-bit Wine: plain install failed; retrying with the security suite pinned down"
    prefs=$(mktemp)
    cat >"$prefs" <<'PIN'
Package: *
Pin: release l=Debian-Security
Pin-Priority: 100
PIN
    pinned=()
    for p in libgstreamer-plugins-base1.0-0 gstreamer1.0-plugins-base gstreamer1.0-x gstreamer1.0-plugins-good; do
      v=$(apt-cache -o Dir::Etc::Preferences="$prefs" policy "$p:i386" | awk '/Candidate:/ {print $2}')
      if [ -n "$v" ] && [ "$v" != "(none)" ]; then
        pinned+=("$p:i386=$v" "$p:amd64=$v")
      fi
    done
    if apt-get install "${APT_OPTS[@]}" -o Dir::Etc::Preferences="$prefs" --allow-downgrades \
         --no-install-recommends wine32:i386 "${pinned[@]}"; then
      log "32-bit Wine: installed with the pinned fallback"
    else
      log "32-bit Wine: could not be installed; i686 tests will be skipped and reported as such"
    fi
    rm -f "$prefs"
  fi
fi
exit 0
