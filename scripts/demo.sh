#!/usr/bin/env bash
# demo.sh BUILD_DIR SAMPLE_DIR [OUT_DIR]
# Writes the sample companies with the generator; with OUT_DIR, runs the three outputs on the
# first company into OUT_DIR and prints their paths (the label sheet as HTML and as PDF on
# the default label stock, the address list, the workbook) and the dispatch checks' counts.
set -euo pipefail
build="$1"; sample="$2"; out="${3:-}"
rm -rf "$sample"
"$build/tools/zdrgen" --out "$sample" --companies 3 --seed 7 >/dev/null
echo "Sample companies: $sample"
[ -n "$out" ] || exit 0

mkdir -p "$out"
out="$(cd "$out" && pwd)"
company="$sample/company1"
settings="$out/demo-settings.ini"
: > "$settings"  # an empty store: the defaults
lines=()
for i in 0 1 2 3 4 5 6 7 8; do lines+=(--set "UseTitle$i=1"); done
zdrlab="$build/src/zdrlab"
export Temp="$out"
labels=$("$zdrlab" labels --company "$company" --settings "$settings" "${lines[@]}" 2>"$out/labels.log")
labelsPdf=$("$zdrlab" labels --pdf "$out/labels.pdf" --company "$company" --settings "$settings" \
  "${lines[@]}" 2>"$out/labels-pdf.log")
list=$("$zdrlab" list --company "$company" --settings "$settings" 2>"$out/list.log")
post=$("$zdrlab" post --company "$company" --settings "$settings" \
  --set "FilePath=$out/zdpost1.xlsx" --set Service=רגיל --set Weight=0.5 2>"$out/post.log")
echo "Label sheet:  $labels"
echo "Labels (PDF): $labelsPdf"
echo "Address list: $list"
echo "Workbook:     $post"
# The dispatch checks' counts, from the command's last status line.
counts=$(grep -ao 'שגיאות: [0-9]*, אזהרות: [0-9]*' "$out/post.log" | tail -n 1)
errors=$(sed -E 's/^[^0-9]*([0-9]+).*/\1/' <<<"$counts")
warnings=$(sed -E 's/.*[^0-9]([0-9]+)$/\1/' <<<"$counts")
echo "Dispatch checks: $errors errors, $warnings warnings (sheet \"בדיקה\" of the workbook)"
