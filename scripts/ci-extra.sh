#!/usr/bin/env bash
# The CI stages after the plain test run: the whole suite again in an AddressSanitizer +
# UndefinedBehaviorSanitizer build (LeakSanitizer included, so every test that loads the module
# through our host is leak-checked), then each fuzz target for a bounded time, then the Windows
# module with its dialog, cross-built and checked under Wine against the Linux build.
#   NOCTIVA_FUZZ_SECONDS  seconds per fuzz target (default 30; 0 skips the fuzz stage)
#   NOCTIVA_WINDOWS       0 skips the Windows stages (default 1)
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
fuzzSeconds=${NOCTIVA_FUZZ_SECONDS:-30}

timings=()
stage() {
  local name=$1; shift
  local t0=$SECONDS rc=0
  echo "=== stage: $name"
  "$@" || rc=$?
  timings+=("$(printf '%-22s %5d s%s' "$name" $((SECONDS - t0)) "$([ $rc -eq 0 ] || echo '  FAILED')")")
  if [ $rc -ne 0 ]; then report; exit $rc; fi
}
report() { printf 'stage time: %s\n' "${timings[@]}"; }

sanitizerTests() {
  cd "$root/build-asan"
  # Leaks made by GTK's own library constructors are kept out narrowly (tests/robustness/lsan.supp,
  # libpixman preloaded so its start-up data stays mapped after the module is unloaded; the preload
  # is why the link-order check is off). Everything else is leak-checked; any finding fails the test.
  LD_PRELOAD=libpixman-1.so.0 \
  ASAN_OPTIONS=abort_on_error=1:detect_leaks=1:verify_asan_link_order=0:strict_string_checks=1:detect_stack_use_after_return=1 \
  LSAN_OPTIONS=suppressions=$root/tests/robustness/lsan.supp:print_suppressions=0 \
  UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
    ctest --output-on-failure -j "$(nproc)"
}

# -O1 and line tables only: the sanitizers need no more, and the tree builds in two thirds the time.
stage sanitizer-build bash "$root/scripts/build.sh" "$root/build-asan" -DNOCTIVA_SANITIZE=ON \
  -DNOCTIVA_BUILD_BENCH=OFF -DCMAKE_BUILD_TYPE=RelWithDebInfo \
  "-DCMAKE_CXX_FLAGS_RELWITHDEBINFO=-O1 -g1" "-DCMAKE_C_FLAGS_RELWITHDEBINFO=-O1 -g1"
stage sanitizer-tests sanitizerTests
if [ "$fuzzSeconds" -gt 0 ]; then
  stage fuzz-build "$root/scripts/fuzz.sh" 0
  stage fuzz-runs "$root/scripts/fuzz.sh" "$fuzzSeconds"
fi
if [ "${NOCTIVA_WINDOWS:-1}" != 0 ]; then
  # Packages, then Expat and wxMSW from Debian's source packages (kept in build-win/deps).
  windowsDeps() { bash "$root/scripts/windows-deps.sh" && bash "$root/scripts/windows-ui-deps.sh"; }
  # The release tree of scripts/test.sh is the Linux reference when it is there.
  linuxReference=$root/build-linux-check
  [ -x "$root/build/host/noctiva" ] && linuxReference=$root/build
  stage windows-deps windowsDeps
  stage windows-build bash "$root/scripts/windows-build.sh"
  stage windows-tests bash "$root/scripts/windows-test.sh" "$linuxReference"
  stage windows-dialog bash "$root/scripts/windows-dialog-test.sh"
fi
report
