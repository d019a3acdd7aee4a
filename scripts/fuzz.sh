#!/usr/bin/env bash
# Builds the libFuzzer targets with clang (ASan + UBSan) and runs each one for a
# bounded time on its corpus in fuzz/corpus/<target>/.
#
#   scripts/fuzz.sh [SECONDS_PER_TARGET] [TARGET...]     default 60 s, all targets
#
# New inputs found during the run go to a scratch directory, not into the
# repository's corpus; a crash leaves its reproducer in build-fuzz/artifacts/.
set -euo pipefail
cd "$(dirname "$0")/.."

seconds=${1:-60}
shift || true
build_dir=build-fuzz
cmake -S . -B "$build_dir" -G Ninja -DCMAKE_CXX_COMPILER=clang++ -DVRX_WERROR=ON \
  -DVRX_SANITIZE=ON -DVRX_BUILD_FUZZ=ON -DVRX_BUILD_TESTS=OFF -DVRX_BUILD_BENCH=OFF
cmake --build "$build_dir" --parallel "$(nproc 2>/dev/null || echo 2)"

targets=("$@")
if [ ${#targets[@]} -eq 0 ]; then
  shopt -s nullglob
  for dir in fuzz/corpus/*/; do targets+=("$(basename "$dir")"); done
fi
if [ ${#targets[@]} -eq 0 ]; then
  echo "no fuzz targets"
  exit 0
fi
export ASAN_OPTIONS=${ASAN_OPTIONS:-detect_leaks=1:abort_on_error=1}
export UBSAN_OPTIONS=${UBSAN_OPTIONS:-print_stacktrace=1:halt_on_error=1}
mkdir -p "$build_dir/artifacts"
for target in "${targets[@]}"; do
  scratch=$(mktemp -d)
  echo "== fuzzing $target for ${seconds}s"
  "$build_dir/bin/$target" -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 \
    -artifact_prefix="$build_dir/artifacts/$target-" -print_final_stats=1 \
    "$scratch" "fuzz/corpus/$target"
  rm -rf "$scratch"
done
