#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Measures the library against raw libdbus and against other D-Bus libraries, all on private buses
# in one run, and writes docs/performance.md with its chart and its figures. Installs the Debian
# packages that are missing.
#   scripts/bench.sh [--quick]   --quick: too short for good figures; leaves docs/ as it is
# BENCH_FOLDER names another build folder than build-bench. KES_BENCH_BASELINE names the
# libkesbluetooth.so.1 of another build: it is measured beside this one, and the page compares them
# (not whole programs, which may need the library of their own version).
source "$(dirname "$0")/lib.sh"

rounds=3 repetitions=30 lists=20 signals=8 scheduling=3 idle=20 shortest=0.1 threads=5 processes=10
scanner=5
folder=${BENCH_FOLDER:-$root/build-bench} results=$root/docs baseline=${KES_BENCH_BASELINE:-}
case "${1:-}" in
--quick)
    rounds=1 repetitions=3 lists=1 signals=1 scheduling=1 idle=2 shortest=0.005 threads=1
    processes=2 scanner=1 results=$folder
    ;;
"") ;;
*) echo "usage: bench.sh [--quick]" >&2; exit 2 ;;
esac
[ -z "$baseline" ] || { [ -e "$baseline" ] && [ "${baseline##*/}" = libkesbluetooth.so.1 ]; } ||
    die "KES_BENCH_BASELINE has to name a libkesbluetooth.so.1: $baseline"

need_packages "${build_packages[@]}" "${bench_packages[@]}"
build_target=bench/all
build "$folder" -DKESBLUETOOTH_BUILD_BENCH=ON -DKESBLUETOOTH_BUILD_TESTS=OFF

raw=$folder/results
rm -rf "$raw"
mkdir -p "$raw"
export BENCHMARK_MIN_TIME=$shortest KES_BENCH_IDLE_SECONDS=$idle KES_BENCH_SCANNER_SECONDS=$scanner

# On one processor a figure is the work that all take part in; on all of them it holds as well what
# the scheduler makes of it, which varies far more. What else the machine does should count as
# little as can be had.
one=(taskset -c "$(taskset -cp $$ | sed 's/.*[^0-9]//')")
all=(env) real=() plain=()
if chrt -f 1 true 2>/dev/null; then
    plain=("${one[@]}")
    real=(chrt -f 1)
    one+=("${real[@]}")
    all=(nice -n -10)
fi

# measure WHERE PROGRAM ROUND REPETITIONS GROUPS [LIBRARIES]: runs the benchmarks of these groups
# and libraries (extended regular expressions; default: all), their repetitions in random order;
# then ours with the version before.
measure() {
    local -n command=$1
    local program=$folder/bench/kesbluetooth-bench-$2 libraries=${6:-[^/]*}
    run_benchmark "$1.$2.$3" "$4" "^($5)(/[^/]*)?/($libraries)(/|$)"
    if [ -n "$baseline" ] && [[ kesbluetooth =~ ^($libraries)$ ]]; then
        LD_LIBRARY_PATH=$(dirname "$baseline") \
            run_benchmark "$1.$2-before.$3" "$4" "^($5)(/[^/]*)?/kesbluetooth(/|$)"
    fi
}

run_benchmark() {
    local result=$raw/$1.json
    "${command[@]}" "$program" --benchmark_repetitions="$2" --benchmark_filter="$3" \
        --benchmark_enable_random_interleaving --benchmark_out="$result" >"$raw/output" 2>&1 ||
        { cat "$raw/output" >&2; die "${program##*/} failed; its output is above"; }
    ! grep -q '"error_occurred": true' "$result" ||
        die "${program##*/} reports an error; see $result"
}

for ((round = 1; round <= rounds; ++round)); do
    echo "Measuring, round $round of $rounds ..."
    for where in one all; do
        measure $where call $round $repetitions call
        measure $where list $round $lists 'list|presence-check'
        measure $where signal $round $signals 'signal|call'
        measure $where signal most-$round 1 most-signals
    done
    if [ ${#real[@]} -gt 0 ]; then
        for where in plain real; do
            measure $where signal $round $scheduling signal 'kesbluetooth|sdbus-c..'
        done
    fi
    measure one data $round 1 '[^/]*'
    measure all thread $round $threads threads
    if [ -x "$folder/bench/kesbluetooth-bench-process" ]; then
        baseline= measure all process $round $processes '[^/]*'
        for load in found-1000 known-1000 found-4000; do
            baseline= measure all scanner $load-$round 1 "scanner/$load"
        done
    fi
done
echo "Measuring idle threads ..."
for library in kesbluetooth 'sdbus-c..' GDBus; do
    measure one signal "idle-${library%%.*}" 1 idle-minute "$library"
done

"$root/bench/report.py" "$results" "$raw"
echo "Written: ${results#"$root"/}/performance.md, performance.svg and performance.json"
