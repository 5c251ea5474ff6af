#!/usr/bin/env bash
# Builds and runs the tests: every suite under the default preset (warnings are
# errors), then the installed package consumed by a project of its own
# (scripts/package-test.sh); every suite but the benchmarks under AddressSanitizer
# with UndefinedBehaviorSanitizer; the concurrency suites (ctest label
# "concurrency", built by the target concurrency-suites) under ThreadSanitizer;
# the release preset's libraries and benchmarks, built (warnings are errors) and
# not run; then each fuzzer for a bounded 60 seconds (TARN_FUZZ_SECONDS changes
# that, 0 skips them). First of all, the test code must stay within half the size
# of the other code.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh test
bash scripts/test-share.sh
for preset in ${TARN_PRESETS:-default asan tsan release}; do
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
  release)
    cmake --preset release >/dev/null
    cmake --build --preset release-libraries
    ;;
  *)
    cmake --preset "$preset" >/dev/null
    cmake --build --preset "$preset"
    ctest --preset "$preset" -j2
    if [ "$preset" = default ]; then
      echo "== installed package"
      bash scripts/package-test.sh build/default
    fi
    ;;
  esac
done
fuzz_seconds=${TARN_FUZZ_SECONDS:-60}
if [ "$fuzz_seconds" != 0 ]; then
  echo "== fuzzers"
  bash scripts/fuzz.sh "$fuzz_seconds"
fi
