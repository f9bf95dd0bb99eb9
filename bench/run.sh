#!/usr/bin/env bash
# Builds the benchmarks optimised (preset bench), runs each program with its benchmarks and their
# baseline interleaved in one run, and prints the table of docs/performance.md: the median time of
# each benchmark, the median of its baseline, their ratio (ours ÷ baseline) and the goal.
#
#   bench/run.sh [repetitions]      (default 7; ./dev.sh bench runs this)
#
# Times are CPU times of the benchmark's thread, which the load of other processes on the machine
# changes far less than wall-clock times; the upsert, which waits for the stand-in daemon, and the
# panel's listing (P6), answered in another process, are wall-clock times, and the panel's load run
# (P7), run once, gives its own counts and latencies. A benchmark named <goal>/part:<name> measures
# a part of the others of its goal; it is shown against the baseline but has no goal of its own, and
# it is the reference for their memory.
set -euo pipefail
cd "$(dirname "$0")/.."
repetitions=${1:-7}

cmake --preset bench >/dev/null
cmake --build --preset bench >/dev/null
results=$(mktemp -d)
trap 'rm -rf "$results"' EXIT

load_before=$(cut -d' ' -f1-3 /proc/loadavg)
for program in build/bench/bench/fileindex_bench_*; do
    "$program" --benchmark_repetitions="$repetitions" --benchmark_enable_random_interleaving=true \
        --benchmark_report_aggregates_only=true --benchmark_format=json >"$results/${program##*/}.json"
done
load_after=$(cut -d' ' -f1-3 /proc/loadavg)

echo "Machine: $(lscpu | sed -n 's/^Model name: *//p'), $(nproc) cores, $(uname -sr); load average $load_before before, $load_after after"
echo "Command: bench/run.sh $repetitions (medians of $repetitions repetitions)"
echo
echo "| Goal | Benchmark | Ours | Baseline | Ours ÷ baseline | Met |"
echo "|---|---|---|---|---|---|"
jq -rs '
  def goal: {"P1": 0.5, "P2": 2.5, "P3": 2.0, "P6": 1.2};
  def time_of($target): if $target == "P6" then .real_time else .cpu_time end;
  def ms: . * 100 | round / 100 | tostring + " ms";
  [.[].benchmarks[] | select(.aggregate_name == "median" or (.run_name | startswith("P7/")))] | sort_by(.run_name) as $runs
  | ($runs | map(select(.run_name | test("/baseline:"))) | map({key: (.run_name | split("/")[0]), value: .}) | from_entries) as $baselines
  | ($runs | map(select(.run_name | test("/part:"))) | map({key: (.run_name | split("/")[0]), value: .}) | from_entries) as $parts
  | $runs[] | select(.run_name | test("/baseline:") | not)
  | (.run_name | split("/")[0]) as $target
  | if (.run_name | test("/part:")) then
      "| \($target), a part | \(.run_name) | \(.cpu_time | ms) | \($baselines[$target].run_name | split(":")[1]) \($baselines[$target].cpu_time | ms) | \(.cpu_time / $baselines[$target].cpu_time * 100 | round / 100) | |"
    elif $target == "P7" then
      "| P7 no failure but 503, descriptors and memory flat | \(.run_name): \(.requests) requests, \(.busy_503) answered 503 | polls p50 \(.poll_p50_ms | ms), p99 \(.poll_p99_ms | ms); changes p50 \(.change_p50_ms | ms), p99 \(.change_p99_ms | ms) | descriptors \(.descriptors_before) → \(.descriptors_after), resident \(.resident_KiB_before | round) → \(.resident_KiB_after | round) KiB | | \(if .failed == 0 and .descriptors_after <= .descriptors_before and .resident_KiB_after - .resident_KiB_before <= 4096 then "yes" else "no" end) |"
    elif $target == "P4" then
      "| P4 under 1 s | \(.run_name) | \(.real_time | ms) (wall) | | | \(if .real_time < 1000 then "yes" else "no" end) |"
    else
      (time_of($target) / ($baselines[$target] | time_of($target))) as $ratio
      | "| \($target) at most \(goal[$target])× | \(.run_name) | \(time_of($target) | ms) | \($baselines[$target].run_name | split(":")[1]) \($baselines[$target] | time_of($target) | ms) | \($ratio * 100 | round / 100) | \(if $ratio <= goal[$target] then "yes" else "no" end) |",
        (if .peak_growth_KiB != null then
           ($parts[$target] // $baselines[$target]) as $reference
           | "| P5 at most 4 MiB above the reference | \(.run_name): peak memory growth | \(.peak_growth_KiB) KiB | \($reference.run_name | split(":")[1]) \($reference.peak_growth_KiB) KiB | | \(if .peak_growth_KiB - $reference.peak_growth_KiB <= 4096 then "yes" else "no" end) |"
         else empty end)
    end
' "$results"/*.json
