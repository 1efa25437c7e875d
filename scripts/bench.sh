#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Measures the library against raw libdbus and against other D-Bus libraries, all on private buses
# in one run, and writes docs/performance.md with its chart and its figures. Installs the Debian
# packages that are missing.
#   scripts/bench.sh [--quick]   --quick: too short for good figures; leaves docs/ as it is
# BENCH_FOLDER names another build folder than build-bench.
source "$(dirname "$0")/lib.sh"

rounds=3 repetitions=30 lists=20 signals=8 idle=20 shortest=0.1 scanner=15
folder=${BENCH_FOLDER:-$root/build-bench} results=$root/docs
case "${1:-}" in
--quick) rounds=1 repetitions=3 lists=1 signals=1 idle=1 shortest=0.005 scanner=1 results=$folder ;;
"") ;;
*) echo "usage: bench.sh [--quick]" >&2; exit 2 ;;
esac

need_packages "${build_packages[@]}" "${bench_packages[@]}"
echo "Building in ${folder#"$root"/} ..."
build_target=bench/all
build "$folder" -DKESBLUETOOTH_BUILD_BENCH=ON -DKESBLUETOOTH_BUILD_TESTS=OFF

raw=$folder/results
rm -rf "$raw"
mkdir -p "$raw"

# On one processor a figure is the work that all take part in; on all of them it holds as well what
# the scheduler makes of it, which varies far more. What else the machine does should count as
# little as can be had.
one=(taskset -c "$(taskset -cp $$ | sed 's/.*[^0-9]//')")
all=(env)
if chrt -f 1 true 2>/dev/null; then
    one+=(chrt -f 1)
    all=(nice -n -10)
fi

# measure NAME RESULT [option...]: runs a benchmark, its repetitions in random order.
measure() {
    local name=$1 result=$raw/$2.json
    shift 2
    "$@" --benchmark_enable_random_interleaving \
        --benchmark_out="$result" >"$raw/output" 2>&1 ||
        { cat "$raw/output" >&2; die "$name failed; its output is above"; }
    ! grep -q '"error_occurred": true' "$result" || die "$name reports an error; see $result"
}

bench=$folder/bench/kesbluetooth-bench
for ((round = 1; round <= rounds; ++round)); do
    echo "Measuring, round $round of $rounds ..."
    measure calls "one.call.$round" "${one[@]}" "$bench-call" --benchmark_repetitions=$repetitions
    measure calls "all.call.$round" "${all[@]}" "$bench-call" --benchmark_repetitions=$repetitions
    measure lists "one.list.$round" "${one[@]}" "$bench-list" --benchmark_repetitions=$lists
    measure signals "one.signal.$round" "${one[@]}" "$bench-signal" \
        --benchmark_repetitions=$signals --benchmark_filter='^(signal|call)/'
    measure signals "all.signal.$round" "${all[@]}" "$bench-signal" \
        --benchmark_repetitions=$signals --benchmark_filter='^(signal|call)/'
    measure data "one.data.$round" "${all[@]}" "$bench-data" --benchmark_min_time=$shortest
done
echo "Measuring idle threads ..."
for library in kesbluetooth sdbus-c++ GDBus; do
    KES_BENCH_IDLE_SECONDS=$idle measure "idle threads" "one.idle-$library.1" \
        "${one[@]}" "$bench-signal" --benchmark_filter="^idle-processor.*/${library//+/.}/"
done

if [ -x "$bench-scanner" ]; then
    echo "Measuring the scanner service ..."
    "$bench-scanner" "$scanner" >"$raw/scanner.txt" || die "the scanner's load failed"
fi

"$root/bench/report.py" "$results" "$raw"
echo "Written: ${results#"$root"/}/performance.md, performance.svg and performance.json"
