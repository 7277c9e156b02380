#!/usr/bin/env bash
# Measures vrxmtrk: the benchmarks of its own work and of the engine's stream
# encoding, then whole runs on generated instances with the two floors that
# a run is compared with (the engine's snapshot calls alone, and writing the
# run's output bytes to /dev/null), and prints the targets with the ratios
# measured in this one run.
#
#   scripts/bench.sh [build-dir]            (default build-bench)
#
#   BENCH_SIZES     applications of the generated instances ("1000 10000 100000")
#   BENCH_REPEAT    runs of every whole-run measurement; the best counts (5)
#   BENCH_MIN_TIME  minimum seconds of each benchmark (0.2)
#   BENCH_REPETITIONS  repetitions of each benchmark; the best counts (3)
#   BENCH_FILTER    which benchmarks run (all)
set -euo pipefail

build=${1:-build-bench}
bin=$build/bin
sizes=${BENCH_SIZES:-1000 10000 100000}
repeat=${BENCH_REPEAT:-5}
split=$build/lib/libvrxbench_split.so
for tool in $bin/vrxmtrk $bin/vrxmkinstance $bin/vrxbench_snapshots $bin/vrxbench_write $bin/mtrk_bench $split; do
  [ -e "$tool" ] || { echo "bench.sh: $tool is missing; build with the bench preset" >&2; exit 1; }
done
[ -x /usr/bin/time ] || { echo "bench.sh: /usr/bin/time is missing (package time)" >&2; exit 1; }

# Output goes to /dev/null throughout; should it be an ordinary file (as it
# has been found on a shared machine), every write lands in memory and the
# floors of writing the output mean something else.
[ -c /dev/null ] || echo "bench.sh: warning: /dev/null is not the null device; writes to it cost more than they should" >&2

work=$(mktemp -d /tmp/vrxbench.XXXXXX)
trap 'rm -rf "$work"' EXIT
started=$(date +%s)

echo "== vrxmtrk benchmarks, $(date -u '+%Y-%m-%d %H:%M UTC'), $(nproc) cores, load $(cut -d' ' -f1-3 /proc/loadavg)"
echo
"$bin/mtrk_bench" --benchmark_color=false --benchmark_min_time="${BENCH_MIN_TIME:-0.2}" \
  --benchmark_repetitions="${BENCH_REPETITIONS:-3}" \
  ${BENCH_FILTER:+--benchmark_filter="$BENCH_FILTER"}

# The least and the greatest of the numbers on standard input.
least() { sort -g | head -n 1; }
greatest() { sort -g | tail -n 1; }

# time_once NAME COMMAND...: runs the command once under /usr/bin/time and
# appends "wall user system peak-KiB" to $work/NAME.runs. The first run's
# standard output is kept in $work/NAME.out; the others go to /dev/null.
time_once() {
  local name=$1; shift
  local out=/dev/null
  [ -e "$work/$name.out" ] || out=$work/$name.out
  /usr/bin/time -f '%e %U %S %M' -o "$work/time" "$@" > "$out"
  cat "$work/time" >> "$work/$name.runs"
}

# summarise NAME: the best wall and CPU (user + system) time of the runs and
# the largest peak resident kilobytes, in $work/NAME.{wall,cpu,rss}. The
# best of several runs is the one least disturbed by the rest of the
# machine; the peak memory is the worst seen.
summarise() {
  local name=$1
  awk '{ print $1 }' "$work/$name.runs" | least > "$work/$name.wall"
  awk '{ print $2 + $3 }' "$work/$name.runs" | least > "$work/$name.cpu"
  awk '{ print $4 }' "$work/$name.runs" | greatest > "$work/$name.rss"
}

commands=("-i -d -a -p" "-a -v")
snapshotsOf=("instance database application database application" "application database")

# A record per whole run: apps, command index, pools, wall, CPU, peak KiB,
# largest snapshot bytes, the snapshot floor's CPU, the CPU of writing the
# output bytes plainly and through one formatted print per line, and the
# in-run split: the engine's share (start-up and snapshot calls) and the
# program's own work.
report_row() {
  echo "$1" | awk '{
    cmd = $2 ? "-a -v" : "-i -d -a -p"
    printf "%-8s %-12s %8d %7.2f %7.2f %8.2f %8.1f %8.1f %8.1f %8.2f %8.2f %8.3f %8.3f %8.3f %9.1f %9.1f\n",
           $1, cmd, $3, $4, $5, $5 / $3 * 1e6, $6 / 1024, $7 / 1048576, 1.25 * $7 / 1048576 + 16,
           $8, $11, $12, $9, $10, ($9 > 0 ? $12 / $9 : 0), ($10 > 0 ? $12 / $10 : 0)
  }'
}

