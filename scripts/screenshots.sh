#!/usr/bin/env bash
# screenshots.sh BUILD_DIR DOCS_DIR
# Renders the panel and each of its dialogs offscreen, with the Culmus Hebrew fonts, into
# PNG files in DOCS_DIR, then the demo's label sheet (pages 1 and 2, as headless Chromium
# prints it) and its address list (as Chromium shows it), and the first page of the label
# sheet as PDF on three label stocks and a calibration page. The picker and the company
# chooser show three generated sample companies; the user's own settings are neither read
# nor changed.
set -euo pipefail
build="$1"; docs="$2"
mkdir -p "$docs"
docs="$(cd "$docs" && pwd)"
# The sample lives in the build folder, so the chooser's folder tree shows project folders.
work="$(cd "$build" && pwd)/screenshots-sample"
rm -rf "$work"
trap 'rm -rf "$work"' EXIT

"$build/tools/zdrgen" --out "$work/companies" --companies 3 --seed 7 --accounts 60 \
  --documents 20 --ledger 20 --receipts 10 >/dev/null
export Temp="$work"
export QT_QPA_PLATFORM=offscreen
"$build/tools/zdrshots" "$docs" --company "$work/companies/company1"

bash "$(dirname "$0")/demo.sh" "$build" "$work/demo-sample" "$work/demo-out" >/dev/null
chromium=(chromium --headless --no-sandbox --disable-gpu --disable-background-networking
  --disable-component-update --disable-sync --no-first-run --user-data-dir="$work/chromium")
"${chromium[@]}" --no-pdf-header-footer --print-to-pdf="$work/sheet.pdf" \
  "file://$work/demo-out/zdrlab1.htm" >/dev/null 2>&1
pdftoppm -r 72 -png -f 1 -l 2 "$work/sheet.pdf" "$work/sheet"
mv "$work"/sheet-*1.png "$docs/sheet-page1.png"
mv "$work"/sheet-*2.png "$docs/sheet-page2.png"
"${chromium[@]}" --hide-scrollbars --window-size=1000,900 --screenshot="$docs/list.png" \
  "file://$work/demo-out/zdrlab2.htm" >/dev/null 2>&1

: > "$work/pdf.ini"  # an empty store: the defaults
lines=()
for i in 0 1 2 3 4 5 6 7 8; do lines+=(--set "UseTitle$i=1"); done
for stock in a4-3x8-70x37 a4-2x7-99.1x38.1 a4-2x4-105x74; do
  "$build/src/zdrlab" labels --company "$work/companies/company1" --settings "$work/pdf.ini" \
    "${lines[@]}" --pdf "$work/$stock.pdf" --template "$stock" >/dev/null 2>&1
  pdftoppm -r 60 -f 1 -l 1 -singlefile -png "$work/$stock.pdf" "$docs/labels-$stock"
done
"$build/src/zdrlab" calibrate --settings "$work/pdf.ini" --pdf "$work/calibration.pdf" \
  --template a4-3x8-70x37 >/dev/null 2>&1
pdftoppm -r 60 -singlefile -png "$work/calibration.pdf" "$docs/calibration-a4-3x8-70x37"
ls "$docs"/*.png
