#!/usr/bin/env bash
# Lays out the built launchers as application directories under dist/.
#   make-dist.sh linux BUILD OUT     OUT/linux-x86_64: the launcher, emu57.jar (the demo application)
#                                    and jre/ (a private runtime made with jlink); ready to copy and run
#   make-dist.sh windows BUILD OUT   OUT/<arch>: the launcher, jre\bin\client\jvm.dll, emu57.jar
# No Windows Java runtime can be built here, so the Windows runtime slot holds the test stand-in VM
# (it records what the launcher hands it and lets `main` run for three seconds); the layout says so
# in jre/STAND-IN.txt. Put a real Windows Java runtime in jre\ and the application in emu57.jar to
# run the real application.
set -eu
what=$1; build=${2:-build}; out=${3:-dist}
here=$(cd "$(dirname "$0")" && pwd)
case "$what" in
  linux)
    dir="$out/linux-x86_64"
    mkdir -p "$dir"
    bash "$here/make-jre.sh" "$dir"
    bash "$here/build-demo-jar.sh" "$dir/emu57.jar"
    cp "$build/linux/launcher/QZ-Lumiscope_QZ-57" "$dir/"
    echo "$dir: $(ls "$dir" | tr '\n' ' ')" ;;
  windows)
    for arch in i686 x86_64; do
      dir="$out/$arch"
      rm -rf "$dir"; mkdir -p "$dir/jre/bin/client"
      cp "$build/$arch/launcher/QZ-Lumiscope_QZ-57.exe" "$dir/"
      cp "$build/$arch/tests/wine/jvm.dll" "$dir/jre/bin/client/jvm.dll" 2>/dev/null ||
        cp "$build/$arch/tests/wine/vmdouble/jvm.dll" "$dir/jre/bin/client/jvm.dll"
      printf 'This jvm.dll is a test stand-in, not a Java runtime: it records what the launcher hands it\nand lets main run for three seconds. Replace jre\\ with a real Windows Java runtime.\n' >"$dir/jre/STAND-IN.txt"
      : >"$dir/emu57.jar"
      printf 'main_ms=3000\n' >"$dir/vmdouble.ini"
      echo "$dir: $(ls "$dir" | tr '\n' ' ')"
    done ;;
  *) echo "usage: make-dist.sh linux|windows BUILD OUT" >&2; exit 2 ;;
esac
