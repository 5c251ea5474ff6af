#!/usr/bin/env bash
# Builds the libFuzzer targets (preset "fuzz": clang, AddressSanitizer and
# UndefinedBehaviorSanitizer) and runs each for the given number of seconds
# (default 60), one after the other, starting from its checked-in corpus.
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

passed=0
failed=0
for target in catalogue data-objects wire; do
  work=build/fuzz/corpus/$target
  artifacts=build/fuzz/artifacts
  mkdir -p "$work" "$artifacts"
  echo "== fuzz-$target for ${seconds}s"
  if ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
     build/fuzz/fuzz/fuzz-$target -max_total_time="$seconds" -timeout=30 -rss_limit_mb=4096 \
       -print_final_stats=1 -artifact_prefix="$artifacts/$target-" "$work" "fuzz/corpus/$target" \
       > "build/fuzz/$target.log" 2>&1; then
    passed=$((passed + 1))
  else
    failed=$((failed + 1))
    tail -n 60 "build/fuzz/$target.log"
  fi
  grep -E "^(Done|stat::number_of_executed_units|stat::peak_rss_mb)" "build/fuzz/$target.log" || true
done
if [ "$failed" -eq 0 ]; then
  echo "fuzz: all $passed fuzzers ran ${seconds}s without a finding"
else
  echo "fuzz: $failed fuzzer(s) found a problem (inputs in build/fuzz/artifacts/)"
  exit 1
fi
