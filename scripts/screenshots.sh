#!/usr/bin/env bash
# screenshots.sh BUILD_DIR DOCS_DIR
# Renders the panel and each of its dialogs offscreen, with the Culmus Hebrew fonts, into
# PNG files in DOCS_DIR. The picker and the company chooser show three generated sample
# companies; the user's own settings are neither read nor changed.
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
"$build/src/zdrlab" --screenshots "$docs" --company "$work/companies/company1"
ls "$docs"/*.png
