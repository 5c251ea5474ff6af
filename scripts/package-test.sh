#!/usr/bin/env bash
# Installs a build into a temporary prefix, then builds and runs the consumer
# project of tests/package against the installed tree only: once through
# find_package(Tarn) and tarn_generate, once through pkg-config. Both link with
# --as-needed, so a library dropped as unneeded would show as missing types.
#
#   bash scripts/package-test.sh [build dir]      (default build/default, built)
set -euo pipefail
cd "$(dirname "$0")/.."
build=${1:-build/default}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
prefix=$work/prefix
cmake --install "$build" --prefix "$prefix" >/dev/null
# The consumer is copied out, so that nothing in it can reach the source tree.
cp -r tests/package "$work/src"
flags="-Wall -Wextra -Werror"

expect() {  # expect <output file> <line>...
  local out=$1; shift
  for line in "$@"; do
    grep -qxF "$line" "$out" || { echo "package-test: missing '$line' in:"; cat "$out"; exit 1; } >&2
  done
}

echo "== find_package"
cmake -S "$work/src" -B "$work/cmake" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_BUILD_TYPE=Debug \
      -DCMAKE_CXX_FLAGS="$flags" -DCMAKE_EXE_LINKER_FLAGS=-Wl,--as-needed >/dev/null
cmake --build "$work/cmake" -j2 >/dev/null
"$work/cmake/consumer" | tee "$work/cmake.out"
expect "$work/cmake.out" "loaded: [vault] guest-7/guest-7.cfg" "book holds: 1" "registered tarn types: 124"
"$work/cmake/count-types" | tee "$work/count.out"
expect "$work/count.out" "tarn types: 124" "quill types: 2"

echo "== pkg-config"
export PKG_CONFIG_PATH=$prefix/lib/pkgconfig
gen=$(pkg-config --variable=tarn_gen tarn-orbit)
"$gen" --idl "$work/src/idl" --out "$work/pc/gen"
mapfile -t sources < <(find "$work/pc/gen" -name '*.cpp' ! -name doubles.cpp)
# shellcheck disable=SC2046
g++ -std=c++20 $flags -shared -fPIC -I"$work/pc/gen" "${sources[@]}" -o "$work/pc/libquill-ledger.so" \
    $(pkg-config --cflags --libs tarn-orbit)
# shellcheck disable=SC2046
g++ -std=c++20 $flags -Wl,--as-needed -I"$work/pc/gen" "$work/src/consumer.cpp" -o "$work/pc/consumer" \
    -L"$work/pc" -lquill-ledger $(pkg-config --cflags --libs tarn-types) -Wl,-rpath,"$prefix/lib:$work/pc"
# shellcheck disable=SC2046
g++ -std=c++20 $flags -Wl,--as-needed "$work/src/count_types.cpp" -o "$work/pc/count-types" \
    $(pkg-config --cflags --libs tarn-types) -Wl,-rpath,"$prefix/lib"
"$work/pc/consumer" | tee "$work/pc.out"
expect "$work/pc.out" "loaded: [vault] guest-7/guest-7.cfg" "book holds: 1" "registered tarn types: 124"
"$work/pc/count-types" | tee "$work/pc-count.out"
expect "$work/pc-count.out" "tarn types: 124"
echo "package-test: both routes passed"
