#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Builds everything and passes the tests. Installs the Debian packages that are missing.
#   scripts/check.sh [--sanitize address,undefined | --sanitize thread] [ctest option...]
source "$(dirname "$0")/lib.sh"

folder=$root/build
options=(-DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE=)
if [ "${1:-}" = --sanitize ]; then
    [ $# -ge 2 ] || { echo "usage: check.sh [--sanitize KIND] [ctest option...]" >&2; exit 2; }
    folder=$root/build-${2//,/-}
    # Optimised as little as the sanitizers advise, which halves the time to compile.
    options=(-DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE="$2"
        -DCMAKE_CXX_FLAGS_RELWITHDEBINFO="-O1 -g1")
    shift 2
fi

need_packages "${build_packages[@]}" "${test_packages[@]}"
if ! problem=$("$root/tests/host/in_namespace.sh" --check 2>&1); then
    echo "Leaving out the tests at fixed paths of the machine (of auto-connect, PID files and the examples): no namespaces can be made here ($problem)"
fi
build "$folder" "${options[@]}"

log=$folder/check.log faults=$folder/check-faults.log
all=0 all_left_out=0 all_failed=0
: >"$faults"

usual='^ +Start +[0-9]+: |^ *([0-9]+/[0-9]+ )?Test +#[0-9]+: .*(Passed|\*\*\*Skipped) +[0-9.]+ sec'
usual+='|^Internal ctest |^Test project |^[0-9]+% tests passed|^Total Test time |^$'
usual+='|^The following tests did not run:|\(Skipped\)$'

# Passes the tests of one group, and shows what is not as it should be.
#   check_group NAME SELECTION...    the name is shown; ctest's options select the tests
check_group() {
    local name=$1 begin=$SECONDS failed total left_out
    shift
    ctest --test-dir "$folder" --output-on-failure --no-label-summary -j "$(nproc)" "$@" >"$log" 2>&1 || true
    read -r failed total < <(sed -nE 's/^[0-9]+% tests passed, ([0-9]+) tests failed out of ([0-9]+)$/\1 \2/p' "$log") ||
        { grep -q '^No tests were found' "$log" && return; cat "$log" >&2; die "ctest failed; its output is above"; }
    left_out=$(grep -c ' (Skipped)$' "$log" || true)
    # A test that was tried again must not have been stopped by a sanitizer the first time.
    grep -E '(Thread|Address|Leak)Sanitizer:|: runtime error: ' "$folder/Testing/Temporary/LastTest.log" >>"$faults" || true
    # Of a test that failed all is shown, also where it passed when it was tried again.
    grep -vE "$usual" "$log" || true
    printf '%-20s %4d passed' "$name" $((total - failed - left_out))
    [ "$failed" -eq 0 ] || printf ', %d FAILED' "$failed"
    [ "$left_out" -eq 0 ] || printf ', %d left out' "$left_out"
    printf ', %d s\n' $((SECONDS - begin))
    all=$((all + total)) all_left_out=$((all_left_out + left_out)) all_failed=$((all_failed + failed))
}

echo "Testing ..."
for group in $(ctest --test-dir "$folder" --print-labels | sed -n 's/^  \([^ ]*\)$/\1/p'); do
    check_group "$group" --label-regex "^$group\$" "$@"
done
check_group others --label-exclude . "$@"
[ "$all" -gt 0 ] || die "no test is selected by: $*"
[ "$all_failed" -eq 0 ] || die "$all_failed of $all tests failed, see above"
[ ! -s "$faults" ] || { cat "$faults" >&2; die "a sanitizer has found a fault, see above"; }
left_out=""
[ "$all_left_out" -eq 0 ] || left_out=", $all_left_out left out"
echo "All $((all - all_left_out)) tests passed$left_out."
