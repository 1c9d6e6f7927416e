#!/usr/bin/env bash
# Prepares the minimal Debian 12 in which the package tests install our Debian package:
#   bash tests/package/prepare-root.sh ROOT DEB
# ROOT/pristine is `debootstrap --variant=minbase bookworm` from this machine's configured Debian
# mirror (made once and kept), with every package that installing DEB and a desktop's opener need
# downloaded into its apt cache, so that the tests install offline, in a network namespace of their
# own. Prints why and exits non-zero when it cannot (not root, no debootstrap, no mirror reachable).
# ROOT/pristine/.ready says it is ready; otherwise ROOT/not-ready says why, for the tests to report.
set -u
root=${1:?root folder} deb=${2:?Debian package}
mkdir -p "$root" && root=$(cd "$root" && pwd)
pristine=$root/pristine
rm -f "$root/not-ready" "$pristine/.ready"
say() { printf 'prepare-root: %s\n' "$*"; }
fail() { say "$*"; printf '%s\n' "$*" >"$root/not-ready"; exit 3; }
[ "$(id -u)" = 0 ] || fail "needs root (debootstrap, chroot)"
command -v debootstrap >/dev/null || fail "debootstrap is missing (make deps installs it)"
[ -f "$deb" ] || fail "no package $deb (make package)"

# The mirror this machine's own apt uses for Debian 12, whichever way its sources are written.
mirror=$(apt-cache policy | awk '$3 == "bookworm/main" && $4 == "amd64" { print $2; exit }')
[ -n "$mirror" ] || fail "no Debian 12 mirror among this machine's apt sources"

if [ ! -e "$pristine/.minbase" ]; then
  rm -rf "$pristine"
  say "debootstrap --variant=minbase bookworm from $mirror"
  timeout 900 debootstrap --variant=minbase bookworm "$pristine" "$mirror" >"$root/debootstrap.log" 2>&1 ||
    { tail -5 "$root/debootstrap.log"; fail "debootstrap from $mirror failed"; }
  touch "$pristine/.minbase"
fi

# The desktop pieces a user's machine brings: the opener (gio), xdg-mime, and the databases that
# dpkg's triggers update when a package adds a desktop entry or a document type.
cp /etc/resolv.conf "$pristine/etc/resolv.conf"
cp "$deb" "$pristine/tmp/package.deb"
timeout 900 chroot "$pristine" sh -c 'apt-get update -q && apt-get install -q -y --download-only \
    /tmp/package.deb libglib2.0-bin xdg-utils desktop-file-utils shared-mime-info' >"$root/download.log" 2>&1 ||
  { tail -5 "$root/download.log"; fail "the package's dependencies could not be downloaded from $mirror"; }
touch "$pristine/.ready"
say "ready: $pristine"
