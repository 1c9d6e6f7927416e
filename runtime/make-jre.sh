#!/usr/bin/env bash
# Makes the application's private Java runtime, OUT_DIR/jre, from Debian's OpenJDK 17, made for start-up.
#   runtime/make-jre.sh OUT_DIR [--app JAR] [--old]
#
# 1. jlink links java.desktop (Swing) and java.management (the test application reads the VM's input
#    arguments), without Java debug data, header files or manual pages; the modules image is stored
#    uncompressed (see COMPRESS below for the measurement behind that).
# 2. Every ELF file is stripped of its native symbols (binutils' strip: --strip-unneeded for shared
#    libraries, plain for executables; both keep the dynamic symbols the loader needs): jlink strips Java
#    debug data only, and a Debian package must not ship unstripped binaries.
# 3. Training: Swing programs run on a private Xvfb display (with openbox when it is installed, as users
#    have a window manager) until their windows are up, each recording the classes it loaded
#    (-XX:DumpLoadedClassList): our own programs of runtime/training and, with --app, the
#    application's main class from JAR, started with the launcher's class-loading options.
# 4. The lists are merged with the runtime's own start-up list (lib/classlist, from java.base), keeping only
#    classes of the runtime's own modules, and the result becomes the runtime's lib/classlist.
# 5. The runtime's own `java -Xshare:dump` writes its default class-data archive, lib/server/classes.jsa,
#    which the VM maps at every start with no option at all. It holds the runtime's classes only and is
#    dumped without a class path: the VM ignores a whole archive whose class path differs from its own,
#    and the application folder moves (a copied folder, the installed package) and emu57.jar is replaced.
#    An archive that does not fit its runtime (another module set, another VM build) is ignored by the
#    VM, which then loads every class from the modules image as before.
# --old makes the runtime as it was made before: zip-compressed modules, no archive, not stripped (the
# benchmark's comparison).
#
# Inputs, for a build rule's dependencies: this script, runtime/training/*.java, JAR, and the JDK
# (its jmods, jlink, javac, jar, jimage). OUT_DIR/.jre-inputs records a digest of them; the run is skipped
# while it matches. Needs Xvfb and binutils; openbox (with xprop) is used when present. Each training run
# is bounded (the program's own limit of 90 s, 120 s at most).
#
# A Windows runtime given at build time gets the same archive from its own VM: run the same training on
# Windows with that runtime's `bin\java.exe -XX:DumpLoadedClassList=FILE -cp training.jar;PROGRAM.jar
# TrainingRun MAIN` for each program (Windows loads its own toolkit classes, so a Linux list does not
# serve), merge the lists as in step 4 against `jimage list` of that runtime's lib\modules into its
# lib\classlist, then run `bin\java.exe -Xshare:dump` in an empty folder, with no class path: it writes
# the client VM's default archive, jre\bin\client\classes.jsa, which jvm.dll maps with no option.
set -euo pipefail

JDK=${JDK:-/usr/lib/jvm/java-17-openjdk-amd64}  # the build passes its JAVA_HOME
MODULES=java.desktop,java.management
MAIN=com.qz.kpo.emu57.app.ApplicationMainForm
# Modules stored uncompressed, by measurement (docs/performance.md, "The private runtime: training and
# compression"): with the archive in place zip brings the frame no sooner, costs memory for the classes
# it inflates and makes the Debian package larger (zip-compressed data compresses worse again); it only
# saves disk space, and the package is what every user downloads.
COMPRESS=0

die() { printf 'make-jre: %s\n' "$*" >&2; exit 1; }
usage() { die "usage: make-jre.sh OUT_DIR [--app JAR] [--old]"; }

[ $# -ge 1 ] || usage
out=$1; shift
app= old=0
while [ $# -gt 0 ]; do
  case $1 in
    --app) [ $# -ge 2 ] || usage; app=$(realpath "$2"); [ -f "$app" ] || die "no application jar $2"; shift 2 ;;
    --old) old=1; shift ;;
    *) usage ;;
  esac
done
mkdir -p "$out"
out=$(cd "$out" && pwd) here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)
training=$here/training
jre=$out/jre

[ -x "$JDK/bin/jlink" ] || die "$JDK/bin/jlink not found: install Debian's openjdk-17-jdk-headless"
[ -f "$JDK/jmods/java.base.jmod" ] || die "$JDK/jmods is missing: install Debian's openjdk-17-jdk-headless"

