#!/bin/sh
# Configures and builds Docuvane in build/ (and, with --asan, the display-free
# library and its unit tests with AddressSanitizer + UBSan in build-asan/).
set -eu
cd "$(dirname "$0")/.."

werror=OFF
[ "${CI:-}" = "true" ] && werror=ON

cmake -S . -B build -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DDOCUVANE_WERROR=$werror >/dev/null
cmake --build build -j "$(nproc)"

if [ "${1:-}" = "--asan" ]; then
  cmake -S . -B build-asan -G Ninja -DCMAKE_BUILD_TYPE=Debug -DDOCUVANE_WERROR=$werror \
    -DDOCUVANE_SANITIZE=ON -DDOCUVANE_UNIT_ONLY=ON >/dev/null
  cmake --build build-asan -j "$(nproc)" --target unit_tests
fi
