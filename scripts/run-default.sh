#!/bin/sh
# Installs what is needed, builds, and runs the bundled default case.
set -eu
cd "$(dirname "$0")/.."
./scripts/build.sh
cd examples/default
../../build/bin/vantorhd setup.toml
tail -n 3 setup.log
