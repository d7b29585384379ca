#!/usr/bin/env bash
# The create-layer report of the Windows module (built with the dialog) through noctiva.exe under
# Wine, on a private Xvfb display driven from outside with xdotool:
#   - the dialog appears with its English texts, a screenshot is saved, and ticking its box and
#     confirming writes the choice into the registry-backed settings store; the next run shows nothing;
#   - with the language "de" in the settings file under the roaming application-data folder, it
#     appears with the German texts (second screenshot);
#   - without a display, the text goes to standard error and the run does not wait.
# Screenshots: build-win/dialog-test/*.png. Usage: scripts/windows-dialog-test.sh
set -euo pipefail
root="$(cd "$(dirname "$0")/.." && pwd)"
win="${NOCTIVA_WIN_BUILD:-$root/build-win}"
work="$win/dialog-test"
checks=windows-dialog-test
source "$root/scripts/windows-checks.sh"
if ! grep -q '^NOCTIVA_WITH_UI:BOOL=ON$' "$win/CMakeCache.txt"; then
    echo "windows-dialog-test: $win was built without the dialog; run scripts/windows-build.sh" >&2
    exit 2
fi
rm -rf "$work"
mkdir -p "$work"

# A small gradient, 8-bit RGB PAM.
python3 - "$work/in.pam" <<'EOF'
import sys
w, h = 96, 64
rows = bytearray()
for y in range(h):
    for x in range(w):
        rows += bytes((255 - x * 255 // (w - 1), y * 255 // (h - 1), x * 255 // (w - 1)))
with open(sys.argv[1], 'wb') as f:
    f.write(b'P7\nWIDTH %d\nHEIGHT %d\nDEPTH 3\nMAXVAL 255\nTUPLTYPE RGB\nENDHDR\n' % (w, h) + rows)
EOF

export WINEPREFIX="$win/wineprefix" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml="
# Each phase below starts its own wineserver, which keeps the display it was started with.
unset DISPLAY WAYLAND_DISPLAY
if [ ! -f "$WINEPREFIX/system.reg" ]; then
    timeout 300 wineboot -i >/dev/null 2>&1
    timeout 120 wine reg add 'HKCU\Software\Wine\WineDbg' /v ShowCrashDialog /t REG_DWORD /d 0 /f >/dev/null 2>&1
fi
xvfb=""
cleanup() {
    wineserver -k >/dev/null 2>&1 || true
    [ -n "$xvfb" ] && kill "$xvfb" 2>/dev/null || true
}
trap cleanup EXIT
# A wineserver started for another display (or none) keeps it: start afresh.
wineserver -k >/dev/null 2>&1 || true

store='HKCU\Software\Corvid\Quell 2 Common'
timeout 60 wine reg delete 'HKCU\Software\Corvid' /f >/dev/null 2>&1 || true
appdata=$(timeout 60 wine cmd /c echo %APPDATA% 2>/dev/null | tr -d '\r')
settings_dir=$(winepath -u "$appdata\\Corvid\\Quell 2" 2>/dev/null || true)
case "$appdata|$settings_dir" in
    [A-Za-z]:\\*"|/"*) rm -rf "$settings_dir" ;;
    *) echo "windows-dialog-test: no application-data folder in $WINEPREFIX ('$appdata')" >&2; exit 2 ;;
esac
# A choice made under the product's earlier store name, carried over when the store is first made.
timeout 60 wine reg add 'HKCU\Software\Corvid\Quell 2' /v EarlierChoice /t REG_DWORD /d 0 /f >/dev/null 2>&1
# No window manager runs on Xvfb: Wine draws the title bars itself, so the screenshots show them.
timeout 60 wine reg add 'HKCU\Software\Wine\X11 Driver' /v Managed /t REG_SZ /d N /f >/dev/null 2>&1
wineserver -k >/dev/null 2>&1 || true

exec 3>"$work/display"
Xvfb -displayfd 3 -screen 0 1024x768x24 -nolisten tcp >"$work/xvfb.log" 2>&1 &
xvfb=$!
exec 3>&-
for _ in $(seq 50); do [ -s "$work/display" ] && break; sleep 0.1; done
display=":$(head -1 "$work/display")"
[ "$display" != ":" ] || { echo "windows-dialog-test: Xvfb did not start" >&2; exit 2; }
export DISPLAY="$display"

