#!/usr/bin/env bash
# Runs the real launcher of DIST_DIR with the demo application, step by step, and says what happened.
#   tools/demo.sh DIST_DIR OUT_DIR
# DIST_DIR holds QZ-Lumiscope_QZ-57, emu57.jar and jre/. Screenshots and the programs' output go to OUT_DIR.
# Uses the user's display when $DISPLAY answers, else a private Xvfb with openbox and xcompmgr.
# Every wait is bounded; the exit status is non-zero when a step failed.
set -uo pipefail
export LC_ALL=C.UTF-8

die() { printf 'demo: %s\n' "$*" >&2; exit 2; }
[ $# -eq 2 ] || die "usage: demo.sh DIST_DIR OUT_DIR"
dist=$(cd "$1" 2>/dev/null && pwd) || die "no folder $1"
mkdir -p "$2" && out=$(cd "$2" && pwd) || die "cannot make $2"
launcher=$dist/QZ-Lumiscope_QZ-57
[ -x "$launcher" ] || die "$launcher is missing (run make dist)"
[ -f "$dist/emu57.jar" ] || die "$dist/emu57.jar is missing"
[ -f "$dist/jre/lib/server/libjvm.so" ] || die "$dist/jre/lib/server/libjvm.so is missing"
for tool in xdotool xprop xwininfo xdpyinfo import wmctrl; do
  command -v "$tool" >/dev/null || die "$tool is missing (make deps installs it)"
done

FRAME_CLASS=com-qz-kpo-emu57-app-ApplicationMainForm
TITLE_TEXT='QZ-Lumiscope QZ-57'     # the readable half of the frame's title; alone, the dialog's title
app_out=$out/app-stdout.txt
launcher_err=$out/launcher-stderr.txt
rm -f "$out"/*.png "$app_out" "$launcher_err" "$out"/second-*.txt

# ---- reporting -------------------------------------------------------------------------------------------
cur=0; failed=(); summary=()
step() { cur=$1; printf 'step %s: %s\n' "$1" "$2"; summary[cur]="step $1: $2: ok"; }
skip() { printf 'step %s: %s: skipped, %s\n' "$1" "$2" "$3"; summary[$1]="step $1: $2: skipped"; }
ok()   { printf '  ok: %s\n' "$*"; }
info() { printf '  %s\n' "$*"; }
fail() {
  printf '  FAILED: %s\n' "$*"
  failed+=("step $cur: $*"); summary[cur]="${summary[cur]%: ok}"; summary[cur]="${summary[cur]%: FAILED}: FAILED"
}
now() { printf '%s' "$EPOCHREALTIME"; }
since() { awk -v a="$1" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.1f", b - a }'; }

# ---- processes we start, stopped on every way out ----------------------------------------------------------
first=; xvfb=; wm=; comp=; work=$(mktemp -d /tmp/qz57-demo.XXXXXX)
cleanup() {
  local pid
  [ -n "$first" ] && kill -- "-$first" 2>/dev/null
  for pid in "$comp" "$wm" "$xvfb"; do [ -n "$pid" ] && kill "$pid" 2>/dev/null; done
  sleep 0.3
  [ -n "$first" ] && kill -9 -- "-$first" 2>/dev/null
  for pid in "$comp" "$wm" "$xvfb"; do [ -n "$pid" ] && kill -0 "$pid" 2>/dev/null && kill -9 "$pid" 2>/dev/null; done
  rm -rf "$work"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

# ---- the display -------------------------------------------------------------------------------------------
private=0
if [ -n "${DISPLAY:-}" ] && timeout 5 xdpyinfo >/dev/null 2>&1; then
  printf 'demo: on your display %s\n' "$DISPLAY"
else
  for tool in Xvfb openbox xcompmgr; do command -v "$tool" >/dev/null || die "$tool is missing (make deps)"; done
  Xvfb -displayfd 3 -screen 0 1280x800x24 -nolisten tcp 3>"$work/display" 2>"$work/xvfb.log" & xvfb=$!
  for _ in $(seq 100); do [ -s "$work/display" ] && break; sleep 0.1; done
  [ -s "$work/display" ] || die "Xvfb did not start: $(tail -3 "$work/xvfb.log")"
  DISPLAY=:$(tr -d '\n' <"$work/display"); export DISPLAY
  openbox --sm-disable >"$work/openbox.log" 2>&1 & wm=$!
  for _ in $(seq 100); do timeout 2 wmctrl -m >/dev/null 2>&1 && break; sleep 0.1; done
  timeout 2 wmctrl -m >/dev/null 2>&1 || die "openbox did not start: $(tail -3 "$work/openbox.log")"
  xcompmgr >"$work/xcompmgr.log" 2>&1 & comp=$!
  private=1
  printf 'demo: on a private Xvfb %s with openbox and xcompmgr\n' "$DISPLAY"
fi
timeout 2 wmctrl -m >/dev/null 2>&1 || info "note: no window manager answers; minimising and closing need one"

X() { timeout 10 "$@"; }   # no X call may hang the demo
x_hex() { printf '0x%x' "$1"; }

# A screenshot: the whole screen on the private display; on the user's display only the window shown
# (with room for its decorations), so no other content of the user's screen is saved.
shot() {
  local file=$1 win=${2:-} geo x y w h
  if [ "$private" = 1 ] || [ -z "$win" ]; then
    X import -window root "$file" 2>/dev/null
  else
    geo=$(X xwininfo -id "$win" 2>/dev/null) || return 1
    x=$(awk '/Absolute upper-left X/ {print $4}' <<<"$geo"); y=$(awk '/Absolute upper-left Y/ {print $4}' <<<"$geo")
    w=$(awk '/Width:/ {print $2}' <<<"$geo"); h=$(awk '/Height:/ {print $2}' <<<"$geo")
    x=$((x > 10 ? x - 10 : 0)); y=$((y > 40 ? y - 40 : 0))
    X import -window root -crop "$((w + 20))x$((h + 50))+$x+$y" +repage "$file" 2>/dev/null
  fi && info "screenshot: $file"
}

# The Java frame: a viewable window of the frame's class whose title holds the readable name.
find_frame() {
  local id
  for id in $(X xdotool search --onlyvisible --class "$FRAME_CLASS" 2>/dev/null); do
    [[ "$(X xdotool getwindowname "$id" 2>/dev/null)" == *"$TITLE_TEXT"* ]] && { echo "$id"; return 0; }
  done
  return 1
}
wm_state() { X xprop -id "$1" WM_STATE 2>/dev/null | awk '/window state:/ {print $3}'; }
map_state() { X xwininfo -id "$1" 2>/dev/null | awk '/Map State:/ {print $3}'; }
active_window() { X xprop -root _NET_ACTIVE_WINDOW 2>/dev/null | awk '{print $NF}'; }
has_line() { grep -Fxq -- "$1" "$app_out" 2>/dev/null; }
alive() { kill -0 "$first" 2>/dev/null; }
top_windows() { X xdotool search --onlyvisible --maxdepth 1 --name '' 2>/dev/null | sort; }

if command -v ss >/dev/null && [ -n "$(ss -Hltn 'sport = :6152' 2>/dev/null)" ]; then
  printf 'demo: warning: something already listens on port 6152; the hand-off may go there\n'
fi

# ---- step 1: first start -------------------------------------------------------------------------------------
arg1="$work/Café Müller.qz57"; arg2='🎞 reel.qz57'
: >"$arg1"
step 1 "first start with \"$arg1\" and \"$arg2\""
before=$(top_windows)
t0=$(now)
# A session of its own (setsid runs it in place, same pid), so the clean-up can stop whatever it started too.
(cd "$work" && exec setsid "$launcher" "$arg1" "$arg2") >"$app_out" 2>"$launcher_err" & first=$!

# The splash, if any: a new top-level window that is not the Java frame, seen before the frame is up.
frame=; splash=
deadline=$((SECONDS + 60))
while [ $SECONDS -lt $deadline ] && alive; do
  if [ -z "$splash" ]; then
    for id in $(comm -13 <(echo "$before") <(top_windows)); do
      [[ "$(X xprop -id "$id" WM_CLASS 2>/dev/null)$(X xwininfo -children -id "$id" 2>/dev/null)" == *"$FRAME_CLASS"* ]] \
        && continue
      splash=$id
      info "splash window $(x_hex "$id") seen after $(since "$t0") s"
      # The window's own contents, not the screen: the Java frame may cover the splash within
      # a fraction of a second, and while it fades in the screen shows it only faintly.
      sleep 0.2
      X import -window "$id" "$out/0-splash.png" 2>/dev/null && info "screenshot: $out/0-splash.png"
      break
    done
  fi
  frame=$(find_frame) && break
  sleep 0.1
done
[ -n "$splash" ] || info "no splash window seen (none on this launcher, or it came and went between looks)"
if [ -z "$frame" ]; then
  if alive; then fail "no frame of class $FRAME_CLASS within 60 s"
  else wait "$first"; fail "the launcher ended with status $? before its frame was seen: $(tail -3 "$launcher_err")"; first=
  fi
else
  ok "frame $(x_hex "$frame") up after $(since "$t0") s"
  for _ in $(seq 50); do has_line ready && break; sleep 0.1; done
  has_line ready || fail "the application never printed \"ready\""
  sleep 0.5   # let the first paint happen
  shot "$out/1-first-start.png" "$frame"
  for a in "$arg1" "$arg2"; do
    if has_line "argument: $a"; then ok "the frame lists \"$a\""; else fail "\"$a\" did not arrive"; fi
  done
fi

if [ -z "$frame" ]; then
  n=2; for what in "second start" "close the frame" "the end-of-run dialog" "the first launcher ends"; do
    skip $n "$what" "no frame"; n=$((n + 1))
  done
fi

# ---- step 2: a second start forwards two arguments ----------------------------------------------------------
if [ -n "$frame" ]; then
  fwd1='-open'; fwd2='second file ☃.qz57'
  step 2 "second start with \"$fwd1\" and \"$fwd2\" while the frame is minimised"
  X xdotool windowminimize "$frame" >/dev/null 2>&1
  for _ in $(seq 50); do [ "$(wm_state "$frame")" = Iconic ] && break; sleep 0.1; done
  info "frame before: WM_STATE $(wm_state "$frame"), $(map_state "$frame")"
  t1=$(now)
  (cd "$work" && timeout 60 "$launcher" "$fwd1" "$fwd2") >"$out/second-stdout.txt" 2>"$out/second-stderr.txt"
  rc=$?; took=$(since "$t1")
  if [ $rc -eq 0 ]; then ok "second start exited 0 after $took s"; else fail "second start exited $rc after $took s"; fi
  # Five connect attempts 5 s apart mean no listener was reached; a working hand-off takes well under that.
  awk -v t="$took" 'BEGIN { exit !(t < 5) }' || fail "the second start took $took s: the hand-off did not connect at once"
  # The stream has no separator, so one start's arguments arrive as one text.
  want="forwarded: $fwd1$fwd2"
  for _ in $(seq 100); do has_line "$want" && break; sleep 0.1; done
  if has_line "$want"; then ok "the frame shows \"$fwd1$fwd2\" (one hand-off, arguments back to back)"
  else fail "the frame did not receive \"$fwd1$fwd2\"; it printed: $(grep '^forwarded:' "$app_out" | tr '\n' ' ')"; fi
  hexframe=$(x_hex "$frame")
  for _ in $(seq 30); do
    [ "$(wm_state "$frame")" = Normal ] && [ "$(active_window)" = "$hexframe" ] && break; sleep 0.1
  done
  state=$(wm_state "$frame"); active=$(active_window)
  if [ "$state" = Normal ] && [ "$active" = "$hexframe" ]; then
    info "raised: yes (WM_STATE Normal, the active window)"
  else
    info "raised: no (WM_STATE ${state:-none}, $(map_state "$frame"), active window ${active:-none}); restored by the demo for the screenshot"
    X xdotool windowactivate "$frame" >/dev/null 2>&1
    for _ in $(seq 30); do [ "$(map_state "$frame")" = IsViewable ] && break; sleep 0.1; done
  fi
  sleep 0.5
  shot "$out/2-forwarded.png" "$frame"
fi

# ---- step 3: close the frame ---------------------------------------------------------------------------------
if [ -n "$frame" ]; then
  step 3 "close the frame"
  # Through the window manager, which sends WM_DELETE_WINDOW: Java sees WINDOW_CLOSING and disposes the frame.
  X wmctrl -i -c "$(x_hex "$frame")" || fail "wmctrl could not ask the window manager to close the frame"
  for _ in $(seq 100); do has_line closed && break; sleep 0.1; done
  if has_line closed; then ok "the application reports its frame closed"; else fail "the frame did not close within 10 s"; fi
fi

# ---- step 4: the end-of-run dialog ---------------------------------------------------------------------------
if [ -n "$frame" ]; then
  step 4 "the launcher's \"jvm destroy res=0\" dialog, if it shows one"
  dialog=
  deadline=$((SECONDS + 15))
  while [ $SECONDS -lt $deadline ] && alive; do
    dialog=$(X xdotool search --onlyvisible --name "^$TITLE_TEXT\$" 2>/dev/null | head -1) && [ -n "$dialog" ] && break
    sleep 0.1
  done
  if [ -z "$dialog" ]; then
    info "no dialog (this launcher reports on standard error only)"
  else
    ok "dialog $(x_hex "$dialog") up"
    sleep 0.3
    shot "$out/3-dialog.png" "$dialog"
    X xdotool windowactivate --sync "$dialog" >/dev/null 2>&1 || info "could not activate the dialog"
    X xdotool key --clearmodifiers Return
    for _ in $(seq 50); do [ -z "$(X xdotool search --onlyvisible --name "^$TITLE_TEXT\$" 2>/dev/null)" ] && break; sleep 0.1; done
    if [ -z "$(X xdotool search --onlyvisible --name "^$TITLE_TEXT\$" 2>/dev/null)" ]; then ok "Return dismissed it"
    else fail "the dialog is still up after Return"; fi
  fi
fi

# ---- step 5: the first launcher's end --------------------------------------------------------------------------
if [ -n "$frame" ]; then
  step 5 "the first launcher ends"
  deadline=$((SECONDS + 30))
  while [ $SECONDS -lt $deadline ] && alive; do sleep 0.1; done
  if alive; then
    fail "still running 30 s after its frame closed (stopped by the demo)"
  else
    wait "$first"; rc=$?; first=
    if [ $rc -eq 0 ]; then ok "exit status 0"; else fail "exit status $rc"; fi
    if grep -Fq 'jvm destroy res=0' "$launcher_err"; then ok "standard error says \"jvm destroy res=0\""
    else fail "standard error lacks \"jvm destroy res=0\": $(tail -3 "$launcher_err")"; fi
  fi
fi

# ---- summary ----------------------------------------------------------------------------------------------------
printf '\nsummary:\n'
printf '  %s\n' "${summary[@]}"
printf '  output: %s\n' "$out"
if [ ${#failed[@]} -eq 0 ]; then printf 'demo: all steps passed\n'; exit 0; fi
printf 'demo: %d check(s) failed:\n' "${#failed[@]}"; printf '  %s\n' "${failed[@]}"
exit 1
