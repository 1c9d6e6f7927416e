#!/usr/bin/env bash
# Lays out the built launchers as application directories under dist/.
#   make-dist.sh linux BUILD OUT     OUT/linux-x86_64: the launcher, emu57.jar (the demo application)
#                                    and jre/ (a private runtime made with jlink, trained with the demo
#                                    for its class-data archive); ready to copy and run
#   make-dist.sh windows BUILD OUT   OUT/<arch>: the launcher, jre\bin\client\jvm.dll, emu57.jar
# No Windows Java runtime can be built here, so the Windows runtime slot holds the test stand-in VM
# (tests/wine/vmdouble.cpp, which records what the launcher hands it in vm-record.txt and lets
# `main` run for three seconds); jre\README.txt says so. Replace dist/<arch>/jre with a real
# Windows Java runtime (and emu57.jar with the application) to run the real application.
set -eu
what=$1; build=${2:-build}; out=${3:-dist}
here=$(cd "$(dirname "$0")" && pwd)
case "$what" in
  linux)
    dir="$out/linux-x86_64"
    mkdir -p "$dir"
    bash "$here/build-demo-jar.sh" "$dir/emu57.jar"
    bash "$here/make-jre.sh" "$dir" --app "$dir/emu57.jar"
    cp "$build/linux/launcher/QZ-Lumiscope_QZ-57" "$dir/"
    echo "$dir: $(ls "$dir" | tr '\n' ' ')" ;;
  windows)
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
    done ;;
  *) echo "usage: make-dist.sh linux|windows BUILD OUT" >&2; exit 2 ;;
esac
