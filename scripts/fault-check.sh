#!/usr/bin/env bash
# Seeds faults one at a time and tells which tests catch each. Every argument is a
# patch; each is applied to this clean checkout, the default preset is built and
# CTest run, and the patch is taken out again. One line per patch:
#   <patch name>: <failed tests>      ("build" if it did not build, "-" if nothing failed)
# Run it on a scratch clone, before and after a change to the tests, to show that
# the change lost no fault-catching power.
set -uo pipefail
cd "$(dirname "$0")/.."
git diff --quiet || { echo "fault-check: the work tree has changes" >&2; exit 2; }
cmake --preset default >/dev/null || exit 2
for patch in "$@"; do
  name=$(basename "$patch" .patch)
  if ! git apply "$patch"; then
    echo "$name: does not apply"
    continue
  fi
  if cmake --build --preset default >"build/fault-$name.log" 2>&1; then
    failed=$(ctest --preset default -j2 --timeout 300 2>&1 | sed -n '/tests FAILED:/,$p' |
             grep -oE '[0-9]+ - [^ ]+' | sed 's/^[0-9]* - //' | tr '\n' ' ')
    echo "$name: ${failed:--}"
  else
    echo "$name: build"
  fi
  git apply -R "$patch"
done
