#!/usr/bin/env bash
# Runs every fuzz target of a build for FUZZ_SECONDS seconds (default 60),
# starting from its seed corpus in fuzz/corpus/<target>, and prints the number
# of executions. Stops at the first target that finds a fault; the input that
# did is kept in <build>/artifacts.
set -euo pipefail
cd "$(dirname "$0")/.."
build=${1:-build/fuzz}
seconds=${FUZZ_SECONDS:-60}
total=0
mkdir -p "$build/artifacts"
for program in "$build"/fuzz_*; do
    [ -x "$program" ] || continue
    target=$(basename "$program")
    target=${target#fuzz_}
    found="$build/corpus/$target"
    log="$build/$target.log"
    mkdir -p "$found"
    if ! "$program" -max_total_time="$seconds" -print_final_stats=1 -timeout=10 \
        -rss_limit_mb=2048 -artifact_prefix="$build/artifacts/$target-" \
        "$found" "fuzz/corpus/$target" >"$log" 2>&1; then
        tail -n 40 "$log"
        echo "fuzz $target: FAILED (log: $log)"
        exit 1
    fi
    runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log" | tail -n 1)
    echo "fuzz $target: ${runs:-0} executions in ${seconds} s, no fault"
    total=$((total + ${runs:-0}))
done
echo "fuzzing executions in total: $total"
