#!/usr/bin/env bash
# Compiles the demo application (demo/src) with Debian's javac 17 into a jar, the same bytes every time
# (fixed entry times): the private runtime is trained with it and made again only when it changes.
#   tools/build-demo-jar.sh OUT_JAR
set -euo pipefail

JDK=/usr/lib/jvm/java-17-openjdk-amd64
die() { printf 'build-demo-jar: %s\n' "$*" >&2; exit 1; }

[ $# -eq 1 ] || die "usage: build-demo-jar.sh OUT_JAR"
out=$1
src=$(cd "$(dirname "${BASH_SOURCE[0]}")/../demo/src" && pwd)
[ -x "$JDK/bin/javac" ] || die "$JDK/bin/javac not found: install Debian's openjdk-17-jdk-headless"

classes=$(mktemp -d)
trap 'rm -rf "$classes"' EXIT
mapfile -t sources < <(find "$src" -name '*.java' | sort)
"$JDK/bin/javac" --release 17 -encoding UTF-8 -d "$classes" "${sources[@]}"
mkdir -p "$(dirname "$out")"
rm -f "$out"
"$JDK/bin/jar" --create --date=2000-01-01T00:00:00Z --file "$out" -C "$classes" .
printf 'build-demo-jar: made %s\n' "$out"
