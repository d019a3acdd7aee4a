#!/bin/sh
# Builds the project and converts the bundled example design to text:
# examples/make_design stores a small design file, hxb2vrx writes it as VRX.
set -eu
cd "$(dirname "$0")/.."
scripts/install-deps.sh
cmake -S . -B build-demo -G Ninja -DVRX_BUILD_TESTS=OFF -DVRX_BUILD_BENCH=OFF >/dev/null
cmake --build build-demo --target make_design hxb2vrx
out=build-demo/example
mkdir -p "$out"
build-demo/bin/make_design "$out/counter.hxb"
build-demo/bin/hxb2vrx "$out/counter.hxb" "$out/counter.vrx"
echo
cat "$out/counter.vrx"
