#!/usr/bin/env bash
# The Wine test bed: one throw-away prefix on one virtual X display per test run.
#
#   bed.sh setup STATE       make STATE/{prefix,home,tmp}, start Xvfb (+ a compositor) and a
#                            persistent wineserver, initialise the prefix for unattended runs
#   bed.sh run STATE CMD...  run a Windows program in that prefix (exit code passed through)
#   bed.sh teardown STATE    stop everything and remove STATE
#
# Unattended means: no window manager, so windows are unmanaged (boxes close at once); no crash
# debugger (an unhandled exception ends the process with its code); no Mono/Gecko prompts; a real
# Documents folder inside the prefix (a new prefix links it to $HOME); HOME and TMPDIR isolated
# (Debian's wine keeps its server socket under TMPDIR).
set -u
action=${1:?action}; state=${2:?state directory}; shift 2
state=$(mkdir -p "$state" && cd "$state" && pwd)

say() { printf '[wine-bed] %s\n' "$*" >&2; }

# Debian's `wine` script takes the 32-bit loader whenever it is installed, also on a machine that
# cannot execute 32-bit programs; there the 64-bit loader runs x86_64 programs directly. Which one
# works is found out by executing it.
pick_loader() {
  if /usr/lib/wine/wine --version >/dev/null 2>&1 || [ ! -x /usr/lib/wine/wine64 ]; then
    echo "export WINE=wine"
  else
    echo "export WINE=/usr/lib/wine/wine64 WINELOADER=/usr/lib/wine/wine64"
  fi
}

write_env() {
  cat >"$state/env.sh" <<ENV
export WINEPREFIX='$state/prefix'
export HOME='$state/home'
export TMPDIR='$state/tmp'
export DISPLAY=':$1'
export WINEDEBUG=-all
export WINEDLLOVERRIDES='mscoree,mshtml=;winemenubuilder.exe=d'
unset WINEARCH
$(pick_loader)
ENV
}

setup() {
  "$0" teardown "$state" 2>/dev/null
  mkdir -p "$state/prefix" "$state/home" "$state/tmp"
  # Xvfb picks a free display itself and writes its number once it listens: no race for a number.
  Xvfb -displayfd 3 -screen 0 1280x1024x24 -nolisten tcp 3>"$state/display" >"$state/xvfb.log" 2>&1 </dev/null &
  echo $! >"$state/xvfb.pid"
  for _ in $(seq 300); do [ -s "$state/display" ] && break; sleep 0.1; done
  local display
  display=$(cat "$state/display")
  [ -n "$display" ] || { say "Xvfb did not start"; cat "$state/xvfb.log" >&2; exit 1; }
  write_env "$display"
  # shellcheck disable=SC1091
  . "$state/env.sh"
  if command -v xcompmgr >/dev/null; then
    xcompmgr >/dev/null 2>&1 </dev/null &
    echo $! >"$state/xcompmgr.pid"
  fi
  say "prefix $WINEPREFIX on display $DISPLAY"
  timeout 180 $WINE wineboot.exe -i >"$state/wineboot.log" 2>&1 </dev/null || { say "wineboot failed"; cat "$state/wineboot.log" >&2; exit 1; }
  wineserver -p </dev/null >/dev/null 2>&1
  reg() { timeout 60 $WINE reg add "$@" /f >/dev/null 2>&1 </dev/null; }
  reg 'HKCU\Software\Wine\X11 Driver' /v Managed /d N
  local view
  for view in /reg:64 /reg:32; do
    reg 'HKLM\Software\Microsoft\Windows NT\CurrentVersion\AeDebug' /v Debugger /d 'C:\windows\no-crash-debugger.exe' $view
    reg 'HKLM\Software\Microsoft\Windows NT\CurrentVersion\AeDebug' /v Auto /d 1 $view
  done
  local docs
  for docs in "$WINEPREFIX"/drive_c/users/*/Documents; do
    [ -L "$docs" ] && rm -f "$docs" && mkdir -p "$docs"
  done
  say "ready"
}

case "$action" in
  setup) setup ;;
  run)
    # shellcheck disable=SC1091
    . "$state/env.sh" || { say "no bed at $state (run setup first)"; exit 1; }
    # A wineserver, or Wine's own system processes (services, explorer), started on behalf of the
    # program would inherit and hold open the caller's output, so a test runner reading it would
    # wait for them. Start them detached first; they stay up until teardown.
    wineserver -p </dev/null >/dev/null 2>&1
    timeout 120 $WINE wineboot.exe </dev/null >/dev/null 2>&1
    exec $WINE "$@" ;;
  teardown)
    if [ -f "$state/env.sh" ]; then
      # shellcheck disable=SC1091
      . "$state/env.sh"
      timeout 30 wineserver -k 2>/dev/null
    fi
    for p in xcompmgr xvfb; do
      [ -f "$state/$p.pid" ] && kill "$(cat "$state/$p.pid")" 2>/dev/null
    done
    sleep 0.2
    rm -rf "$state" ;;
  *) say "unknown action $action"; exit 2 ;;
esac
