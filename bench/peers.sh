#!/usr/bin/env bash
# Reading speed against two other netlist readers, on the very same circuits:
# our vrx_read of the VRX form against ABC's and yosys's read_blif of the
# BLIF form (aig2vrx.py / gen_vrx.py write both from one circuit).
#
#   bench/peers.sh [--build-dir DIR] [--reps N] [--wall] [--circuits LIST] [--tsv]
#
# Installs Debian's berkeley-abc and yosys packages when they are missing
# (apt-get; run by hand, never in CI). Needs builder_bench, built in DIR
# (default: build). Circuits: the largest EPFL circuits and one million
# generated AND gates (syn1M), or those of the comma-separated LIST; files go
# to a temporary folder, removed at the end. --tsv prints, instead of the
# table, one line per circuit for bench/run.sh:
#   peers <TAB> circuit <TAB> prims <TAB> ours <TAB> ABC <TAB> yosys   (prims/s)
#
# Speeds are primitives per second, with the primitive count of our database
# for all three readers. Times are the best of N runs (default 3) in CPU time,
# user + system (--wall: wall-clock). ABC and yosys are timed as whole runs
# less a run that only starts and stops the tool; ours is the vrx_read call
# inside builder_bench --time, the first read of a fresh child process, so all
# three pay for the memory they touch first. Targets: at least 3 times ABC,
# 20 times yosys.
set -euo pipefail
cd "$(dirname "$0")/.."

build_dir=build
reps=3
wall=0
tsv=0
circuits=(hyp mem_ctrl div log2 multiplier sqrt syn1M)
while (($#)); do
  case "$1" in
    --build-dir) build_dir=$2; shift ;;
    --reps) reps=$2; shift ;;
    --wall) wall=1 ;;
    --tsv) tsv=1 ;;
    --circuits) IFS=, read -r -a circuits <<<"$2"; shift ;;
    *)
      echo "usage: bench/peers.sh [--build-dir DIR] [--reps N] [--wall] [--circuits LIST] [--tsv]" >&2
      exit 64
      ;;
  esac
  shift
done

netlists=${VRX_NETLISTS:-../shared/netlists}
bench=$build_dir/bin/builder_bench

[[ -x $bench ]] || { echo "peers.sh: $bench not found; build the builder_bench target" >&2; exit 1; }
[[ -f $netlists/aig2vrx.py ]] || { echo "peers.sh: no netlists in $netlists (set VRX_NETLISTS)" >&2; exit 1; }

# --- The peers ------------------------------------------------------------------------

install_peers() {
  local missing=()
  command -v berkeley-abc >/dev/null || missing+=(berkeley-abc)
  command -v yosys >/dev/null || missing+=(yosys)
  ((${#missing[@]})) || return 0
  local sudo=()
  ((EUID == 0)) || sudo=(sudo)
  echo "installing ${missing[*]} ..." >&2
  "${sudo[@]}" apt-get update -qq
  "${sudo[@]}" env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq "${missing[@]}" >/dev/null
}
install_peers

# --- Timing -------------------------------------------------------------------------

# Seconds of one run of the command, CPU (user + system) or wall-clock.
seconds_of() {
  local TIMEFORMAT times
  if ((wall)); then TIMEFORMAT='%R'; else TIMEFORMAT='%U %S'; fi
  times=$({ time "$@" >/dev/null 2>&1; } 2>&1) || { echo "peers.sh: failed: $*" >&2; return 1; }
  awk '{ s = 0; for (i = 1; i <= NF; ++i) s += $i; printf "%.4f\n", s }' <<<"$times"
}

# Best of $reps runs of the command.
best_of() {
  local best="" s
  for ((i = 0; i < reps; ++i)); do
    s=$(seconds_of "$@")
    best=$(awk -v a="$best" -v b="$s" 'BEGIN { print (a == "" || b < a) ? b : a }')
  done
  echo "$best"
}

# Seconds a tool spends reading: the run less a startup-only run (at least 1 ms).
read_seconds() {
  local full=$1 empty=$2
  awk -v f="$full" -v e="$empty" 'BEGIN { d = f - e; printf "%.4f\n", (d < 0.001 ? 0.001 : d) }'
}

# --- Circuits -----------------------------------------------------------------------

work=$(mktemp -d "${TMPDIR:-/tmp}/vrx-peers-XXXXXX")
trap 'rm -rf "$work"' EXIT

names=()
for c in "${circuits[@]}"; do
  [[ $c == syn1M ]] && continue
  [[ -f $netlists/epfl/$c.aig ]] || { echo "peers.sh: $c.aig not found, skipped" >&2; continue; }
  python3 "$netlists/aig2vrx.py" "$netlists/epfl/$c.aig" -o "$work/$c.vrx"
  python3 "$netlists/aig2vrx.py" "$netlists/epfl/$c.aig" --blif -o "$work/$c.blif"
  names+=("$c")
done
if [[ " ${circuits[*]} " == *" syn1M "* ]]; then
  echo "generating syn1M ..." >&2
  python3 "$netlists/gen_vrx.py" --gates 1000000 -o "$work/syn1M.vrx"
  python3 "$netlists/gen_vrx.py" --gates 1000000 --blif -o "$work/syn1M.blif"
  names+=(syn1M)
fi

abc_start=$(best_of berkeley-abc -c "quit")
yosys_start=$(best_of yosys -q -p "")

if ((!tsv)); then
  clock=$( ((wall)) && echo "wall-clock" || echo "CPU time, user + system")
  printf 'Reading speed in primitives per second (best of %s runs, %s)\n' "$reps" "$clock"
  printf 'targets: ours >= 3x ABC read_blif, >= 20x yosys read_blif\n\n'
  printf '%-11s %9s %12s %12s %12s %8s %-6s %8s %-6s\n' circuit prims ours ABC yosys "x ABC" "" "x yosys" ""
fi
for c in "${names[@]}"; do
  echo "timing $c ..." >&2
  time_flag=()
  ((wall)) && time_flag=(--wall)
  line=$("$bench" --time "$work/$c.vrx" --reps "$reps" "${time_flag[@]}")
  prims=$(sed -n 's/.*prims=\([0-9]*\) .*/\1/p' <<<"$line")
  ours=$(sed -n 's/.* seconds=\([0-9.]*\) .*/\1/p' <<<"$line")
  abc=$(read_seconds "$(best_of berkeley-abc -c "read_blif $work/$c.blif")" "$abc_start")
  yosys=$(read_seconds "$(best_of yosys -q -p "read_blif $work/$c.blif")" "$yosys_start")
  if ((tsv)); then
    awk -v c="$c" -v p="$prims" -v o="$ours" -v a="$abc" -v y="$yosys" \
      'BEGIN { printf "peers\t%s\t%d\t%.0f\t%.0f\t%.0f\n", c, p, p / o, p / a, p / y }'
    continue
  fi
  awk -v c="$c" -v p="$prims" -v o="$ours" -v a="$abc" -v y="$yosys" 'BEGIN {
    ra = a / o; ry = y / o
    printf "%-11s %9d %12.0f %12.0f %12.0f %8.1f %-6s %8.1f %-6s\n", c, p, p / o, p / a, p / y,
           ra, (ra >= 3 ? "ok" : "MISSED"), ry, (ry >= 20 ? "ok" : "MISSED")
  }'
done
