#!/usr/bin/env bash
# Builds and runs every test: the default preset (warnings are errors), then
# AddressSanitizer with UndefinedBehaviorSanitizer, then ThreadSanitizer.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh
for preset in ${TARN_PRESETS:-default asan tsan}; do
  echo "== preset $preset"
  cmake --preset "$preset" >/dev/null
  cmake --build --preset "$preset"
  ctest --preset "$preset" -j2
done
