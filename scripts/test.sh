#!/usr/bin/env bash
# Builds and runs every test: the default preset (warnings are errors), then
# AddressSanitizer with UndefinedBehaviorSanitizer, then ThreadSanitizer; then
# each fuzzer for a bounded 60 seconds (TARN_FUZZ_SECONDS changes that, 0 skips them).
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh
for preset in ${TARN_PRESETS:-default asan tsan}; do
  echo "== preset $preset"
  cmake --preset "$preset" >/dev/null
  cmake --build --preset "$preset"
  ctest --preset "$preset" -j2
done
fuzz_seconds=${TARN_FUZZ_SECONDS:-60}
if [ "$fuzz_seconds" != 0 ]; then
  echo "== fuzzers"
  bash scripts/fuzz.sh "$fuzz_seconds"
fi
