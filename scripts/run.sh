#!/bin/sh
# Sets up a Debian 12 machine, builds Docuvane and starts it on the sample
# TeX tree that comes with the project.  Arguments go to the program.
set -eu
cd "$(dirname "$0")/.."
scripts/install-deps.sh
scripts/build.sh
exec build/docuvane "$@"
