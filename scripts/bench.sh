#!/usr/bin/env bash
# bench.sh BUILD_DIR: runs the benchmarks of an optimised build.
set -euo pipefail
build="$1"
for b in bench_engine bench_import bench_output; do
  echo "== $b"
  "$build/bench/$b" --benchmark_counters_tabular=true
done
