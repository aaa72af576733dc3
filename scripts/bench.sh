#!/usr/bin/env bash
# Builds the benchmarks for x86_64 and i386 and prints, per target, one table
# per kernel: each implementation's throughput and the ratio ours/peer.
#   scripts/bench.sh [FILTER]   FILTER is a Google Benchmark name regex.
# Benchmarks are named KERNEL/IMPLEMENTATION/SIZE; "zvutil" is this library.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh python3 libbenchmark-dev libbenchmark-dev:i386 libxxhash-dev \
    libssl-dev libssl-dev:i386 libsodium-dev libsodium-dev:i386
filter=${1:-.}
targets=${ZV_BENCH_TARGETS:-x86_64 i386}

for target in $targets; do
    dir=build/bench-$target
    cmake --preset "bench-$target" >/dev/null
    cmake --build --preset "bench-$target" >/dev/null
    runner=""
    [ "$target" = x86_64 ] || runner=$(scripts/i386-runner.sh)
    run=(${runner:+"$runner"}) note=""
    if [ -n "$runner" ]; then
        note="emulated under qemu-i386: the figures show that the programs run, not the speed"
    fi
    rm -rf "$dir/results" && mkdir -p "$dir/results"
    for program in "$dir"/benchmarks/*_bench; do
        "${run[@]}" "$program" --benchmark_filter="$filter" --benchmark_format=json \
            --benchmark_out="$dir/results/$(basename "$program").json" >/dev/null
    done
    python3 scripts/bench_table.py --title "$target" --note "$note" "$dir"/results/*.json
done
