#!/usr/bin/env bash
# Builds the libFuzzer targets with clang (tree build-fuzz) and runs each for a while.
#   scripts/fuzz.sh [SECONDS_EACH] [TARGET...]     default: 60 seconds, every target; 0 only builds
# Targets: settings_text config_xml catalog whole_run. The seed corpus in fuzz/corpus/<target> is
# only read; what a run finds goes to build-fuzz/corpus/<target> and is kept for the next run.
# Crashes land in build-fuzz/crashes/<target>/ and fail the script.
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
seconds=${1:-60}; shift || true
targets=("$@")
((${#targets[@]})) || targets=(settings_text config_xml catalog whole_run)
tree=${NOCTIVA_FUZZ_TREE:-$root/build-fuzz}
jobs=${NOCTIVA_JOBS:-2}

# The compiler is chosen when the tree is first configured (changing it later would empty the tree).
if [ ! -f "$tree/CMakeCache.txt" ]; then
  export CC=$(command -v clang-14 || command -v clang) CXX=$(command -v clang++-14 || command -v clang++)
fi
cmake -S "$root" -B "$tree" -DNOCTIVA_FUZZ=ON -DNOCTIVA_BUILD_TESTS=OFF \
  -DNOCTIVA_BUILD_BENCH=OFF -DCMAKE_BUILD_TYPE=RelWithDebInfo >/dev/null
cmake --build "$tree" -j "$jobs" --target $(printf 'fuzz_%s ' "${targets[@]}")
[ "$seconds" -gt 0 ] || exit 0

export ASAN_OPTIONS=${ASAN_OPTIONS:-abort_on_error=1:detect_leaks=1:allocator_may_return_null=1}
export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1:halt_on_error=1}
status=0
for t in "${targets[@]}"; do
  corpus=$tree/corpus/$t crashes=$tree/crashes/$t
  mkdir -p "$corpus" "$crashes"
  log=$tree/fuzz-$t.log
  echo "fuzz: $t for ${seconds}s"
  # Inputs stay small (the targets also refuse larger ones). One input taking 2 GB is a fault, and
  # so is one taking 10 s (a whole run: 60 s, as it is instrumented and shares the machine).
  timeout=10; [ "$t" != whole_run ] || timeout=60
  if ! "$tree/fuzz/fuzz_$t" -max_total_time="$seconds" -timeout=$timeout -rss_limit_mb=2048 -max_len=4096 \
      -print_final_stats=1 -artifact_prefix="$crashes/" "$corpus" "$root/fuzz/corpus/$t" >"$log" 2>&1; then
    echo "fuzz: $t FAILED, see $log and $crashes"; tail -n 40 "$log"; status=1
  fi
  grep -E '^stat::number_of_executed_units|^stat::new_units_added|^stat::peak_rss_mb' "$log" | sed "s/^/fuzz: $t /" || true
done
exit $status
