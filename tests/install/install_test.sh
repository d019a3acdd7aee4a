#!/usr/bin/env bash
# Installs the build into a scratch prefix and checks what a host finds there:
# the versioned library, headers, CMake package, pkg-config file, tools and
# man pages; then builds and runs the embedding example against it.
#
#   install_test.sh BUILD_DIR SOURCE_DIR CXX
set -euo pipefail
build_dir=$1 source_dir=$2 cxx=$3
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
prefix=$scratch/prefix

fail() { echo "FAIL: $*" >&2; exit 1; }

cmake --install "$build_dir" --prefix "$prefix" >/dev/null
libdir=$(cd "$prefix" && dirname "$(find . -name 'libvrx.so.*.*.*' | head -1)")
[ "$libdir" != . ] || fail "no versioned library installed"
soname=$(readelf -d "$prefix/$libdir"/libvrx.so.*.*.* | sed -n 's/.*Library soname: \[\(.*\)\]/\1/p')
[ "$soname" = libvrx.so.1 ] || fail "soname is '$soname'"
[ -L "$prefix/$libdir/libvrx.so" ] || fail "no development link libvrx.so"
for file in include/vrx/vrx.h include/vrx/hx_design.h share/man/man1/vrx2hxb.1 \
            share/man/man1/hxb2vrx.1 share/vrx/devices "$libdir/cmake/vrx/vrxConfig.cmake" \
            "$libdir/pkgconfig/vrx.pc"; do
  [ -e "$prefix/$file" ] || fail "$file not installed"
done

# The tools run from the prefix and find the library there.
"$prefix/bin/vrx2hxb" --version | grep -q '^vrx2hxb ' || fail "installed vrx2hxb does not run"
"$prefix/bin/hxb2vrx" --version | grep -q '^hxb2vrx ' || fail "installed hxb2vrx does not run"

# A host project with find_package(vrx).
cmake -S "$source_dir/examples/host" -B "$scratch/host" -G Ninja -DCMAKE_CXX_COMPILER="$cxx" \
  -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$scratch/host" >/dev/null
mkdir "$scratch/out-cmake"
"$scratch/host/vrx_example" "$source_dir/examples/design.vrx" "$scratch/out-cmake"

# The same program through pkg-config.
export PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig
read -r -a flags <<<"$(pkg-config --cflags --libs vrx)"
"$cxx" "$source_dir/examples/host/main.cpp" "${flags[@]}" -Wl,-rpath,"$prefix/$libdir" \
  -o "$scratch/vrx_example_pc"
mkdir "$scratch/out-pc"
"$scratch/vrx_example_pc" "$source_dir/examples/design.vrx" "$scratch/out-pc"

for out in out-cmake out-pc; do
  ls "$scratch/$out"/*.hxb >/dev/null 2>&1 || fail "$out: no design file written"
  ls "$scratch/$out"/*.vrx >/dev/null 2>&1 || fail "$out: no text written"
done
echo "install package: ok"
