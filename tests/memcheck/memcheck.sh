#!/usr/bin/env bash
# Runs each tool on the examples under memcheck. Any memory error, or a block
# lost for good (definitely or indirectly), fails the run; memory still
# reachable at exit (process-wide tables) does not.
#
#   memcheck.sh VALGRIND BIN_DIR EXAMPLES_DIR
set -euo pipefail
valgrind=$1 bin=$2 examples=$3
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
status=0

# check EXPECTED_EXIT PROGRAM ARGS...: runs under memcheck, expects the exit status.
check() {
  local expected=$1
  shift
  local log=$scratch/memcheck.log got=0
  "$valgrind" --quiet --error-exitcode=99 --leak-check=full --show-leak-kinds=definite,indirect \
    --errors-for-leak-kinds=definite,indirect --log-file="$log" "$@" \
    >"$scratch/stdout" 2>"$scratch/stderr" || got=$?
  if [ "$got" -ne "$expected" ] || [ -s "$log" ]; then
    echo "FAIL (exit $got, expected $expected): $*"
    cat "$log" "$scratch/stderr"
    status=1
  else
    echo "ok: $(basename "$1") ${*:2}"
  fi
}

cp "$examples/design.vrx" "$examples/library.vrx" "$scratch/"
printf 'DESIGN broken {\n  BLOCK top 2 (\n' >"$scratch/broken.vrx"

check 0 "$bin/vrx2hxb" -o "$scratch/design.hxb" "$scratch/design.vrx"
check 0 "$bin/vrx2hxb" -l -o "$scratch/library.hxl" "$scratch/library.vrx"
check 0 "$bin/hxb2vrx" "$scratch/design.hxb" "$scratch/design.out.vrx"
check 0 "$bin/hxb2vrx" -f "$examples/props.filter" "$scratch/library.hxl" "$scratch/library.out.vrx"
check 2 "$bin/vrx2hxb" -o "$scratch/broken.hxb" "$scratch/broken.vrx"
check 1 "$bin/hxb2vrx" "$scratch/missing.hxb" "$scratch/missing.vrx"
mkdir "$scratch/example"
check 0 "$bin/vrx_example" "$scratch/design.vrx" "$scratch/example"
exit $status
