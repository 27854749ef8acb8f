#!/bin/sh
# Sets up a Debian 12 machine, builds Docuvane and runs every test: unit
# tests, GUI and end-to-end tests (each on its own Xvfb display), and the unit
# tests again under AddressSanitizer + UndefinedBehaviorSanitizer.
set -eu
cd "$(dirname "$0")/.."
scripts/install-deps.sh
scripts/build.sh --asan

status=0
echo "=== format"
tests/check-format.sh || status=1
echo "=== unit tests (AddressSanitizer + UBSan)"
(cd build-asan && ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
  ctest --output-on-failure -j "$(nproc)") || status=1
echo "=== all tests"
(cd build && ctest --output-on-failure -j "$(nproc)") || status=1
exit $status
