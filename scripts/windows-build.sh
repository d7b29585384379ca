#!/usr/bin/env bash
# Cross-builds the module (Noctiva.8bf) and the host (noctiva.exe) for 64-bit Windows into build-win/,
# after checking the interface header's layout for Win64. Prints the time of each step.
# Usage: scripts/windows-build.sh [--without-dialog]
#   By default the module has the message dialog: Expat and a static wxMSW are built first
#   (scripts/windows-ui-deps.sh, kept in build-win/deps). --without-dialog leaves both out; the
#   report then goes to standard error.
set -euo pipefail
root="$(cd "$(dirname "$0")/.." && pwd)"
build="${NOCTIVA_WIN_BUILD:-$root/build-win}"
jobs="${NOCTIVA_JOBS:-2}"
cxx=x86_64-w64-mingw32-g++-posix
dialog=ON
case "${1:-}" in
    "") ;;
    --without-dialog) dialog=OFF ;;
    --with-dialog) ;;
    *) echo "usage: $0 [--without-dialog]" >&2; exit 2 ;;
esac

step() {  # step NAME COMMAND...: runs it and prints how long it took
    local name="$1" start=$SECONDS
    shift
    "$@"
    echo "windows-build: $name took $((SECONDS - start)) s"
}

step "dependencies" bash "$root/scripts/windows-deps.sh"
ui=(-DNOCTIVA_WITH_UI=OFF)
if [ "$dialog" = ON ]; then
    step "dialog dependencies" bash "$root/scripts/windows-ui-deps.sh"
    ui=(-DNOCTIVA_WITH_UI=ON -DNOCTIVA_WIN_DEPS="$build/deps/prefix")
fi
mkdir -p "$build"
step "layout check" "$cxx" -std=c++20 -Wall -Wextra -Werror -I"$root/src" -c \
    "$root/tests/windows/LayoutCheck.cpp" -o "$build/LayoutCheck.o"
configure() {
    cmake -S "$root" -B "$build" -DCMAKE_TOOLCHAIN_FILE="$root/cmake/mingw-w64.cmake" -DCMAKE_BUILD_TYPE=Release \
        "${ui[@]}" -DNOCTIVA_BUILD_TESTS=OFF -DNOCTIVA_BUILD_BENCH=OFF -DNOCTIVA_BUILD_GIMP=OFF >/dev/null
}
step "configure" configure
step "module" cmake --build "$build" --target Noctiva -j"$jobs"
step "host" cmake --build "$build" --target noctiva -j"$jobs"
echo "windows-build: $build/host/Noctiva.8bf (dialog $dialog) $build/host/noctiva.exe"
