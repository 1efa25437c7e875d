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
echo "Building in ${folder#"$root"/} ..."
build "$folder" "${options[@]}"
echo "Testing ..."
ctest --test-dir "$folder" --output-on-failure -j "$(nproc)" "$@"
# A test that was tried again must not have been stopped by a sanitizer the first time.
! grep -E '(Thread|Address|Leak)Sanitizer:|: runtime error: ' "$folder/Testing/Temporary/LastTest.log" ||
    die "a sanitizer has found a fault, see above"
