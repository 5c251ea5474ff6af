#!/usr/bin/env bash
# Installs what the build needs on Debian 12 (run as root). Does nothing when all is there.
#   bash scripts/deps.sh [test]   "test" adds what only the test job uses
set -euo pipefail
packages=(g++ cmake ninja-build libboost-dev libgtest-dev libgmock-dev libbenchmark-dev
          nlohmann-json3-dev  # the tests read tarn-catalog's JSON with it
          libmimalloc-dev  # the allocator of Kernite's objects (kernite/Memory.h)
          libprotobuf-dev protobuf-compiler  # the benchmarks' side-by-side twin
          libpugixml-dev python3-zeep  # the wire's XML parser; the SOAP client that reads its WSDL
          libssl-dev openssl  # TLS of the HTTP transport; the tests make their certificates with openssl
          clang-14 libclang-rt-14-dev)  # clang and its libFuzzer, for the fuzz preset
if [ "${1:-}" = test ]; then
  packages+=(pkgconf                     # the installed package, consumed through pkg-config
             chromium chromium-driver)   # the API reference, browsed headless
fi
missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
if [ ${#missing[@]} -gt 0 ]; then
  export DEBIAN_FRONTEND=noninteractive
  apt-get update -qq
  apt-get install -y -qq --no-install-recommends "${missing[@]}"
fi
