#!/usr/bin/env bash
# The worked example in two processes: starts `tarn-example serve` on 127.0.0.1, runs
# `tarn-example call` against it, prints the client's transcript and then the
# server's, and stops the server. Exits with the client's status.
#   run_two_processes.sh PATH-OF-TARN-EXAMPLE
set -uo pipefail
program=$1
log=$(mktemp)
"$program" serve >"$log" 2>&1 &
server=$!
trap 'kill "$server" 2>/dev/null; rm -f "$log"' EXIT
for _ in $(seq 200); do
  grep -q '^token: ' "$log" && break
  kill -0 "$server" 2>/dev/null || break
  sleep 0.05
done
url=$(sed -n 's/^url: //p' "$log")
token=$(sed -n 's/^token: //p' "$log")
if [ -z "$url" ] || [ -z "$token" ]; then
  echo "the server did not start:" >&2
  cat "$log" >&2
  exit 1
fi
TARN_EXAMPLE_TOKEN=$token "$program" call "$url"
status=$?
kill -TERM "$server"
wait "$server"
grep -v '^token: ' "$log"
exit $status
