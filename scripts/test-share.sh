#!/usr/bin/env bash
# Fails when the test code (tests/ and the fuzz harnesses, not their corpora) is
# more than half the size of the rest of the hand-written code, so that it stays
# at most a third of the whole as the project grows. Counts tracked files' lines.
set -euo pipefail
cd "$(dirname "$0")/.."
git rev-parse --git-dir >/dev/null 2>&1 || { echo "not a git checkout: the test share is not measured"; exit 0; }
files=$(git ls-files | grep -E '\.(cpp|cc|h|hpp|py|sh)$|CMakeLists\.txt$' || true)
lines() { tr '\n' '\0' | xargs -0 -r cat | wc -l; }
tests=$(grep -E '(^|/)(tests?|fuzz)/' <<<"$files" | grep -v '/corpus/' | lines)
code=$(grep -v -E '(^|/)(tests?|fuzz)/' <<<"$files" | lines)
echo "test code: $tests lines; other hand-written code: $code lines"
if [ $((2 * tests)) -gt "$code" ]; then
  echo "test code is more than half the size of the other code" >&2
  exit 1
fi
