#!/usr/bin/env bash
# bench.sh BUILD_DIR: runs the benchmarks of an optimised build, then the whole-process one.
set -euo pipefail
build="$1"
for b in bench_engine bench_import bench_output; do
  echo "== $b"
  "$build/bench/$b" --benchmark_counters_tabular=true
done
echo "== whole process"
bash "$(dirname "$0")/bench-e2e.sh" "$build"
