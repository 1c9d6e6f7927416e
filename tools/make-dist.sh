#!/usr/bin/env bash
# Lays out the built launchers as application directories: dist/<arch>/ holds the launcher,
# jre\bin\client\jvm.dll and emu57.jar. No Windows Java runtime can be built here, so the runtime
# slot holds the test stand-in VM (tests/wine/vmdouble.cpp, which records what the launcher hands
# it in vm-record.txt and lets `main` run for three seconds); jre\README.txt says so. Replace
# dist/<arch>/jre with a real Windows Java runtime (and emu57.jar with the application) to run the
# real application.
set -eu
build=${1:-build}; out=${2:-dist}
for arch in i686 x86_64; do
  dir="$out/$arch"
  rm -rf "$dir"; mkdir -p "$dir/jre/bin/client"
  cp "$build/$arch/launcher/QZ-Lumiscope_QZ-57.exe" "$dir/"
  cp "$build/$arch/tests/wine/jvm.dll" "$dir/jre/bin/client/jvm.dll"
  printf '%s\r\n' "TEST STAND-IN, NOT A JAVA RUNTIME." \
    "bin\\client\\jvm.dll is the test suite's VM double: it runs no Java code. It records the options" \
    "and arguments the launcher hands it in ..\\vm-record.txt and lets main run for three seconds" \
    "(..\\vm-script.txt). Replace this jre folder with a real Windows Java runtime." >"$dir/jre/README.txt"
  : >"$dir/emu57.jar"
  printf 'main_ms=3000\n' >"$dir/vm-script.txt"
  echo "$dir: $(ls "$dir" | tr '\n' ' ')"
done
