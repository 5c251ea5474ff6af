#!/usr/bin/env bash
# The main job: installs what the build needs, builds tarn-catalog (and only what it
# needs) with the default preset, and lists what "tarn.version.version6" sees.
# Build output goes to stderr, the listing to stdout. TARN_BUILD_DIR picks another
# build directory than the preset's.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh
build="${TARN_BUILD_DIR:-build/default}"
cmake --preset default -B "$build" >&2
cmake --build "$build" -j2 --target tarn-catalog >&2
"$build/tools/tarn-catalog/tarn-catalog" --api-version tarn.version.version6
