#!/usr/bin/env bash
# The server's figure without our client: `wrk` (Debian's wrk, apt-get install wrk;
# needed for this measurement only) posts DebugAcquireLock envelopes to the worked
# example's server over keep-alive connections.
#   bench/wrk/run.sh [BUILD-DIR] [CONNECTIONS] [SECONDS]   (build/release, 16, 10)
# The build directory is configured as bench/run.sh does when it is not yet.
set -euo pipefail
cd "$(dirname "$0")/../.."
build=${1:-build/release}
connections=${2:-16}
seconds=${3:-10}
[ -f "$build/CMakeCache.txt" ] || cmake -S . -B "$build" -G Ninja -DCMAKE_BUILD_TYPE=Release >/dev/null
cmake --build "$build" -j2 --target tarn-example >/dev/null
log=$(mktemp)
"$build/examples/tarn-example" serve >"$log" &
server=$!
trap 'kill "$server" 2>/dev/null; rm -f "$log"' EXIT
for _ in $(seq 100); do grep -q '^token: ' "$log" && break; sleep 0.05; done
url=$(sed -n 's/^url: //p' "$log")
echo "load average before: $(cut -d' ' -f1-3 /proc/loadavg)"
TARN_EXAMPLE_TOKEN=$(sed -n 's/^token: //p' "$log") \
  wrk -t"$((connections < 2 ? 1 : 2))" -c"$connections" -d"${seconds}s" --latency -s bench/wrk/acquire_lock.lua "$url"
