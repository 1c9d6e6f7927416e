#!/usr/bin/env bash
# Makes the application's private Java runtime: OUT_DIR/jre, linked with jlink from Debian's OpenJDK 17.
#   tools/make-jre.sh OUT_DIR
# Modules: java.desktop (the demo's Swing frame) and java.management (the test application reads the VM's
# input arguments). The JDK folder is named explicitly: a machine may carry other JDKs under /usr/lib/jvm.
# Skipped when OUT_DIR/jre/release is newer than this script, so a re-run costs nothing.
set -euo pipefail

JDK=/usr/lib/jvm/java-17-openjdk-amd64
MODULES=java.desktop,java.management

die() { printf 'make-jre: %s\n' "$*" >&2; exit 1; }

[ $# -eq 1 ] || die "usage: make-jre.sh OUT_DIR"
out=$1
jre=$out/jre
self=${BASH_SOURCE[0]}

if [ -f "$jre/release" ] && [ "$jre/release" -nt "$self" ] && [ -x "$jre/bin/java" ]; then
  printf 'make-jre: %s is up to date\n' "$jre"
  exit 0
fi

[ -x "$JDK/bin/jlink" ] || die "$JDK/bin/jlink not found: install Debian's openjdk-17-jdk-headless"
[ -f "$JDK/jmods/java.base.jmod" ] || die "$JDK/jmods is missing: install Debian's openjdk-17-jdk-headless"

mkdir -p "$out"
# jlink refuses an existing output folder; build beside it and move into place, so an interrupted run
# never leaves a half runtime that looks finished.
tmp=$(mktemp -d "$out/.jre.XXXXXX")
trap 'rm -rf "$tmp"' EXIT
"$JDK/bin/jlink" --module-path "$JDK/jmods" --add-modules "$MODULES" \
  --strip-debug --no-header-files --no-man-pages --compress=2 --output "$tmp/jre"
[ -f "$tmp/jre/lib/server/libjvm.so" ] || die "jlink made no lib/server/libjvm.so"
rm -rf "$jre"
mv "$tmp/jre" "$jre"
touch "$jre/release"   # the freshness stamp: newer than this script
printf 'make-jre: made %s (%s)\n' "$jre" "$(du -sh "$jre" | cut -f1)"
