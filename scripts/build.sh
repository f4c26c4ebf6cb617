#!/bin/sh
# Configures and builds VantorHD (Release) into build/: every target, or only
# the targets named as arguments (for example: ./scripts/build.sh vantorhd).
set -eu
cd "$(dirname "$0")/.."
./scripts/install-deps.sh
cmake -S . -B build -G Ninja -DCMAKE_BUILD_TYPE=Release
if [ $# -gt 0 ]; then
  cmake --build build -j "$(nproc)" --target "$@"
else
  cmake --build build -j "$(nproc)"
fi
