#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Runs tests that decode, call, answer and clean up under valgrind's memcheck, each in a process of
# its own: invalid reads and writes, uninitialised values and leaks fail it.
# A test that floods is for the thread sanitizer: here the flood outruns what it is for.
#   scripts/valgrind.sh [GTEST_FILTER]    the filter holds for each of the programs
source "$(dirname "$0")/lib.sh"

filter=${1:-DecodingTest.*:CallTest.*:SignalTest.*:PendingTest.*:Agent*Test.*:*Codec*:ProxyTest.*:ServerTest.*-ServerTest.FindersComeAndGo*}
need_packages "${build_packages[@]}" "${test_packages[@]}" valgrind
build "$root/build" -DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE=

log=$root/build/valgrind
rm -rf "$log"
mkdir "$log"
list() {
    local program name suite
    for program in core-tests bluez-tests scanner-tests; do
        "$root/build/tests/$program" --gtest_list_tests --gtest_filter="$filter" |
            while read -r name; do
                case "$name" in
                *.) suite=$name ;;
                Running*) ;;
                *) printf '%s\n' "$program $suite${name%% *}" ;;
                esac
            done
    done
}
check() {
    local output=$log/${2//\//.} # a test of named rows has a slash in its name
    # What is still reachable at the end are the shared connections of libdbus and the links that
    # live as long.
    valgrind --quiet --error-exitcode=9 --leak-check=full --show-leak-kinds=definite,indirect \
        --errors-for-leak-kinds=definite,indirect --log-file="$output.%p" \
        "$root/build/tests/$1" --gtest_brief=1 --gtest_filter="$2" >"$output.output" 2>&1 </dev/null ||
        { cat "$output".* >&2; printf '%s fails under valgrind\n' "$2" >&2; return 1; }
}
export -f check
export root log
list >"$log/tests"
[ -s "$log/tests" ] || die "no test is called $filter"
xargs -P "$(nproc)" -n 2 bash -c 'check "$0" "$1"' <"$log/tests" || die "valgrind found faults, see above"
echo "valgrind: $(wc -l <"$log/tests") tests are clean"