inputs=$( { printf 'old=%s\n' "$old"; stat -c '%n %s %Y' "$JDK/release" "$JDK"/jmods/*.jmod
            sha256sum "${BASH_SOURCE[0]}" "$training"/*.java ${app:+"$app"} | cut -d' ' -f1; } | sha256sum | cut -d' ' -f1)
if [ -x "$jre/bin/java" ] && [ "$(cat "$out/.jre-inputs" 2>/dev/null)" = "$inputs" ]; then
  printf 'make-jre: %s is up to date\n' "$jre"
  exit 0
fi

rm -f "$out/.jre-inputs"
# jlink refuses an existing output folder; build beside it and move into place, so an interrupted run
# never leaves a half runtime that looks finished.
tmp=$(mktemp -d "$out/.jre.XXXXXX")
xvfb= wm=
cleanup() {
  for pid in $wm $xvfb; do kill "$pid" 2>/dev/null; wait "$pid" 2>/dev/null; done
  rm -rf "$tmp"
}
trap cleanup EXIT
trap 'exit 130' INT TERM
new=$tmp/jre
"$JDK/bin/jlink" --module-path "$JDK/jmods" --add-modules "$MODULES" \
  --strip-debug --no-header-files --no-man-pages --compress=$((old ? 2 : COMPRESS)) --output "$new"
if [ "$old" = 0 ]; then
  for tool in strip:binutils Xvfb:xvfb; do command -v "${tool%:*}" >/dev/null || die "${tool%:*} not found: install Debian's ${tool#*:}"; done
  while IFS= read -r -d '' file; do
    [ "$(head -c 4 "$file" | od -An -c | tr -d ' ')" = '177ELF' ] || continue
    case $file in *.so) strip --strip-unneeded "$file" ;; *) strip "$file" ;; esac
  done < <(find "$new" -type f -print0)

  # The training programs, and the folder every Java run of this script starts in: nothing of the
  # builder's environment (CLASSPATH, JAVA_TOOL_OPTIONS, a home with Java preferences) reaches the VM.
  mkdir -p "$tmp/classes" "$tmp/home" "$tmp/lists" "$tmp/empty"
  "$JDK/bin/javac" --release 17 -d "$tmp/classes" "$training"/*.java
  "$JDK/bin/jar" --create --file "$tmp/training.jar" -C "$tmp/classes" .
  # Its output goes to a file: a caller reading ours must not wait on a server that outlived us.
  Xvfb -displayfd 3 -screen 0 1280x1024x24 -nolisten tcp 3>"$tmp/display" >"$tmp/xvfb.log" 2>&1 & xvfb=$!
  for _ in $(seq 100); do [ -s "$tmp/display" ] && break; sleep 0.1; done
  [ -s "$tmp/display" ] || die "Xvfb did not start: $(tail -3 "$tmp/xvfb.log")"
  run=(env -i PATH=/usr/bin:/bin HOME="$tmp/home" LANG=C.UTF-8 DISPLAY=":$(tr -d '\n' <"$tmp/display")")
  if command -v openbox >/dev/null; then
    "${run[@]}" openbox --sm-disable >/dev/null 2>&1 & wm=$!
    # Ready once it announces itself: Java's toolkit asks which window manager runs when it starts.
    for _ in $(seq 100); do "${run[@]}" xprop -root _NET_SUPPORTING_WM_CHECK 2>/dev/null | grep -q 'window id' && break; sleep 0.1; done
  fi
  programs=("$tmp/training.jar Workbench" ${app:+"$app $MAIN"})
  for program in "${programs[@]}"; do
    read -r jar class <<<"$program"
    list=$tmp/lists/$(basename "$jar")-$class
    # The launcher's options that decide which classes Swing loads (font smoothing, locale).
    (cd "$tmp/empty" && timeout 120 "${run[@]}" "$new/bin/java" -XX:DumpLoadedClassList="$list" \
      -Dswing.aatext=true -Dsun.locale.formatasdefault=true -cp "$tmp/training.jar:$jar" TrainingRun "$class" \
      >"$list.out" 2>&1) || die "training with $class from $jar failed: $(tail -5 "$list.out")"
    printf 'make-jre: trained with %s (%s classes)\n' "$class" "$(grep -c '^[^#@]' "$list")"
  done

  # Classes of the runtime's own modules only; lambda proxies only for callers among them; the
  # method-handle forms (@lambda-form-invoker) all, as they are the runtime's own.
  "$JDK/bin/jimage" list "$new/lib/modules" >"$tmp/image.txt"
  awk 'FNR == NR { if (sub(/\.class$/, "")) { sub(/^ +/, ""); have[$0] = 1 } next }
       /^#/ || /^$/ { next }
       /^@lambda-proxy/ { if (($2 in have) && !seen[$0]++) print; next }
       /^@/ { if (!seen[$0]++) print; next }
       ($1 in have) && !seen[$1]++ { print $1 }' \
    "$tmp/image.txt" "$new/lib/classlist" "$tmp"/lists/* >"$tmp/classlist"
  mv "$tmp/classlist" "$new/lib/classlist"
  # G1, the collector the VM picks on the machines we support, is the one whose archived objects it
  # maps; the launcher's heap ceiling gives the archive the object encoding the launcher's VM uses.
  (cd "$tmp/empty" && "${run[@]}" "$new/bin/java" -XX:+UseG1GC -Xmx256m -Xshare:dump >"$tmp/dump.txt" 2>&1) \
    || die "the class-data archive could not be dumped: $(tail -5 "$tmp/dump.txt")"
  (cd "$tmp/empty" && "${run[@]}" "$new/bin/java" -Xshare:on -version >/dev/null 2>&1) \
    || die "the runtime does not map its own class-data archive"
fi
[ -f "$new/lib/server/libjvm.so" ] || die "jlink made no lib/server/libjvm.so"
# The modes a package expects: jlink leaves its legal notices read-only.
chmod -R u+w,go-w "$new"
rm -rf "$jre"
mv "$new" "$jre"
printf '%s\n' "$inputs" >"$out/.jre-inputs"
printf 'make-jre: made %s (%s, %s classes in its archive)\n' "$jre" "$(du -sh "$jre" | cut -f1)" \
  "$([ "$old" = 1 ] && echo no || grep -c '^[^#@]' "$jre/lib/classlist")"
