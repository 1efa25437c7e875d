#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Fuzzes the decoders, the dispatchers, the text codec and the file readers with libFuzzer, under
# the address and undefined-behaviour sanitizers. Fails on the first finding, and says where the
# input lies that shows it.
#   scripts/fuzz.sh [SECONDS]    for each target, 600 unless said otherwise
#   scripts/fuzz.sh --short      30 s in all
source "$(dirname "$0")/lib.sh"

targets=(dictionary signal agent codec auto_connect_file)
seconds=${1:-600}
[ "$seconds" != --short ] || seconds=$((30 / ${#targets[@]}))
[[ $seconds =~ ^[1-9][0-9]*$ ]] || { echo "usage: fuzz.sh [SECONDS | --short]" >&2; exit 2; }

folder=$root/build-fuzz
need_packages "${build_packages[@]}" clang-14 libclang-rt-14-dev
build "$folder" -DCMAKE_C_COMPILER=clang-14 -DCMAKE_CXX_COMPILER=clang++-14 \
    -DKESBLUETOOTH_SANITIZE=fuzzer-no-link,address,undefined -DKESBLUETOOTH_BUILD_FUZZERS=ON \
    -DKESBLUETOOTH_BUILD_TESTS=OFF -DKESBLUETOOTH_BUILD_TOOLS=OFF -DKESBLUETOOTH_BUILD_SIM=OFF

export UBSAN_OPTIONS=halt_on_error=1:print_stacktrace=1
for target in "${targets[@]}"; do
    # New inputs go to the first folder, which a later run goes on from; the seeds are only read.
    mkdir -p "$folder/corpus/$target" "$folder/findings"
    # Leaks are looked for at the end: libdbus keeps messages from one input for the next.
    if ! "$folder/tests/fuzz/${target}_fuzzer" "$folder/corpus/$target" \
        "$root/tests/fuzz/corpus/$target" -max_total_time="$seconds" -detect_leaks=0 \
        -artifact_prefix="$folder/findings/$target-" -print_final_stats=1 \
        >"$folder/$target.log" 2>&1; then
        tail -n 60 "$folder/$target.log" >&2
        die "$target: a fault was found, see ${folder#"$root"/}/findings"
    fi
    runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$folder/$target.log")
    reached=$(sed -n 's/.*DONE *cov: \([0-9]*\).*/\1/p' "$folder/$target.log")
    printf '%-18s %10s inputs, %s edges reached, no finding\n' "$target" "$runs" "$reached"
done
