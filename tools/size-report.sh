#!/usr/bin/env bash
# Prints the size of the release launchers, with and without the splash picture (the goal for the
# i686 launcher without its picture is 40 KB or less). Usage: tools/size-report.sh [BUILD_ROOT]
set -eu
root=${1:-build}
for arch in i686 x86_64; do
  exe="$root/$arch/launcher/QZ-Lumiscope_QZ-57.exe"
  bmp="$root/$arch/launcher/splash.bmp"
  [ -f "$exe" ] || { echo "$arch: not built ($exe)"; continue; }
  total=$(stat -c %s "$exe")
  picture=$(stat -c %s "$bmp" 2>/dev/null || echo 0)
  # The picture sits in the resource section rounded up to 8 bytes; file alignment may add a little.
  picture=$(( (picture + 7) / 8 * 8 ))
  without=$(( total - picture ))
  printf '%-7s total %7d bytes (%5.1f KB)   splash picture %7d bytes   without picture %7d bytes (%5.1f KB)%s\n' \
    "$arch" "$total" "$(awk "BEGIN{print $total/1024}")" "$picture" "$without" "$(awk "BEGIN{print $without/1024}")" \
    "$( [ "$arch" = i686 ] && { [ "$without" -le $((40*1024)) ] && echo '   goal <= 40 KB: met' || echo '   goal <= 40 KB: NOT met'; } )"
done
