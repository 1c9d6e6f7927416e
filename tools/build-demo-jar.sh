#!/usr/bin/env bash
# Compiles the demo application (demo/src) with Debian's javac 17 into a jar.
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
"$JDK/bin/jar" --create --file "$out" -C "$classes" .
printf 'build-demo-jar: made %s\n' "$out"
