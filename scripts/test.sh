#!/usr/bin/env bash
# Builds the project and runs every test.
#
#   scripts/test.sh              g++ build in build/
#   scripts/test.sh --clang      clang build in build-clang/
#   scripts/test.sh --sanitize   AddressSanitizer + UndefinedBehaviorSanitizer build in build-san/
#
# Warnings are errors in all of them.
set -euo pipefail
cd "$(dirname "$0")/.."

build_dir=build
options=(-DVRX_WERROR=ON)
for arg in "$@"; do
  case "$arg" in
    --clang)
      build_dir=build-clang
      options+=(-DCMAKE_CXX_COMPILER=clang++)
      ;;
    --sanitize)
      build_dir=build-san
      options+=(-DVRX_SANITIZE=ON)
      export ASAN_OPTIONS=${ASAN_OPTIONS:-detect_leaks=1:abort_on_error=1:strict_string_checks=1}
      export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1:halt_on_error=1}
      ;;
    *)
      echo "usage: scripts/test.sh [--clang] [--sanitize]" >&2
      exit 64
      ;;
  esac
done

jobs=$(nproc 2>/dev/null || echo 2)
cmake -S . -B "$build_dir" -G Ninja "${options[@]}"
cmake --build "$build_dir" --parallel "$jobs"
ctest --test-dir "$build_dir" --output-on-failure --parallel "$jobs"
