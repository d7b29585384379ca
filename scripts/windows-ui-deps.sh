#!/usr/bin/env bash
# Builds the dialog's dependencies for the Windows module from Debian's source packages: Expat and a
# static wxMSW 3.2, with mingw-w64, into build-win/deps/prefix. Prints the time of each step.
# Not used by the build yet: the Windows module is built without the dialog (docs/windows.md).
set -euo pipefail
root="$(cd "$(dirname "$0")/.." && pwd)"
deps="${NOCTIVA_WIN_BUILD:-$root/build-win}/deps"
prefix="$deps/prefix"
jobs="${NOCTIVA_JOBS:-2}"
host=x86_64-w64-mingw32

step() {
    local name="$1" start=$SECONDS
    shift
    "$@"
    echo "windows-ui-deps: $name took $((SECONDS - start)) s"
}

fetch() {
    local list=/etc/apt/sources.list.d/noctiva-deb-src.sources
    if ! apt-get indextargets --format '$(CREATED_BY)' 2>/dev/null | grep -q '^Sources$'; then
        SUDO=; [ "$(id -u)" -eq 0 ] || SUDO=sudo
        printf '%s\n' 'Types: deb-src' 'URIs: http://deb.debian.org/debian' 'Suites: bookworm bookworm-updates' \
            'Components: main' 'Signed-By: /usr/share/keyrings/debian-archive-keyring.gpg' | $SUDO tee "$list" >/dev/null
        $SUDO apt-get update -qq
    fi
    mkdir -p "$deps/src"
    cd "$deps/src"
    ls -d expat-*/ >/dev/null 2>&1 || apt-get source -qq expat
    ls -d wxwidgets3.2-*/ >/dev/null 2>&1 || apt-get source -qq wxwidgets3.2
}

step "source packages" fetch

build_expat() {
    [ -f "$prefix/lib/libexpat.a" ] && return 0
    cmake -S "$(ls -d "$deps/src"/expat-*/)expat" -B "$deps/build-expat" -DCMAKE_TOOLCHAIN_FILE="$root/cmake/mingw-w64.cmake" \
        -DCMAKE_BUILD_TYPE=Release -DCMAKE_INSTALL_PREFIX="$prefix" -DEXPAT_SHARED_LIBS=OFF \
        -DEXPAT_BUILD_TOOLS=OFF -DEXPAT_BUILD_EXAMPLES=OFF -DEXPAT_BUILD_TESTS=OFF -DEXPAT_BUILD_DOCS=OFF >/dev/null
    # Debian's security patches test XML_DTD == 1, which the CMake configuration defines empty.
    sed -i 's/^#define XML_DTD$/#define XML_DTD 1/' "$deps/build-expat/expat_config.h"
    cmake --build "$deps/build-expat" -j"$jobs" >/dev/null
    cmake --install "$deps/build-expat" >/dev/null
}

# Only the base and core libraries: Debian's source has no bundled image or compression libraries,
# and the dialog needs none of them.
build_wx() {
    [ -x "$prefix/bin/wx-config" ] && return 0
    mkdir -p "$deps/build-wx"
    cd "$deps/build-wx"
    "$(ls -d "$deps/src"/wxwidgets3.2-*/)configure" --host=$host --build="$(gcc -dumpmachine)" --prefix="$prefix" \
        CC=$host-gcc-posix CXX=$host-g++-posix --disable-shared --with-msw --disable-debug \
        --without-libpng --without-libjpeg --without-libtiff --without-zlib --without-expat --without-liblzma \
        --without-regex --without-opengl --without-nanosvg --disable-svg --disable-xrc --disable-aui --disable-html \
        --disable-propgrid --disable-ribbon --disable-richtext --disable-stc --disable-webview --disable-mediactrl \
        --disable-sound --disable-zipstream --disable-fs_zip --disable-tarstream --disable-sockets \
        --disable-url --disable-protocol --disable-ipc --disable-help --disable-mshtmlhelp --disable-htmlhelp \
        --disable-loggui --disable-debugreport --disable-precomp-headers >configure.log 2>&1 ||
        { tail -20 configure.log; return 1; }
    make -j"$jobs" >make.log 2>&1 || { tail -30 make.log; return 1; }
    make install >/dev/null
}

step "expat" build_expat
step "wxWidgets (wxMSW, static)" build_wx
