#!/usr/bin/env bash
# The launcher's splash as the X display shows it, through a compositor (so its opacity counts):
# starts the launcher in a throw-away application directory (VM double waiting in main), takes a
# screenshot of the root window once the fade is over, cuts out the rectangle where the centred
# picture belongs and compares it with the picture itself. The same cut, shifted, must not match.
#
#   screenshot_test.sh BED_SH STATE LAUNCHER_EXE VMDOUBLE_DLL PICTURE_BMP OUT_DIR
#
# Leaves OUT_DIR/splash-screenshot.png (the README's docs/splash.png is such a capture).
set -u
bed=$1 state=$2 launcher=$3 vmdouble=$4 picture=$5 out=$6
fail() { echo "FAIL: $*" >&2; exit 1; }

command -v compare >/dev/null || fail "ImageMagick is missing"
# shellcheck disable=SC1090
. <("$bed" env "$state") || fail "no test bed at $state"
pgrep -x xcompmgr >/dev/null || echo "note: no xcompmgr process seen; the capture shows the splash opaque" >&2

app=$out/screenshot-app
rm -rf "$app"
mkdir -p "$app/jre/bin/client"
cp "$launcher" "$app/QZ-Lumiscope_QZ-57.exe"
cp "$vmdouble" "$app/jre/bin/client/jvm.dll"
: >"$app/emu57.jar"
# main waits for the flag, then ends the process as System.exit does (no closing box to dismiss).
printf 'main_until_file=stop.flag\nmain_exit=0\n' >"$app/vmdouble.ini"

"$bed" run "$state" "$app/QZ-Lumiscope_QZ-57.exe" >"$out/launcher.out" 2>&1 </dev/null &
launcher_pid=$!
finish() {
  touch "$app/stop.flag"
  for _ in $(seq 100); do kill -0 "$launcher_pid" 2>/dev/null || return 0; sleep 0.1; done
  kill "$launcher_pid" 2>/dev/null
}
trap finish EXIT

# The splash starts before the VM; once main runs, the window is up. Then let the fade finish.
in_main() { grep -q '^CallStaticVoidMethodV' "$app/vmdouble.log" 2>/dev/null; }
for _ in $(seq 300); do in_main && break; sleep 0.1; done
in_main || fail "the launcher never reached main"
sleep 1.5

import -window root "$out/screen.png" || fail "no screenshot"
read -r sw sh < <(identify -format '%w %h\n' "$out/screen.png")
read -r pw ph < <(identify -format '%w %h\n' "$picture")
x=$(( (sw - pw) / 2 )) y=$(( (sh - ph) / 2 ))
convert "$out/screen.png" -crop "${pw}x${ph}+${x}+${y}" +repage "$out/splash-screenshot.png"
convert "$out/screen.png" -crop "${pw}x${ph}+$((x + 40))+$((y + 30))" +repage "$out/shifted.png"

# Normalised root-mean-square difference, 0 (same) to 1.
rmse() { compare -metric RMSE "$1" "$2" null: 2>&1 | sed -n 's/.*(\([0-9.e-]*\)).*/\1/p'; }
at_place=$(rmse "$out/splash-screenshot.png" "$picture")
shifted=$(rmse "$out/shifted.png" "$picture")
echo "screen ${sw}x${sh}, picture ${pw}x${ph} at ${x},${y}: difference ${at_place} (shifted: ${shifted})"
[ -n "$at_place" ] && [ -n "$shifted" ] || fail "could not compare the images"
awk -v d="$at_place" 'BEGIN { exit !(d < 0.03) }' || fail "the screen does not show the picture at its place"
awk -v d="$shifted" 'BEGIN { exit !(d > 0.08) }' || fail "a shifted cut matches too: the comparison proves nothing"
echo "PASS"
