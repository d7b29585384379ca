#!/usr/bin/env bash
# Builds the dialog's dependencies for the Windows module from Debian's source packages: Expat and a
# static wxMSW 3.2, with mingw-w64, into build-win/deps/prefix. What is built there already is kept.
# Prints the time of each step.
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
    local package
    for package in expat wxwidgets3.2; do
        ls -d "$package"-*/ >/dev/null 2>&1 && continue
        apt-get source -qq "$package" >"fetch-$package.log" 2>&1 || { tail -20 "fetch-$package.log"; return 1; }
    done
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

# Only the base and core libraries, and of them only what the dialog (src/ui) uses: every optional
# feature off, then on again the controls, drawing and registry-backed settings it needs, and the
# few that wxMSW cannot be built or linked without (images, menus, text controls, DIBs, OLE and
# what OLE needs).
# Debian's source has no bundled image or compression libraries, and the dialog needs none. Without
# the debug flag a failed check is not a breakpoint. Precompiled headers make it about three times
# faster.
wx_options=(
    --disable-shared --with-msw --disable-debug_flag --disable-all-features --disable-tests --without-subdirs
    --enable-pch --enable-config --enable-regkey --enable-file --enable-ffile --enable-textfile
    --enable-textbuf --enable-streams --enable-dynlib --enable-dynamicloader --enable-image --enable-wxdib
    --enable-ole --enable-variant --enable-dataobj --enable-uxtheme --disable-accessibility
    --enable-button --enable-checkbox --enable-statbmp --enable-stattext --enable-textctrl --enable-menus
    --enable-menubar
)
build_wx() {
    local stamp="$prefix/wx-options.txt" toolchain="$host-msw-unicode-static-3.2"
    if [ -x "$prefix/bin/wx-config" ] && [ "$(cat "$stamp" 2>/dev/null)" = "${wx_options[*]}" ]; then
        return 0
    fi
    local source
    source="$(ls -d "$deps/src"/wxwidgets3.2-*/)"
    rm -rf "$deps/build-wx" "$prefix/include/wx-3.2" "$prefix/lib/wx" "$prefix"/lib/libwx_* "$prefix/bin/wx-config"
    mkdir -p "$deps/build-wx"
    cd "$deps/build-wx"
    "$source/configure" --host=$host --build="$(gcc -dumpmachine)" --prefix="$prefix" \
        CC=$host-gcc-posix CXX=$host-g++-posix "${wx_options[@]}" >configure.log 2>&1 ||
        { tail -20 configure.log; return 1; }
    nice -n 10 make -j"$jobs" install_baselib install_corelib install-wxconfig >make.log 2>&1 ||
        { grep -m5 -B2 -A5 'error' make.log || tail -30 make.log; return 1; }
    # The headers, as "make install" would put them (it would also build every other library).
    mkdir -p "$prefix/include/wx-3.2" "$prefix/lib/wx/include/$toolchain/wx"
    cp -r "$source/include/wx" "$prefix/include/wx-3.2/"
    cp -r "lib/wx/include/$toolchain/wx/." "$prefix/lib/wx/include/$toolchain/wx/"
    echo "${wx_options[*]}" >"$stamp"
}

step "expat" build_expat
step "wxWidgets (wxMSW base + core, static)" build_wx
