#!/usr/bin/env bash
# Builds the libFuzzer targets (preset "fuzz": clang, AddressSanitizer and
# UndefinedBehaviorSanitizer) and runs each for the given number of seconds
# (default 60), side by side, each starting from its checked-in corpus.
#
#   bash scripts/fuzz.sh [seconds]
#
# New inputs are kept in build/fuzz/corpus/<target>/ (the checked-in seeds in
# fuzz/corpus/<target>/ stay as they are); a crashing input is written to
# build/fuzz/artifacts/ and the script fails.
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-60}
bash scripts/deps.sh
cmake --preset fuzz >/dev/null
cmake --build --preset fuzz

# The fuzzers run side by side: each stops after its own time, and two cores
# serve three of them well enough for a bounded run.
run() {  # run <target>
  local target=$1
  mkdir -p "build/fuzz/corpus/$target" build/fuzz/artifacts
  ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
    build/fuzz/fuzz/fuzz-$target -max_total_time="$seconds" -timeout=30 -rss_limit_mb=4096 \
      -print_final_stats=1 -artifact_prefix="build/fuzz/artifacts/$target-" \
      "build/fuzz/corpus/$target" "fuzz/corpus/$target" > "build/fuzz/$target.log" 2>&1
}
targets="catalogue data-objects wire"
declare -A pids
echo "== fuzz-{${targets// /,}} for ${seconds}s, side by side"
for target in $targets; do
  run "$target" &
  pids[$target]=$!
done
failed=0
for target in $targets; do
  if wait "${pids[$target]}"; then
    echo "== fuzz-$target"
  else
    failed=$((failed + 1))
    echo "== fuzz-$target: FOUND A PROBLEM"
    tail -n 60 "build/fuzz/$target.log"
  fi
  grep -E "^(Done|stat::number_of_executed_units|stat::peak_rss_mb)" "build/fuzz/$target.log" || true
done
if [ "$failed" -eq 0 ]; then
  echo "fuzz: all 3 fuzzers ran ${seconds}s without a finding"
else
  echo "fuzz: $failed fuzzer(s) found a problem (inputs in build/fuzz/artifacts/)"
  exit 1
fi
