#!/usr/bin/env bash
# Checks the Windows build (scripts/windows-build.sh) against the Linux one:
#   - Noctiva.8bf exports only ENTRYPOINT and imports only Windows system DLLs;
#   - its PIPL 16004 and AETE 16013 resources (language 1033) equal the Linux module's sections
#     byte for byte;
#   - noctiva.exe under Wine runs the module over the bundled sample and a 16-bit RGBA image, with
#     the default settings and with settings that use every step, and writes the same files, bit for
#     bit, as the Linux host with the Linux module;
#   - a module that faults ends the run with status 3; refused host memory ends it with -108.
# Usage: scripts/windows-test.sh [LINUX_BUILD]   (default build-linux-check; built here if missing)
set -euo pipefail
root="$(cd "$(dirname "$0")/.." && pwd)"
win="${NOCTIVA_WIN_BUILD:-$root/build-win}"
linux="${1:-$root/build-linux-check}"
jobs="${NOCTIVA_JOBS:-2}"
checks=windows-test
source "$root/scripts/windows-checks.sh"
# The reference is built from the same sources (a no-op when it is up to date).
start=$SECONDS
if [ ! -f "$linux/CMakeCache.txt" ]; then
    cmake -S "$root" -B "$linux" -DNOCTIVA_BUILD_TESTS=OFF -DNOCTIVA_BUILD_BENCH=OFF -DNOCTIVA_BUILD_GIMP=OFF >/dev/null
fi
cmake --build "$linux" --target Noctiva noctiva -j"$jobs" >/dev/null
echo "windows-test: Linux build took $((SECONDS - start)) s"
module="$win/host/Noctiva.8bf"
work="$win/wine-check"
rm -rf "$work"
mkdir -p "$work"

# The module file.
objdump="x86_64-w64-mingw32-objdump"
exports=$("$objdump" -p "$module" | awk '/\[Ordinal\/Name Pointer\] Table/{t=1; next} t && /^[ \t]*\[/{print $NF} t && /^$/{t=0}')
[ "$exports" = "ENTRYPOINT" ] && pass "one export, ENTRYPOINT" || fail "exports: $(echo $exports)"
imports=$("$objdump" -p "$module" | awk '/DLL Name:/{print tolower($3)}' | sort -u)
bad=$(echo "$imports" | grep -v -x -E 'kernel32\.dll|msvcrt\.dll|user32\.dll|gdi32\.dll|advapi32\.dll|shell32\.dll|ole32\.dll|oleaut32\.dll|comctl32\.dll|comdlg32\.dll|uuid\.dll|ws2_32\.dll|shlwapi\.dll|version\.dll|uxtheme\.dll|winspool\.drv|rpcrt4\.dll|oleacc\.dll|imm32\.dll|winmm\.dll' || true)
[ -z "$bad" ] && pass "imports only system DLLs: $(echo $imports)" || fail "imports non-system DLLs: $(echo $bad)"

listing=$(wrestool -l "$module")
for r in "PIPL 16004" "AETE 16013"; do
    set -- $r
    if echo "$listing" | grep -q -- "--type='$1' --name=$2 --language=1033"; then
        wrestool -x --raw --type="$1" --name="$2" --language=1033 "$module" >"$work/$1.win"
        objcopy -O binary --only-section="$1" "$linux/host/Noctiva.so" "$work/$1.linux"
        if [ -s "$work/$1.linux" ] && cmp -s "$work/$1.win" "$work/$1.linux"; then
            pass "$1 $2 (1033) equals the Linux section ($(stat -c %s "$work/$1.win") bytes)"
        else
            fail "$1 $2 differs from the Linux section"
        fi
    else
        fail "no $1 resource $2 in language 1033: $listing"
    fi
done

# Wine, in a prefix of its own that never shows a crash dialog.
export WINEPREFIX="$win/wineprefix" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml="
if [ ! -f "$WINEPREFIX/system.reg" ]; then
    timeout 300 wineboot -i >/dev/null 2>&1
    timeout 120 wine reg add 'HKCU\Software\Wine\WineDbg' /v ShowCrashDialog /t REG_DWORD /d 0 /f >/dev/null 2>&1
fi
trap 'wineserver -k >/dev/null 2>&1 || true' EXIT

# What the Windows host reads from the module's resources, against the Linux host reading the sections.
"$linux/host/noctiva" info "$linux/host/Noctiva.so" | tail -n +2 >"$work/info.linux"
(cd "$win/host" && timeout 120 wine noctiva.exe info Noctiva.8bf) | tr -d '\r' | tail -n +2 >"$work/info.win" || true
if [ -s "$work/info.win" ] && cmp -s "$work/info.linux" "$work/info.win"; then
    pass "info: the module's PIPL and AETE read through FindResource match the Linux reading"
else
    fail "info differs: $(diff "$work/info.linux" "$work/info.win" | head -5)"
fi

