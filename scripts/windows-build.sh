#!/usr/bin/env bash
# Cross-builds the module (Noctiva.8bf, without the dialog) and the host (noctiva.exe) for 64-bit
# Windows into build-win/, after checking the interface header's layout for Win64. Prints the time
# of each step.
set -euo pipefail
root="$(cd "$(dirname "$0")/.." && pwd)"
build="${NOCTIVA_WIN_BUILD:-$root/build-win}"
jobs="${NOCTIVA_JOBS:-2}"
cxx=x86_64-w64-mingw32-g++-posix

step() {  # step NAME COMMAND...: runs it and prints how long it took
    local name="$1" start=$SECONDS
    shift
    "$@"
    echo "windows-build: $name took $((SECONDS - start)) s"
}

step "dependencies" bash "$root/scripts/windows-deps.sh"
mkdir -p "$build"
step "layout check" "$cxx" -std=c++20 -Wall -Wextra -Werror -I"$root/src" -c \
    "$root/tests/windows/LayoutCheck.cpp" -o "$build/LayoutCheck.o"
configure() {
    cmake -S "$root" -B "$build" -DCMAKE_TOOLCHAIN_FILE="$root/cmake/mingw-w64.cmake" -DCMAKE_BUILD_TYPE=Release \
        -DNOCTIVA_WITH_UI=OFF -DNOCTIVA_BUILD_TESTS=OFF -DNOCTIVA_BUILD_BENCH=OFF -DNOCTIVA_BUILD_GIMP=OFF >/dev/null
}
step "configure" configure
step "module" cmake --build "$build" --target Noctiva -j"$jobs"
step "host" cmake --build "$build" --target noctiva -j"$jobs"
echo "windows-build: $build/host/Noctiva.8bf $build/host/noctiva.exe"
