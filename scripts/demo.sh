#!/bin/sh
# Builds the project and runs the main job on the bundled example: the text
# netlist examples/design.vrx becomes a design file (vrx2hxb), which becomes
# text again (hxb2vrx); the result is printed.
set -eu
cd "$(dirname "$0")/.."
scripts/install-deps.sh
cmake -S . -B build-demo -G Ninja -DVRX_BUILD_TESTS=OFF -DVRX_BUILD_BENCH=OFF >/dev/null
cmake --build build-demo --target vrx2hxb hxb2vrx
out=build-demo/example
mkdir -p "$out"
echo
build-demo/bin/vrx2hxb -o "$out/design.hxb" examples/design.vrx
build-demo/bin/hxb2vrx "$out/design.hxb" "$out/design.vrx"
echo
cat "$out/design.vrx"
echo
echo "examples/design.vrx -> $out/design.hxb -> $out/design.vrx"
