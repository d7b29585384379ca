#!/usr/bin/env bash
# Installs the GIMP 2.10 plug-in "Noctiva..." (Filters > Noise) with the module and its texts:
#   bash gimp/install.sh [--build DIR] [--dest DIR] [--no-build]
# DIR of --build: the build tree (default build/; configured and built here unless --no-build).
# DIR of --dest: the plug-in folder (default $GIMP2_DIRECTORY or ~/.config/GIMP/2.10, plus
# plug-ins/noctiva). Restart GIMP afterwards.
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
build=$root/build
dest=
make=1
while (($#)); do
  case $1 in
    --build) build=$2; shift 2 ;;
    --dest) dest=$2; shift 2 ;;
    --no-build) make=0; shift ;;
    -h|--help) sed -n '2,6p' "$0"; exit 0 ;;
    *) echo "install.sh: unknown argument $1" >&2; exit 1 ;;
  esac
done
profile=${GIMP2_DIRECTORY:-${XDG_CONFIG_HOME:-$HOME/.config}/GIMP/2.10}
dest=${dest:-$profile/plug-ins/noctiva}

if ((make)); then
  [ -f "$build/CMakeCache.txt" ] || cmake -S "$root" -B "$build" >/dev/null
  cmake --build "$build" --target noctiva_gimp Noctiva -j "$(nproc)" >/dev/null
fi
for f in "$build/gimp/noctiva" "$build/host/Noctiva.so" "$build/host/loc"; do
  [ -e "$f" ] || { echo "install.sh: $f is missing (is NOCTIVA_BUILD_GIMP on?)" >&2; exit 1; }
done

# Assemble beside the target and swap it in, so GIMP never sees a half-copied folder.
parent=$(dirname "$dest")
mkdir -p "$parent"
staging=$(mktemp -d "$parent/.noctiva-install.XXXXXX")
trap 'rm -rf "$staging"' EXIT
cp "$build/gimp/noctiva" "$build/host/Noctiva.so" "$staging/"
cp -r "$build/host/loc" "$staging/loc"
chmod 755 "$staging" "$staging/noctiva"
chmod 644 "$staging/Noctiva.so"  # only the plug-in itself is executable
rm -rf "$dest"
mv "$staging" "$dest"
trap - EXIT
echo "installed the Noctiva plug-in into $dest"
