#!/usr/bin/env bash
# Builds and runs the tests: every suite under the default preset (warnings are
# errors); every suite but the benchmarks under AddressSanitizer with
# UndefinedBehaviorSanitizer; the concurrency suites (ctest label "concurrency",
# built by the target concurrency-suites) under ThreadSanitizer; then each fuzzer
# for a bounded 60 seconds (TARN_FUZZ_SECONDS changes that, 0 skips them). First of
# all, the test code must stay within half the size of the other code.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh
bash scripts/test-share.sh
for preset in ${TARN_PRESETS:-default asan tsan}; do
  echo "== preset $preset"
  case $preset in
  asan)
    cmake --preset asan -DTARN_BUILD_BENCHMARKS=OFF >/dev/null
    cmake --build --preset asan
    ctest --preset asan -j2
    ;;
  tsan)
    cmake --preset tsan >/dev/null
    cmake --build --preset tsan --target concurrency-suites
    ctest --preset tsan -j2 -L concurrency
    ;;
  *)
    cmake --preset "$preset" >/dev/null
    cmake --build --preset "$preset"
    ctest --preset "$preset" -j2
    ;;
  esac
done
fuzz_seconds=${TARN_FUZZ_SECONDS:-60}
if [ "$fuzz_seconds" != 0 ]; then
  echo "== fuzzers"
  bash scripts/fuzz.sh "$fuzz_seconds"
fi
