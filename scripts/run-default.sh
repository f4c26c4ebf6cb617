#!/bin/sh
# Installs what is needed, builds the engine and the tools (not the tests and
# benchmarks), and runs the bundled default case.
set -eu
cd "$(dirname "$0")/.."
./scripts/build.sh vantorhd vhd_tools
cd examples/default
../../build/bin/vantorhd setup.toml
tail -n 3 setup.log
