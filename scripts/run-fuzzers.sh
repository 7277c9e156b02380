#!/usr/bin/env bash
# Runs every fuzz harness (one per fuzz/fuzz_*.cpp, built into
# build-fuzz/bin by `make fuzz`) for SECONDS seconds each, starting from a
# scratch copy of its seed corpus fuzz/corpus/NAME (NAME without "fuzz_"),
# so that the seeds in the tree stay as they are, with the extra libFuzzer
# flags of fuzz/NAME.options when there is one. Fails on any finding: a
# crash, a sanitizer report, a leak, a time-out or a harness that is missing.
#
#   scripts/run-fuzzers.sh SECONDS
set -euo pipefail
cd "$(dirname "$0")/.."

seconds=${1:?usage: scripts/run-fuzzers.sh SECONDS}
bin=${FUZZ_BIN_DIR:-build-fuzz/bin}
work=fuzz/corpus-work

harnesses=()
for src in fuzz/fuzz_*.cpp; do
  [ -e "$src" ] || continue
  harnesses+=("$(basename "$src" .cpp)")
done
if [ ${#harnesses[@]} -eq 0 ]; then
  echo "run-fuzzers: no harness in fuzz/" >&2
  exit 1
fi

failed=0
for name in "${harnesses[@]}"; do
  exe=$bin/$name
  if [ ! -x "$exe" ]; then
    echo "run-fuzzers: $exe is not built (make fuzz)" >&2
    failed=1
    continue
  fi
  corpus=fuzz/corpus/${name#fuzz_}
  scratch=$work/${name#fuzz_}
  artifacts=$work/${name#fuzz_}-findings/
  rm -rf "$scratch" "$artifacts"
  mkdir -p "$scratch" "$artifacts"
  [ -d "$corpus" ] && cp -R "$corpus"/. "$scratch"/
  extra=()
  [ -f "fuzz/$name.options" ] && read -ra extra < "fuzz/$name.options"
  echo "run-fuzzers: $name for ${seconds}s from $(ls "$scratch" | wc -l) seeds"
  if ! "$exe" -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 "${extra[@]}" \
      -print_final_stats=1 -artifact_prefix="$artifacts" "$scratch" \
      >"$work/$name.log" 2>&1; then
    failed=1
    echo "run-fuzzers: $name FAILED; findings in $artifacts" >&2
    tail -n 60 "$work/$name.log" >&2
    continue
  fi
  grep -E '^(stat::number_of_executed_units|stat::peak_rss_mb|Done)' "$work/$name.log" || true
done
exit $failed
