#!/usr/bin/env bash
# The Wine test bed: one throw-away prefix on one virtual X display (Xvfb -displayfd picks a free one).
#   bed.sh setup STATE      STATE/{prefix,home,tmp}, Xvfb, a compositor, a persistent wineserver, and
#                           STATE/env.sh to source before running a Windows program there
#   bed.sh teardown STATE   stop everything and remove STATE
# Unattended: no window manager (boxes close at once), no crash debugger (an unhandled exception ends
# the process with its code), no Mono/Gecko prompts, a real Documents folder in the prefix, HOME and
# TMPDIR isolated (Debian's wine keeps its server socket under TMPDIR).
set -u
state=${2:?state directory}
mkdir -p "$state" && state=$(cd "$state" && pwd)
if [ "$1" = teardown ]; then
  [ -f "$state/env.sh" ] && . "$state/env.sh" && timeout 30 wineserver -k 2>/dev/null
  kill $(cat "$state"/*.pid 2>/dev/null) 2>/dev/null
  sleep 0.2; rm -rf "$state"; exit 0
fi
"$0" teardown "$state"; mkdir -p "$state/prefix" "$state/home" "$state/tmp"
Xvfb -displayfd 3 -screen 0 1280x1024x24 -nolisten tcp 3>"$state/display" >"$state/xvfb.log" 2>&1 </dev/null &
echo $! >"$state/xvfb.pid"
for _ in $(seq 300); do [ -s "$state/display" ] && break; sleep 0.1; done
[ -s "$state/display" ] || { cat "$state/xvfb.log" >&2; exit 1; }
# Debian's `wine` takes the 32-bit loader whenever it is installed, also where 32-bit programs cannot
# run at all; there the 64-bit loader runs x86_64 programs. Which one works is found by executing it.
loader="WINE=wine"
/usr/lib/wine/wine --version >/dev/null 2>&1 || loader="WINE=/usr/lib/wine/wine64 WINELOADER=/usr/lib/wine/wine64"
cat >"$state/env.sh" <<ENV
export WINEPREFIX='$state/prefix' HOME='$state/home' TMPDIR='$state/tmp' DISPLAY=':$(cat "$state/display")' WINEDEBUG=-all
export WINEDLLOVERRIDES='mscoree,mshtml=;winemenubuilder.exe=d' $loader
unset WINEARCH
ENV
. "$state/env.sh"
xcompmgr >/dev/null 2>&1 </dev/null & echo $! >"$state/xcompmgr.pid"
timeout 180 $WINE wineboot.exe -i >"$state/wineboot.log" 2>&1 </dev/null || { cat "$state/wineboot.log" >&2; exit 1; }
wineserver -p </dev/null >/dev/null 2>&1
reg() { timeout 60 $WINE reg add "$@" /f >/dev/null 2>&1 </dev/null; }
reg 'HKCU\Software\Wine\X11 Driver' /v Managed /d N
for view in /reg:64 /reg:32; do
  reg 'HKLM\Software\Microsoft\Windows NT\CurrentVersion\AeDebug' /v Debugger /d 'C:\windows\no-crash-debugger.exe' $view
  reg 'HKLM\Software\Microsoft\Windows NT\CurrentVersion\AeDebug' /v Auto /d 1 $view
done
for docs in "$WINEPREFIX"/drive_c/users/*/Documents; do [ -L "$docs" ] && rm -f "$docs" && mkdir -p "$docs"; done