host_run() {  # host_run NAME: starts noctiva.exe in the background; its pid in $run_pid
    local name="$1"
    (cd "$work" && timeout 180 wine "$win/host/noctiva.exe" in.pam -o "$name.pam" --quiet --dres 3 \
        >"$name.out" 2>"$name.err") &
    run_pid=$!
}
find_window() {  # find_window TITLE SECONDS: the window's id, or nothing
    local end=$((SECONDS + $2)) id
    while :; do
        id=$(xdotool search --name "^$1\$" 2>/dev/null | head -1 || true)
        if [ -n "$id" ] || [ $SECONDS -ge $end ]; then
            echo "$id"
            return
        fi
        sleep 0.2
    done
}
send_keys() {  # send_keys WINDOW KEY...: once the window has the keyboard focus (it may be just mapped)
    local window="$1" try
    shift
    for try in $(seq 20); do
        xdotool windowfocus "$window" 2>/dev/null || true
        sleep 0.25
        if [ "$(xdotool getwindowfocus 2>/dev/null)" = "$window" ]; then
            xdotool key --delay 150 "$@"
            return
        fi
    done
    echo "windows-dialog-test: window $window never got the focus" >&2
    return 1
}
processed() { [ -s "$work/$1.pam" ] && ! cmp -s "$work/in.pam" "$work/$1.pam"; }
shot() { import -window "$2" "$work/$1.png" && [ -s "$work/$1.png" ]; }

# English: the box ticked and the dialog confirmed.
host_run first
window=$(find_window Warning 60)
if [ -z "$window" ]; then
    fail "no window 'Warning' appeared: $(head -3 "$work/first.err")"
else
    sleep 1  # let it paint
    shot dialog-en "$window" && pass "the dialog appears, titled 'Warning' (dialog-en.png)" || fail "no screenshot"
    kill -0 "$run_pid" 2>/dev/null && pass "the run waits for the dialog" || fail "the run did not wait"
    # From OK (which has the focus) to the box, tick it, back to OK and press it.
    send_keys "$window" Tab space shift+Tab Return || fail "the keys could not be sent"
fi
status=0
wait "$run_pid" || status=$?
if [ "$status" -eq 0 ] && processed first; then
    pass "the run ends with status 0 after the dialog and writes its output"
else
    fail "first run: status $status, $(head -3 "$work/first.err")"
fi
stored() {  # stored NAME: the value in the registry store, or nothing
    { timeout 60 wine reg query "$store" /v "$1" 2>/dev/null || true; } | tr -d '\r' | awk -v k="$1" '$1 == k {print $3}'
}
value=$(stored ShowErrorCreateLayer)
[ "$value" = "0x0" ] && pass "the ticked box is stored in the registry ($store)" ||
    fail "ShowErrorCreateLayer in the registry: '$value'"
value=$(stored EarlierChoice)
[ "$value" = "0" ] || [ "$value" = "0x0" ] && pass "the earlier store's entries were carried over" ||
    fail "EarlierChoice from the earlier store: '$value'"

host_run second
appeared=""
while kill -0 "$run_pid" 2>/dev/null; do
    [ -n "$(find_window Warning 0)" ] && appeared=yes
    sleep 0.2
done
status=0
wait "$run_pid" || status=$?
if [ "$status" -eq 0 ] && [ -z "$appeared" ] && processed second && [ ! -s "$work/second.err" ]; then
    pass "the next run shows nothing"
else
    fail "second run: status $status, dialog '${appeared:-no}', $(head -3 "$work/second.err")"
fi

# German, from the settings file; the registry store starts empty again.
timeout 60 wine reg delete 'HKCU\Software\Corvid' /f >/dev/null 2>&1 || true
mkdir -p "$settings_dir"
printf '%s' '<settings version="4"><group name="Language"><key name="Language" type="string" value="de"/></group></settings>' \
    >"$settings_dir/Quell2.cfg"
host_run german
window=$(find_window Warnung 60)
if [ -z "$window" ]; then
    fail "no window 'Warnung' appeared: $(head -3 "$work/german.err")"
else
    sleep 1
    shot dialog-de "$window" && pass "with the language 'de' in $appdata\\Corvid\\Quell 2\\Quell2.cfg the dialog is titled 'Warnung' (dialog-de.png)" ||
        fail "no screenshot"
    send_keys "$window" Return || fail "the key could not be sent"
fi
status=0
wait "$run_pid" || status=$?
value=$(stored ShowErrorCreateLayer)
if [ "$status" -eq 0 ] && processed german && [ -z "$value" ]; then
    pass "confirming without the box ends the run and stores no choice"
else
    fail "German run: status $status, stored '$value', $(head -3 "$work/german.err")"
fi

# Without a display: the text on standard error, in the settings' language, and no waiting.
wineserver -k >/dev/null 2>&1 || true
unset DISPLAY
start=$SECONDS
status=0
(cd "$work" && timeout 120 wine "$win/host/noctiva.exe" in.pam -o headless.pam --quiet --dres 3 \
    >headless.out 2>headless.err) || status=$?
if [ "$status" -eq 0 ] && processed headless && grep -q "Noctiva: Warnung: " "$work/headless.err"; then
    pass "without a display the report goes to standard error ($((SECONDS - start)) s): $(grep -m1 Noctiva: "$work/headless.err")"
else
    fail "headless run: status $status, $(head -3 "$work/headless.err")"
fi

summary
