#!/usr/bin/env bash
# Installs what is missing, builds, and runs the filter over the bundled sample: the denoised
# picture and a before/after comparison of a crop (the picture shown in the README, docs/demo.png).
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
bash "$root/scripts/deps.sh"
bash "$root/scripts/build.sh" "$root/build" -DNOCTIVA_BUILD_TESTS=OFF -DNOCTIVA_BUILD_BENCH=OFF
mkdir -p "$root/out"
"$root/build/host/noctiva" "$root/samples/noisy-sample.png" -o "$root/out/noisy-sample-denoised.png" \
  --compare "$root/out/noisy-sample-compare.png" --compare-crop 672,437,256,192
echo "wrote $root/out/noisy-sample-denoised.png and $root/out/noisy-sample-compare.png"
