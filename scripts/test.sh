#!/usr/bin/env bash
# Builds and runs the tests: every suite under the release preset (optimised, the
# objects' own allocator, the benchmarks run once each as a smoke test; warnings
# are errors), then the installed package consumed by a project of its own
# (scripts/package-test.sh); every suite but the benchmarks under AddressSanitizer
# with UndefinedBehaviorSanitizer (a debug build, assertions on); the concurrency
# suites (ctest label "concurrency", built by the target concurrency-suites) under
# ThreadSanitizer; then each fuzzer for a bounded 20 seconds (TARN_FUZZ_SECONDS
# changes that, 0 skips them). First of all, the test code must stay within half
# the size of the other code. TARN_PRESETS picks presets (default too).
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh test
bash scripts/test-share.sh
for preset in ${TARN_PRESETS:-release asan tsan}; do
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
    echo "== installed package"
    bash scripts/package-test.sh "build/$preset"
    ;;
  esac
done
fuzz_seconds=${TARN_FUZZ_SECONDS:-20}
if [ "$fuzz_seconds" != 0 ]; then
  echo "== fuzzers"
  bash scripts/fuzz.sh "$fuzz_seconds"
fi
