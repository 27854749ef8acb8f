#!/bin/sh
# Fails when a C++ file of src/, tools/, tests/ or bench/ is not formatted
# by the project's .clang-format.  `tests/check-format.sh --fix` formats them.
set -u
cd "$(dirname "$0")/.."
files=$(git ls-files 'src/*.cpp' 'src/*.h' 'tools/*.cpp' 'tools/*.h' 'tests/*.cpp' 'tests/*.h' \
  'bench/*.cpp' 'bench/*.h')
if [ "${1:-}" = "--fix" ]; then
  # shellcheck disable=SC2086
  clang-format -i $files
  exit 0
fi
# shellcheck disable=SC2086
if clang-format --dry-run -Werror $files 2>/tmp/check-format.$$; then
  rm -f /tmp/check-format.$$
  echo "check-format: every file keeps to .clang-format"
  exit 0
fi
grep -o '^[^:]*:[0-9]*' /tmp/check-format.$$ | sort -u | head -40
rm -f /tmp/check-format.$$
echo "check-format: the files above differ from .clang-format (tests/check-format.sh --fix)"
exit 1
