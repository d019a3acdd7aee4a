#!/usr/bin/env bash
# One report of every benchmark figure: builds the benchmarks, runs them all
# (host services, database, writer, reader, builder, and the two peers' BLIF
# readers through bench/peers.sh) and prints one table, a figure a row with
# its target and whether it is met, the peers side by side, and the machine.
#
#   bench/run.sh [--build-dir DIR] [--build-type TYPE] [--quick]
#
# --build-dir   build folder (default build-bench), configured with the tests off
# --build-type  CMake build type (default RelWithDebInfo, the project's default:
#               optimised, without assertions; the figures of earlier reports
#               come from it. Release's -O3 halves the speed of the reader
#               benchmark's bare loop, which flatters the parser's ratio to it)
# --quick       fewer repetitions, the smaller real netlists and a shorter
#               scaling series: a check of the script in a few minutes, not a
#               measurement
#
# The real netlists come from VRX_NETLISTS (default: ../shared/netlists beside
# the source tree); rows that need an absent one are skipped with a note.
# bench/peers.sh installs Debian's berkeley-abc and yosys when they are
# missing. Progress goes to standard error, the report to standard output.
set -euo pipefail
cd "$(dirname "$0")/.."

build_dir=build-bench
build_type=RelWithDebInfo
quick=0
usage() {
  echo "usage: bench/run.sh [--build-dir DIR] [--build-type TYPE] [--quick]" >&2
  exit 64
}
while (($#)); do
  case "$1" in
    --build-dir) (($# > 1)) || usage; build_dir=$2; shift ;;
    --build-type) (($# > 1)) || usage; build_type=$2; shift ;;
    --quick) quick=1 ;;
    *) usage ;;
  esac
  shift
done

benches=(host_bench db_bench reader_bench writer_bench builder_bench)
work=$(mktemp -d "${TMPDIR:-/tmp}/vrx-run-XXXXXX")
trap 'rm -rf "$work"' EXIT
rows=$work/rows.tsv     # figure, case, value, unit, target, status
notes=$work/notes.txt   # skipped rows and failures, printed under the table
: >"$rows"
: >"$notes"
started=$(date -u '+%Y-%m-%d %H:%M:%S UTC')
start_seconds=$SECONDS
load_at_start=$(cut -d' ' -f1-3 /proc/loadavg)

progress() { echo "run.sh: $*" >&2; }
note() { echo "$*" >>"$notes"; }
# 1234567 -> 1,234,567 (whatever the locale)
thousands() { sed -E ':a; s/(^|[^0-9.])([0-9]+)([0-9]{3})($|[^0-9])/\1\2,\3\4/; ta' <<<"$1"; }

# --- Build ------------------------------------------------------------------------------

build() {
  progress "building ${benches[*]} ($build_type) in $build_dir ..."
  if ! cmake -S . -B "$build_dir" -G Ninja -DCMAKE_BUILD_TYPE="$build_type" \
    -DVRX_BUILD_TESTS=OFF -DVRX_BUILD_BENCH=ON >"$work/configure.log" 2>&1; then
    tail -n 30 "$work/configure.log" >&2
    echo "run.sh: configuring $build_dir failed" >&2
    exit 1
  fi
  if ! cmake --build "$build_dir" --target "${benches[@]}" --parallel 2 >"$work/build.log" 2>&1; then
    grep -E -A5 'error|FAILED' "$work/build.log" | head -n 40 >&2
    echo "run.sh: building in $build_dir failed" >&2
    exit 1
  fi
}

# --- Netlists -------------------------------------------------------------------------

netlists=${VRX_NETLISTS:-$PWD/../shared/netlists}
export VRX_NETLISTS=$netlists
have_netlists=0
if [[ -f $netlists/gen_vrx.py && -f $netlists/aig2vrx.py ]]; then
  have_netlists=1
else
  note "netlists not found in $netlists (set VRX_NETLISTS): the rows of the generated flat" \
    "netlists, the EPFL circuits and the processor cores are skipped, and the peers"
fi

# --- Running a benchmark ----------------------------------------------------------------

# Runs one benchmark with its output in $work/NAME.out; false (with a note)
# when it fails, so that the other figures are still reported.
run_bench() {
  local name=$1
  shift
  progress "running $name ..."
  if "$@" >"$work/$name.out" 2>"$work/$name.err"; then return 0; fi
  note "$name failed: $(tail -n 3 "$work/$name.err" | tr '\n' ' ')"
  return 1
}

# Google Benchmark's JSON as "name <TAB> key <TAB> value" lines: one per numeric
# field of each run (medians only, where there are repetitions), times also in
# seconds (real_s, cpu_s); names without the run's decorations.
gbench_tsv() {
  python3 - "$1" <<'PY'
import json, sys

units = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}
with open(sys.argv[1]) as f:
    report = json.load(f)
for run in report.get("benchmarks", []):
    if run.get("run_type") == "aggregate" and run.get("aggregate_name") != "median":
        continue
    parts = run.get("run_name", run["name"]).split("/")
    name = "/".join(p for p in parts if ":" not in p and p not in ("real_time", "manual_time"))
    if run.get("error_occurred") or run.get("skipped"):
        print(f"{name}\terror\t{run.get('error_message', 'skipped')}")
        continue
    scale = units.get(run.get("time_unit", "ns"), 1e-9)
    for key in ("real_time", "cpu_time"):
        if key in run:
            print(f"{name}\t{key[:-5]}_s\t{run[key] * scale!r}")
    for key, value in run.items():
        if isinstance(value, (int, float)) and not isinstance(value, bool):
            print(f"{name}\t{key}\t{value!r}")
PY
}

# gbench_tsv of NAME's output into FILE; false (with a note) when it is no
# benchmark report.
gbench_rows() {
  gbench_tsv "$work/$1.out" >"$2" 2>"$work/$1.json-error" && return 0
  note "$1: output not readable: $(tail -n 1 "$work/$1.json-error")"
  return 1
}

# Value of KEY for benchmark NAME in a gbench_tsv file, or nothing.
gbench_value() {
  awk -F'\t' -v n="$2" -v k="$3" '$1 == n && $2 == k { print $3; exit }' "$1"
}

# Arithmetic on figures that may be missing: prints nothing when an operand is
# empty or a divisor zero. Usage: calc 'a / b' A B
calc() {
  local a=${2:-} b=${3:-}
  [[ -n $a && $a != - && -n $b && $b != - ]] || return 0
  awk -v a="$a" -v b="$b" "BEGIN { a += 0; b += 0; if (b != 0) printf \"%.10g\\n\", $1 }"
}

# Appends one row. TARGET is "-", ">= N" or "<= N"; an empty VALUE shows n/a.
row() {
  local figure=$1 case=$2 value=$3 format=$4 unit=$5 target=$6
  awk -v fig="$figure" -v c="$case" -v v="$value" -v f="$format" -v u="$unit" -v t="$target" \
    'BEGIN {
      status = "-"
      if (v == "" || v == "-") shown = "n/a"
      else {
        shown = sprintf(f, v)
        n = substr(t, 3) + 0
        if (t ~ /^>=/) status = (v + 0 >= n) ? "ok" : "MISSED"
        if (t ~ /^<=/) status = (v + 0 <= n) ? "ok" : "MISSED"
      }
      printf "%s\t%s\t%s\t%s\t%s\t%s\n", fig, c, shown, u, t, status
    }' >>"$rows"
}

