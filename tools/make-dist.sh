#!/usr/bin/env bash
# Lays out the built launchers as application directories: dist/<arch>/ holds the launcher,
# jre\bin\client\jvm.dll and emu57.jar. No Windows Java runtime can be built here, so the runtime
# slot holds the test suite's stand-in VM (it records what the launcher hands it to
# vmdouble.log and lets `main` run for three seconds); replace dist/<arch>/jre with a real Windows
# Java runtime (and emu57.jar with the application) to run the real application.
set -eu
build=${1:-build}; out=${2:-dist}
for arch in i686 x86_64; do
  dir="$out/$arch"
  rm -rf "$dir"; mkdir -p "$dir/jre/bin/client"
  cp "$build/$arch/launcher/QZ-Lumiscope_QZ-57.exe" "$dir/"
  cp "$build/$arch/tests/wine/vmdouble/jvm.dll" "$dir/jre/bin/client/jvm.dll"
  : >"$dir/emu57.jar"
  printf 'main_ms=3000\n' >"$dir/vmdouble.ini"
  echo "$dir: $(ls "$dir" | tr '\n' ' ')"
done