python3 "$root/tests/windows/make_inputs.py" "$root/samples/noisy-sample.png" "$work/sample8.pam" "$work/sample16.pam"
every_step=(--set step1.mode=2 --set step2.mode=5 --set step3.mode=2 --set step3.saturationPercent=130
            --set step4.mode=2 --set step4.curveStrength2=40)
other_modes=(--set step1.mode=105 --set step2.mode=7 --set step3.mode=4 --set step4.mode=3
             --set step4.gradientLevel3=60)
# Grain draws from the C runtime's rand(), seeded with the time: such output is compared with nothing.
grain=(--set step3.mode=5 --set step3.toneSelector=2 --set step4.mode=5 --set step4.toneRed5=70)
run_case() {  # run_case NAME INPUT ARGS...
    local name="$1" input="$2"
    shift 2
    local start=$SECONDS
    if ! "$linux/host/noctiva" "$work/$input" -o "$work/$name.linux.pam" --quiet --save-par1 "$work/$name.linux.txt" "$@"; then
        fail "$name: the Linux run failed"
        return
    fi
    # Relative names: the Windows command line reads a leading '/' as an option.
    if ! (cd "$work" && timeout 600 wine "$win/host/noctiva.exe" "$input" -o "$name.win.pam" --quiet \
            --save-par1 "$name.win.txt" "$@"); then
        fail "$name: the Wine run failed"
        return
    fi
    if cmp -s "$work/$name.linux.pam" "$work/$name.win.pam" && cmp -s "$work/$name.linux.txt" "$work/$name.win.txt"; then
        if cmp -s "$work/$input" "$work/$name.win.pam"; then
            fail "$name: the output equals the input"
        else
            pass "$name: Wine output identical to Linux ($((SECONDS - start)) s)"
        fi
    else
        fail "$name: Wine output differs from Linux"
    fi
}
run_case default8 sample8.pam
run_case default16 sample16.pam
run_case every-step8 sample8.pam "${every_step[@]}"
run_case every-step16 sample16.pam "${every_step[@]}"
run_case other-modes8 sample8.pam "${other_modes[@]}"
if (cd "$work" && timeout 600 wine "$win/host/noctiva.exe" sample16.pam -o grain.win.pam --quiet "${grain[@]}") &&
    [ -s "$work/grain.win.pam" ] && ! cmp -s "$work/sample16.pam" "$work/grain.win.pam"; then
    pass "grain16: runs under Wine (not compared: time-seeded rand)"
else
    fail "grain16: the Wine run failed"
fi

# A missing module fails cleanly, with a non-zero status, a message and no dialog.
if (cd "$work" && timeout 120 wine "$win/host/noctiva.exe" sample8.pam -o x.pam --module nowhere.8bf) 2>"$work/missing.err"; then
    fail "a missing module did not fail the run"
elif grep -q "nowhere.8bf: " "$work/missing.err"; then
    pass "a missing module fails the run: $(head -1 "$work/missing.err")"
else
    fail "a missing module fails without naming it: $(head -1 "$work/missing.err")"
fi

# A module that faults: the unhandled-exception filter reports it and the run ends with status 3.
(cd "$win/src/plugin" && x86_64-w64-mingw32-windres Noctiva.rc -O coff -o "$work/crash-res.o")
x86_64-w64-mingw32-g++-posix -std=c++20 -O1 -shared -static -o "$work/Crash.8bf" \
    "$root/tests/windows/CrashModule.cpp" "$work/crash-res.o"
status=0
(cd "$work" && timeout 120 wine "$win/host/noctiva.exe" sample16.pam -o crash.pam --module Crash.8bf) 2>"$work/crash.err" || status=$?
if [ "$status" -eq 3 ] && grep -q "crashed with exception 0xC0000005" "$work/crash.err"; then
    pass "a faulting module ends the run with status 3 and a message"
else
    fail "a faulting module: status $status, $(head -2 "$work/crash.err")"
fi

# Memory the host refuses (a buffer, a handle, a lock) ends the run with -108, gives everything back
# and leaves the image alone: every point a run reaches, on a small image and on both sample files.
x86_64-w64-mingw32-g++-posix -std=c++20 -O1 -static -I"$root/host/include" -I"$root/src" \
    -o "$work/refused-memory-check.exe" "$root/tests/windows/RefusedMemoryCheck.cpp" "$win/host/libnoctiva_host.a"
start=$SECONDS
if (cd "$work" && timeout 600 wine refused-memory-check.exe "$(winepath -w "$module")" sample8.pam sample16.pam) >"$work/refused.out" 2>&1; then
    tr -d '\r' <"$work/refused.out" | head -n -1 | sed 's/^/    /'
    pass "refused memory ends the run with -108, cleanly: $(tr -d '\r' <"$work/refused.out" | tail -1) ($((SECONDS - start)) s)"
else
    fail "refused memory: $(tr -d '\r' <"$work/refused.out" | head -5)"
fi

summary
