#!/usr/bin/env bash
# Builds everything and passes the tests. Installs the Debian packages that are missing.
#   scripts/check.sh [--sanitize address,undefined | --sanitize thread] [ctest option...]
source "$(dirname "$0")/lib.sh"

folder=$root/build
options=(-DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE=)
if [ "${1:-}" = --sanitize ]; then
    [ $# -ge 2 ] || { echo "usage: check.sh [--sanitize KIND] [ctest option...]" >&2; exit 2; }
    folder=$root/build-${2//,/-}
    options=(-DKESBLUETOOTH_BUILD_TESTS=ON -DKESBLUETOOTH_SANITIZE="$2")
    shift 2
fi

need_packages "${build_packages[@]}" "${test_packages[@]}"
echo "Building in ${folder#"$root"/} ..."
build "$folder" "${options[@]}"
echo "Testing ..."
ctest --test-dir "$folder" --output-on-failure -j "$(nproc)" "$@"
