#!/usr/bin/env bash
# Installs what is missing, builds, and runs every test; then the sanitizer build with the whole
# suite again, the bounded fuzz runs and the Windows module under Wine (scripts/ci-extra.sh;
# NOCTIVA_QUICK=1 skips them).
# Prints how long each stage took.
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
start=$SECONDS
t0=$SECONDS; bash "$root/scripts/deps.sh"; echo "stage time: deps $((SECONDS - t0)) s"
t0=$SECONDS; bash "$root/scripts/build.sh" "$root/build"; echo "stage time: build $((SECONDS - t0)) s"
t0=$SECONDS
(cd "$root/build" && ctest --output-on-failure -j "$(nproc)")
echo "stage time: tests $((SECONDS - t0)) s"
if [ "${NOCTIVA_QUICK:-0}" != 1 ]; then
  bash "$root/scripts/ci-extra.sh"
fi
echo "stage time: total $((SECONDS - start)) s"
