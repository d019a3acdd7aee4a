#!/usr/bin/env bash
# Installs what the build needs beyond the machine's preinstalled tools
# (g++, clang, cmake, ninja, GoogleTest, Google Benchmark, valgrind).
# Packages come from Debian; nothing is installed when all are present.
set -euo pipefail

needed=()
# pkg-config and valgrind serve the install and memory-check tests.
for tool in cmake ninja g++ clang++ pkg-config valgrind; do
  command -v "$tool" >/dev/null 2>&1 || needed+=("$tool")
done
[ -f /usr/include/gtest/gtest.h ] || needed+=(libgtest-dev)
# The fuzz targets need clang's libFuzzer runtime.
clang_major=""
if command -v clang++ >/dev/null 2>&1; then
  clang_major=$(clang++ -dumpversion | cut -d. -f1)
  fuzzer_lib=$(clang++ -print-file-name=libclang_rt.fuzzer-x86_64.a)
  [ -f "$fuzzer_lib" ] || needed+=(libclang-rt-dev)
fi

if [ ${#needed[@]} -eq 0 ]; then
  exit 0
fi

declare -A package_of=([cmake]=cmake [ninja]=ninja-build [g++]=g++ [clang++]=clang
                       [pkg-config]=pkgconf [valgrind]=valgrind
                       [libgtest-dev]=libgtest-dev
                       [libclang-rt-dev]=libclang-rt-${clang_major:-14}-dev)
packages=()
for item in "${needed[@]}"; do packages+=("${package_of[$item]}"); done
echo "installing: ${packages[*]}"
sudo_cmd=()
[ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
"${sudo_cmd[@]}" apt-get update -qq
DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq "${packages[@]}"