# --- Host services: name tree and output stream -----------------------------------------

host_figures() {
  run_bench host_bench "$build_dir/bin/host_bench" --benchmark_format=json || return 0
  local t=$work/host.tsv names tree map
  gbench_rows host_bench "$t" || return 0
  for names in 1000 1000000; do
    tree=$(gbench_value "$t" "BM_NameTreeFindOrCreate/$names" items_per_second)
    map=$(gbench_value "$t" "BM_StdUnorderedMapFindOrCreate/$names" items_per_second)
    local label
    label="$(thousands "$names") names, 3 lookups each"
    row "host: name tree find-or-create" "$label" "$(calc 'a / b' "$tree" 1e6)" %.1f "M lookups/s" -
    row "host: std::unordered_map (peer)" "$label" "$(calc 'a / b' "$map" 1e6)" %.1f "M lookups/s" -
    row "host: name tree vs unordered_map" "$label" "$(calc 'a / b' "$tree" "$map")" %.2f "x faster" -
  done
  row "host: Port::Stream, short items" "to /dev/null" \
    "$(calc 'a / b' "$(gbench_value "$t" BM_StreamWriteItems bytes_per_second)" 1e6)" %.0f MB/s -
}

# --- Database: the million-gate design, its file ------------------------------------------

db_figures() {
  run_bench db_bench "$build_dir/bin/db_bench" --benchmark_format=json || return 0
  local t=$work/db.tsv c="1M AND2, 3M pins" file_mb
  gbench_rows db_bench "$t" || return 0
  file_mb=$(gbench_value "$t" BM_WriteDesignFile file_MB)
  row "db: build time, CPU" "$c" "$(gbench_value "$t" BM_BuildAndDesign cpu_s)" %.2f s -
  row "db: build speed" "$c" "$(calc 'a / b' "$(gbench_value "$t" BM_BuildAndDesign pins/s)" 1e6)" \
    %.2f "M pins/s" -
  row "db: peak memory, whole process" "$c" "$(gbench_value "$t" BM_BuildPeakMemory peak_MB)" %.0f MB -
  row "db: peak memory per pin" "$c" "$(gbench_value "$t" BM_BuildPeakMemory bytes/pin)" %.1f B/pin "<= 150"
  row "db: design file size" "$c" "$file_mb" %.1f MB -
  row "db: file write, wall, fsync included" "$c" \
    "$(calc 'a / b' "$file_mb" "$(gbench_value "$t" BM_WriteDesignFile real_s)")" %.0f MB/s -
  row "db: file read, wall" "$c" \
    "$(calc 'a / b' "$file_mb" "$(gbench_value "$t" BM_ReadDesignFile real_s)")" %.0f MB/s -
  row "db: plain read() of the file" "$c" "$(gbench_value "$t" BM_ReadDesignFile plain_read_MB/s)" \
    %.0f MB/s -
  row "db: file read vs plain read()" "$c" "$(gbench_value "$t" BM_ReadDesignFile ratio_to_read)" \
    %.4f ratio -
}

