#!/usr/bin/env bash
# Builds the benchmarks with the release preset, runs every workload with interleaved
# repetitions and rewrites the tables in bench/README.md from the JSON results.
#   TARN_BENCH_REPETITIONS  repetitions per bench  (default 9)
#   TARN_BENCH_MIN_TIME     seconds per repetition (default 0.2)
#   TARN_BENCH_FILTER       benchmark filter regex (default: all)
set -euo pipefail
cd "$(dirname "$0")/.."
build=build/release
repetitions=${TARN_BENCH_REPETITIONS:-9}
min_time=${TARN_BENCH_MIN_TIME:-0.2}
filter=${TARN_BENCH_FILTER:-.}

cmake --preset release >/dev/null
cmake --build "$build" -j2 --target tarn-bench
results="$build/bench/results.json"
"$build/bench/tarn-bench" \
  --benchmark_filter="$filter" \
  --benchmark_repetitions="$repetitions" \
  --benchmark_enable_random_interleaving=true \
  --benchmark_min_time="$min_time" \
  --benchmark_out="$results" --benchmark_out_format=json
/usr/bin/python3 bench/table.py "$results" bench/README.md
