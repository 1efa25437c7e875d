#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Uses the library for long and checks that nothing is left behind: 100,000 calls, 1,000,000
# signals, a daemon that goes and comes back 1,000 times, and auto-connect lists whose writers are
# killed 1,000 times, and changed in 1,000 rounds beside a program that prunes, in memory and on disk.
#   scripts/soak.sh [--minute]    --minute: two fifths of all that
source "$(dirname "$0")/lib.sh"

export KESBLUETOOTH_SOAK=100
case "${1:-}" in
'') ;;
--minute) KESBLUETOOTH_SOAK=40 ;;
*) echo "usage: soak.sh [--minute]" >&2; exit 2 ;;
esac

need_packages "${build_packages[@]}" "${test_packages[@]}"
build "$root/build" -DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE=
# Not through ctest, which ends a test after two minutes. Each in a process of its own.
tests=$root/build/tests/soak-tests
"$tests" --gtest_list_tests | while read -r name; do
    case "$name" in
    *.) suite=$name ;;
    Running*) ;;
    *) output=$("$tests" --gtest_filter="$suite$name" 2>&1 </dev/null) ||
            { printf '%s\n' "$output" >&2; die "$suite$name does not hold, see above"; }
        echo "$suite$name holds $(grep '^descriptors' <<<"$output" || true)" ;;
    esac
done

lists=$root/build/lists
for etc in "" "$lists"; do
    for test in host-tests:AutoConnectFileTest.AProcessThatIsKilledWhileItChangesAListLosesNothing \
        auto-connect-tests:AutoConnectTest.NoChangeIsLostBesideAProgramThatPrunes; do
        rm -rf "$lists"
        mkdir "$lists"
        output=$(KESBLUETOOTH_ETC=$etc "$root/tests/host/in_namespace.sh" "$root/build" \
            "$root/build/tests/${test%:*}" --gtest_filter="${test#*:}" 2>&1 </dev/null) ||
            { printf '%s\n' "$output" >&2; die "${test#*:} does not hold, see above"; }
        echo "${test#*:} holds ${etc:+on disk}"
    done
done
rm -r "$lists"
