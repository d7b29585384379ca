# Sourced by the Windows check scripts: PASS/FAIL counting and the built files they need.
# Expects $win (the Windows build tree) and the caller's name in $checks.
failures=0
passed=0
pass() { echo "PASS $1"; passed=$((passed + 1)); }
fail() { echo "FAIL $1"; failures=$((failures + 1)); }
summary() { echo "$passed passed, $failures failed"; [ "$failures" -eq 0 ]; }

for f in "$win/host/Noctiva.8bf" "$win/host/noctiva.exe"; do
    [ -f "$f" ] || { echo "$checks: $f missing; run scripts/windows-build.sh" >&2; exit 2; }
done