# --- Writer: the million-gate design as text ----------------------------------------------

writer_figures() {
  run_bench writer_bench "$build_dir/bin/writer_bench" --benchmark_format=json || return 0
  local t=$work/writer.tsv c
  gbench_rows writer_bench "$t" || return 0
  c="1M AND2, $(printf %.0f "$(gbench_value "$t" BM_WriteText file_MB)") MB text"
  row "writer: vrx_write, wall" "$c" "$(gbench_value "$t" BM_WriteText MB/s)" %.0f MB/s -
  row "writer: raw Port::Stream, same bytes" "$c" "$(gbench_value "$t" BM_RawStream MB/s)" %.0f MB/s -
  row "writer: vrx_write vs raw stream" "$c" "$(gbench_value "$t" BM_WriteText ratio_to_raw)" \
    %.2f ratio ">= 0.25"
  row "writer: raw stream + temp-file copy" "$c" "$(gbench_value "$t" BM_RawStreamCopied MB/s)" \
    %.0f MB/s -
  row "writer: vrx_write vs raw + copy" "$c" "$(gbench_value "$t" BM_WriteText ratio_to_raw_copied)" \
    %.2f ratio -
}

# --- Reader: scan and parse against a bare classifying loop -------------------------------

reader_figures() {
  local args=(--benchmark_format=json)
  if ((quick)); then
    args+=(--benchmark_filter=BM_Real)
  else
    args+=(--benchmark_repetitions=3 --benchmark_report_aggregates_only=true)
  fi
  run_bench reader_bench "$build_dir/bin/reader_bench" "${args[@]}" || return 0
  local t=$work/reader.tsv name c
  gbench_rows reader_bench "$t" || return 0
  cut -f1 "$t" | uniq >"$work/reader.names"
  while read -r name; do
    c=${name#*/}
    c=${c/_memory/, from memory}
    c=${c/_file/, from file}
    c=${c/syn700000/generated 700k gates}
    if [[ -n $(gbench_value "$t" "$name" error) ]]; then
      note "reader_bench $c: $(gbench_value "$t" "$name" error)"
      continue
    fi
    c="$c, $(printf %.1f "$(gbench_value "$t" "$name" MB)") MB"
    row "reader: parse, do-nothing callbacks" "$c" "$(gbench_value "$t" "$name" parse_MB/s)" %.0f MB/s -
    row "reader: bare classifying loop" "$c" "$(gbench_value "$t" "$name" classify_MB/s)" %.0f MB/s -
    row "reader: parse vs bare loop" "$c" "$(gbench_value "$t" "$name" ratio)" %.2f ratio ">= 0.5"
    row "reader: scanner alone" "$c" "$(gbench_value "$t" "$name" scan_MB/s)" %.0f MB/s -
  done <"$work/reader.names"
}

# --- Builder: text into the database and back, files against text, scaling --------------

builder_figures() {
  local args=(--tsv)
  ((quick)) && args+=(--reps 1 --only "hyp,serv,scaling" --scale-max 200000)
  run_bench builder_bench "$build_dir/bin/builder_bench" "${args[@]}" || return 0
  local out=$work/builder_bench.out
  grep -v -E '^(read|write|files|scale)'$'\t' "$out" | sed 's/^/builder_bench: /' >>"$notes" || true
  builder_reads "$out"
  builder_scaling "$out"
}

# The builder's rows for each netlist: reading, writing, files against text.
builder_reads() {
  local out=$1 kind name mb prims _pins _lib cold warm peak status
  while IFS=$'\t' read -r kind name mb prims _pins _lib cold warm peak status; do
    local c
    c="$name, $(printf %.1f "$mb") MB"
    if [[ $status != ok && $status != "DRC errors" ]]; then
      note "builder_bench $name: read failed ($status)"
      continue
    fi
    c="$c, $(thousands "$prims") prims"
    row "builder: vrx_read, cold" "$c" "$(calc 'a / b' "$mb" "$cold")" %.1f MB/s -
    row "builder: vrx_read, cold" "$c" "$(calc 'a / b / 1e6' "$prims" "$cold")" %.2f "M prims/s" -
    row "builder: vrx_read peak memory per pin" "$c" "$peak" %.1f B/pin "<= 150"
    builder_write_rows "$out" "$name" "$c" "$cold" "$warm"
  done < <(grep -E '^read'$'\t' "$out")
}

# Writing one netlist back as text, and the database file against the text.
builder_write_rows() {
  local out=$1 name=$2 c=$3 text_cold=$4 text_warm=$5
  local written="" text_write="" db_cold="" db_warm="" db_write=""
  read -r written text_write < <(awk -F'\t' -v n="$name" \
    '$1 == "write" && $2 == n { print $3, $4 }' "$out") || true
  read -r db_cold db_warm db_write < <(awk -F'\t' -v n="$name" \
    '$1 == "files" && $2 == n { print $4, $5, $6 }' "$out") || true
  row "builder: vrx_write" "$c" "$(calc 'a / b' "$written" "$text_write")" %.0f MB/s -
  row "builder: hxb_read vs vrx_read, cold" "$c" "$(calc 'a / b' "$text_cold" "$db_cold")" \
    %.2f "x faster" ">= 5"
  row "builder: hxb_read vs vrx_read, warm" "$c" "$(calc 'a / b' "$text_warm" "$db_warm")" \
    %.2f "x faster" ">= 5"
  row "builder: hxb_write vs vrx_write" "$c" "$(calc 'a / b' "$text_write" "$db_write")" \
    %.2f "x faster" ">= 5"
}

# Read time of the hierarchical netlist as it doubles: each size, each
# doubling's ratio (cold and warm), and the mean ratio per doubling.
builder_scaling() {
  local out=$1 sizes=() colds=() warms=() prims _pins _mb cold warm status kind
  while IFS=$'\t' read -r kind prims _pins _mb cold warm status; do
    [[ $kind == scale ]] || continue
    if [[ $status != ok && $status != "DRC errors" ]]; then
      note "builder_bench scaling at $prims primitives: read failed ($status)"
      break
    fi
    sizes+=("$prims")
    colds+=("$cold")
    warms+=("$warm")
  done <"$out"
  local i n=${#sizes[@]}
  for ((i = 0; i < n; ++i)); do
    row "builder: scaling, hierarchical vrx_read" "$(thousands "${sizes[i]}") prims, cold" \
      "${colds[i]}" %.3f s -
  done
  for ((i = 1; i < n; ++i)); do
    local c
    c="$(thousands "${sizes[i - 1]}") -> $(thousands "${sizes[i]}")"
    row "builder: scaling, time per doubling" "$c, cold" \
      "$(calc 'a / b' "${colds[i]}" "${colds[i - 1]}")" %.2f ratio "<= 2.3"
    row "builder: scaling, time per doubling" "$c, warm" \
      "$(calc 'a / b' "${warms[i]}" "${warms[i - 1]}")" %.2f ratio "<= 2.3"
  done
  ((n > 1)) || return 0
  local span doublings
  span="$(thousands "${sizes[0]}") -> $(thousands "${sizes[n - 1]}")"
  doublings=$(calc 'log(a / b) / log(2)' "${sizes[n - 1]}" "${sizes[0]}")
  row "builder: scaling, mean per doubling" "$span, cold" \
    "$(mean_ratio "${colds[n - 1]}" "${colds[0]}" "$doublings")" %.2f ratio "<= 2.3"
  row "builder: scaling, mean per doubling" "$span, warm" \
    "$(mean_ratio "${warms[n - 1]}" "${warms[0]}" "$doublings")" %.2f ratio "<= 2.3"
}

# (last / first) ^ (1 / doublings)
mean_ratio() {
  awk -v l="$1" -v f="$2" -v d="$3" 'BEGIN { if (f > 0 && d > 0) printf "%.10g\n", exp(log(l / f) / d) }'
}

# --- Peers: ABC's and yosys's read_blif on the same circuits ------------------------------

peers=$work/peers.tsv
: >"$peers"
peer_figures() {
  if ((!have_netlists)); then
    note "peers skipped: no netlists"
    return 0
  fi
  local args=(--build-dir "$build_dir" --tsv)
  ((quick)) && args+=(--reps 1 --circuits "sqrt,multiplier")
  run_bench peers bench/peers.sh "${args[@]}" || return 0
  grep -E '^peers'$'\t' "$work/peers.out" | cut -f2- >"$peers" || true
}

# --- Report -----------------------------------------------------------------------------

# Tab-separated lines as a Markdown table with aligned columns; the first line
# is the header.
markdown_table() {
  awk -F'\t' '
    { for (i = 1; i <= NF; ++i) { cell[NR, i] = $i; if (length($i) > w[i]) w[i] = length($i) }
      if (NF > nf) nf = NF }
    END {
      for (r = 1; r <= NR; ++r) {
        line = "|"
        for (i = 1; i <= nf; ++i) line = line sprintf(" %-*s |", w[i], cell[r, i])
        print line
        if (r == 1) {
          line = "|"
          for (i = 1; i <= nf; ++i) { dash = sprintf("%*s", w[i] + 2, ""); gsub(/ /, "-", dash); line = line dash "|" }
          print line
        }
      }
    }'
}

print_figures() {
  local how="full run" reps=3
  if ((quick)); then
    how="QUICK run (fewer repetitions, smaller inputs): not a measurement"
    reps=1
  fi
  echo "vrx benchmark report: $how"
  echo
  { printf 'figure\tnetlist/case\tvalue\tunit\ttarget\tstatus\n'; cat "$rows"; } | markdown_table
  echo
  echo "Peers: reading the same circuits, ours as VRX (vrx_read, cold) against ABC's and"
  echo "yosys's read_blif of the same circuits as BLIF; primitives per second, CPU time,"
  echo "best of $reps, each tool's startup-only run subtracted"
  echo
  if [[ ! -s $peers ]]; then
    echo "(no peer figures: see the notes)"
  else
    print_peers
  fi
  if [[ -s $notes ]]; then
    echo
    echo "Notes"
    sed 's/^/- /' "$notes"
  fi
}

# The peers' table, with the ratios and their targets.
print_peers() {
  {
    printf 'circuit\tprims\tours\tABC\tyosys\tx ABC\ttarget\tstatus\tx yosys\ttarget\tstatus\n'
    awk -F'\t' '{
      ra = $3 / $4; ry = $3 / $5
      printf "%s\t%d\t%.0f\t%.0f\t%.0f\t%.2f\t>= 3\t%s\t%.2f\t>= 20\t%s\n", $1, $2, $3, $4, $5,
        ra, (ra >= 3 ? "ok" : "MISSED"), ry, (ry >= 20 ? "ok" : "MISSED")
    }' "$peers" | while IFS= read -r line; do thousands "$line"; done
  } | markdown_table
}

# The compiler CMake chose, with its version.
compiler_of() {
  local cxx
  cxx=$(sed -n 's/^CMAKE_CXX_COMPILER:[A-Z]*=//p' "$build_dir/CMakeCache.txt" 2>/dev/null)
  [[ -n $cxx ]] || cxx="c++"
  "$cxx" --version 2>/dev/null | head -n 1 || echo "$cxx"
}

build_flags() {
  local upper
  upper=$(tr '[:lower:]' '[:upper:]' <<<"$build_type")
  sed -n "s/^CMAKE_CXX_FLAGS_$upper:[A-Z]*=//p" "$build_dir/CMakeCache.txt" 2>/dev/null
}

package_version() {
  dpkg-query -W -f '${Version}' "$1" 2>/dev/null || echo "not installed"
}

print_machine() {
  local cpu mhz sockets threads memory commit changes
  cpu=$(sed -n 's/^model name[[:space:]]*: //p' /proc/cpuinfo | head -n 1)
  mhz=$(sed -n 's/^cpu MHz[[:space:]]*: //p' /proc/cpuinfo | head -n 1)
  threads=$(lscpu 2>/dev/null | sed -n 's/^Thread(s) per core:[[:space:]]*//p')
  sockets=$(lscpu 2>/dev/null | sed -n 's/^Socket(s):[[:space:]]*//p')
  memory=$(awk '/^MemTotal:/ { printf "%.1f GiB", $2 / 1048576 }' /proc/meminfo)
  commit=$(git rev-parse --short HEAD 2>/dev/null || echo unknown)
  changes=""
  git diff-index --quiet HEAD -- 2>/dev/null || changes=", with local changes"
  echo
  echo "Machine"
  echo "- CPU: ${cpu:-unknown} at ${mhz%.*} MHz"
  echo "- cores: $(nproc) online (sockets ${sockets:-?}, threads per core ${threads:-?})"
  echo "- memory: $memory"
  echo "- kernel: $(uname -srm)"
  echo "- compiler: $(compiler_of)"
  echo "- build: $build_type ($(build_flags)), tests off, in $build_dir"
  echo "- source: commit $commit$changes"
  echo "- peers: berkeley-abc $(package_version berkeley-abc), yosys $(package_version yosys)"
  echo "- date: $started to $(date -u '+%H:%M:%S UTC') ($((SECONDS - start_seconds)) s)"
  echo "- load average (1, 5, 15 min): $load_at_start at the start, $(cut -d' ' -f1-3 /proc/loadavg) at the end"
}

if ((quick)); then
  note "quick run: reader without the generated 700k-gate netlist; builder on hyp and serv only," \
    "scaling to 200,000 primitives; peers on sqrt and multiplier; one repetition each"
fi
build
host_figures
db_figures
writer_figures
reader_figures
builder_figures
peer_figures
print_figures
print_machine
