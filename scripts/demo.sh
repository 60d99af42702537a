#!/usr/bin/env bash
# demo.sh BUILD_DIR SAMPLE_DIR [OUT_DIR]
# Writes a sample company with the generator; with OUT_DIR, runs the three outputs on it.
set -euo pipefail
build="$1"; sample="$2"; out="${3:-}"
rm -rf "$sample"
"$build/tools/zdrgen" --out "$sample" --companies 3 --seed 7 >/dev/null
echo "Sample companies: $sample"
