#!/bin/sh
# Installs what is needed, builds, and runs every test (the fuzz corpus of
# tests/fuzz among them); then the same again in a build with the address
# and undefined-behaviour sanitizers (scripts/test-sanitize.sh).
set -eu
cd "$(dirname "$0")/.."
./scripts/build.sh
ctest --test-dir build --output-on-failure -j "$(nproc)" --timeout 1800
./scripts/test-sanitize.sh
