#!/usr/bin/env bash
# The main job: installs what the build needs, builds the worked example (and only
# what it needs) with the default preset, then runs it in two processes: the server
# over HTTP on 127.0.0.1, the client against it; prints the client's transcript and
# then the server's, and stops the server. Build output goes to stderr, the
# transcript to stdout. TARN_BUILD_DIR picks another build directory than the preset's.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/deps.sh
build="${TARN_BUILD_DIR:-build/default}"
cmake --preset default -B "$build" >&2
cmake --build "$build" -j2 --target tarn-example >&2
bash examples/run_two_processes.sh "$build/examples/tarn-example"