echo
echo "== Whole runs, best of $repeat (CPU = user + system). floor: the snapshot calls alone, in a"
echo "   process of their own; engine/own: the run's CPU split from within the run (libvrxbench_split):"
echo "   the engine's start-up and snapshot calls, and the rest, the program's own work;"
echo "   write/print: CPU of writing the output bytes plainly / with one printf per line"
printf '%-8s %-12s %8s %7s %7s %8s %8s %8s %8s %8s %8s %8s %8s %8s %9s %9s\n' \
  apps command pools "wall s" "CPU s" "us/pool" "RSS MiB" "snap MiB" "limit" "floor s" \
  "engine s" "own s" "write s" "print s" "own/write" "own/print"
for apps in $sizes; do
  dir=$work/i$apps
  mkdir -p "$dir"
  "$bin/vrxmkinstance" --applications "$apps" -o "$dir/instance.json"
  for c in 0 1; do
    cmd=${commands[$c]}
    tag=$apps.$c
    # A run and its floors take turns, so that a change in the machine's
    # load between them weighs on all three alike.
    for _ in $(seq "$repeat"); do
      time_once run.$tag env VRX_INSTANCE_DIR="$dir" "$bin/vrxmtrk" $cmd
      time_once snap.$tag env VRX_INSTANCE_DIR="$dir" "$bin/vrxbench_snapshots" ${snapshotsOf[$c]}
      "$bin/vrxbench_write" "$work/run.$tag.out" 2>> "$work/write.$tag.runs" > /dev/null
      LD_PRELOAD=$split VRXBENCH_SPLIT=$work/split VRX_INSTANCE_DIR="$dir" "$bin/vrxmtrk" $cmd > /dev/null
      awk -F'[= ]' '{ printf "%.6f %.6f\n", $6 - $2 - $4, $2 + $4 }' "$work/split" >> "$work/split.$tag.runs"
    done
    # The run whose own work was least disturbed, with its engine share.
    read -r own engine < <(sort -g "$work/split.$tag.runs" | head -n 1)
    summarise run.$tag
    summarise snap.$tag
    raw=$(sed 's/.*raw=\([0-9.]*\).*/\1/' "$work/write.$tag.runs" | least)
    formatted=$(sed 's/.*formatted=\([0-9.]*\).*/\1/' "$work/write.$tag.runs" | least)
    largest=$(sed 's/.*largest=\([0-9]*\).*/\1/' "$work/snap.$tag.out")
    pools=$(sed 's/.*pools=\([0-9]*\).*/\1/' "$work/snap.$tag.out")
    echo "$apps $c $pools $(cat "$work/run.$tag.wall") $(cat "$work/run.$tag.cpu")" \
         "$(cat "$work/run.$tag.rss") $largest $(cat "$work/snap.$tag.cpu") $raw $formatted" \
         "$engine $own" \
         >> "$work/records"
    report_row "$(tail -n 1 "$work/records")"
  done
done

echo
echo "== Targets of the whole runs"
awk -v first="$(echo $sizes | awk '{ print $(NF - 1) }')" -v last="$(echo $sizes | awk '{ print $NF }')" '
  function name(c) { return c ? "-a -v" : "-i -d -a -p" }
  {
    apps = $1; c = $2; rss = $6 / 1024; largest = $7 / 1048576; limit = 1.25 * largest + 16
    printf "  memory   %7s apps %-12s peak %6.1f MiB, limit 1.25 x %.1f + 16 = %.1f MiB: %s\n",
           apps, name(c), rss, largest, limit, (rss <= limit ? "holds" : "MISSES")
    if (c == 0 && $9 > 0 && $10 > 0) {
      own = $12
      printf "  own work %7s apps %-12s %.2f s = %.1f x writing its bytes, %.1f x printing its lines (at most 4): %s\n",
             apps, name(c), own, own / $9, own / $10, (own / $10 <= 4 ? "holds" : "MISSES")
    }
    runCpu[apps "|" c] = $5
  }
  END {
    for (c = 0; c < 2; ++c) {
      a = runCpu[first "|" c]; b = runCpu[last "|" c]
      if (a > 0)
        printf "  linear   %s to %s applications, %-12s CPU grows %.2f times (at most 11): %s\n",
               first, last, name(c), b / a, (b / a <= 11 ? "holds" : "MISSES")
    }
  }' "$work/records"

# How often the engine opens instance.json in the largest column run: one
# read per take, one at the set-up, one as the libraries load.
if command -v strace > /dev/null; then
  last=$(echo $sizes | awk '{ print $NF }')
  VRX_INSTANCE_DIR=$work/i$last strace -f -qq -e trace=openat -o "$work/strace" \
    "$bin/vrxmtrk" -i -d -a -p > /dev/null
  reads=$(grep -c 'instance.json", O_RDONLY.* = [0-9]' "$work/strace" || true)
  echo "  reads    $last applications, -i -d -a -p: instance.json opened $reads times for 5 snapshots" \
       "(one read per take, one at the set-up, one as the libraries load)"
fi
echo
echo "== Done in $(( $(date +%s) - started )) s"
