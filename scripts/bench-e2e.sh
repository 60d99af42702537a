#!/usr/bin/env bash
# bench-e2e.sh BUILD_DIR: the whole process on a large generated company.
#
# Runs `zdrlab labels`, `list` and `post` with every account, document, item, ledger and batch
# criterion on and set wide, on a tenth-size and a full-size company (zdrgen --large), and
# prints per command: wall and processor seconds and peak memory of the whole process, the
# share of the data load and of the output, and the single-thread floor of the same load
# (bench_import's floors: the files' bytes read plus bare SQLite appends of the rows, summed
# over the importers the load runs) measured in the same run.
#
# Every output's checksum is compared with bench/e2e_checksums.txt; ZDR_E2E_RECORD=1 writes
# that file instead. The address list's date line is left out of its checksum.
#
# Environment: ZDR_BENCH_DIR (default the system temp folder) holds the companies;
# ZDR_E2E_SIZES (default "tenth large"); ZDR_E2E_RUNS (default 3, the best run is shown);
# ZDR_E2E_FLOOR=0 skips the floor.
set -euo pipefail
build="$(cd "$1" && pwd)"
here="$(cd "$(dirname "$0")/.." && pwd)"
root="${ZDR_BENCH_DIR:-${TMPDIR:-/tmp}}"
sizes="${ZDR_E2E_SIZES:-tenth large}"
runs="${ZDR_E2E_RUNS:-3}"
sums="$here/bench/e2e_checksums.txt"
zdrlab="$build/src/zdrlab"
loaded="קריאת הנתונים הסתיימה"
# A build from before --times existed is measured whole; its load and output are not split.
# (grep reads the whole help: with pipefail, `grep -q` could stop the program with SIGPIPE
# and the test would fail at random.)
times=()
if "$zdrlab" --help 2>&1 | grep -- --times >/dev/null; then times=(--times); fi

company() {  # company SIZE: generates the company once, prints its folder
  local dir="$root/zdr_bench_e2e_$1"
  if [ ! -f "$dir/complete" ]; then
    rm -rf "$dir"
    local opts=(--large)
    if [ "$1" = tenth ]; then
      opts+=(--accounts 10000 --documents 20000 --ledger 100000 --batch-size 1000 --receipts 10000)
    fi
    echo "generating the $1 company in $dir ..." >&2
    "$build/tools/zdrgen" --out "$dir/company" "${opts[@]}" >/dev/null
    touch "$dir/complete"
  fi
  echo "$dir"
}

# Every import criterion on and wide.
wide=(
  --set UseAgent=1 --set FromAgent=0 --set ToAgent=255
  --set UseAccKey=1 --set FromCrd=0 --set ToCrd=תתתת
  --set UseCatCode=1 "--set" "FromSort= " --set ToSort=תתת --set UseCutOff=1
  --set UseDates=1 --set FromDate=01/01/1900 --set ToDate=31/12/2099 --set DocType=27
  --set txtFromRef=0 --set txtToRef=99999
  --set ChkByItems=1 --set txtToItmSort=תתת --set txtToItmKey=תתתתתתתתתתתת
  --set UseJournal=1 --set FromJournal=-32768 --set ToJournal=32767
  --set UseTransType=1 --set TransType=*
  --set UseTransDates=1 --set FromTransDate=01/01/1900 --set FromToDate=31/12/2099
  --set UseTransVDate=1 --set FromTransVDate=01/01/1900 --set FromToVDate=31/12/2099
  --set ReadTempTrans=1
)

# A file's checksum; the address list without its date line, the workbook by its sheet.
checksum() {
  case "$1" in
    *zdrlab2.htm) grep -av "^<p class=Title1 align='left'>" "$1" | sha256sum | cut -c1-16 ;;
    *.xlsx) python3 -c 'import hashlib,sys,zipfile
z=zipfile.ZipFile(sys.argv[1]); h=hashlib.sha256()
for n in sorted(z.namelist()):
    if not n.startswith("docProps/"): h.update(n.encode()); h.update(z.read(n))
print(h.hexdigest()[:16])' "$1" ;;
    *) sha256sum "$1" | cut -c1-16 ;;
  esac
}

# Sum of the floors of the importers the load runs: wall and processor seconds.
floor() {
  local tenth=0
  [ "$1" = tenth ] && tenth=1
  ZDR_BENCH_TENTH=$tenth ZDR_BENCH_DIR="$root" "$build/bench/bench_import" \
    --benchmark_filter='BM_Floor(ACT|Stock|Item|Transactions|AllTempTrans)/0/' \
    --benchmark_format=csv 2>/dev/null |
    awk -F, '/^"BM_Floor/ { wall += $3; cpu += $4 } END { printf "%.2f %.2f", wall / 1000, cpu / 1000 }'
}

declare -A result
new_sums=""
bad=0
for size in $sizes; do
  dir="$(company "$size")"
  temp="$dir/temp"
  mkdir -p "$temp"
  settings="$dir/settings.ini"
  for cmd in labels list post; do
    best=""
    for ((r = 1; r <= runs; r++)); do
      rm -f "$temp"/zdr* && : >"$settings"
      log="$dir/$cmd.log"
      if ! Temp="$temp" /usr/bin/time -f '%e %U %S %M' -o "$dir/time" "$zdrlab" "$cmd" \
          --company "$dir/company" --settings "$settings" "${wide[@]}" \
          --set FilePath="$temp/post.xlsx" --set OpenExcel=0 "${times[@]}" >/dev/null 2>"$log"; then
        echo "zdrlab $cmd failed on the $size company:" >&2
        grep -v '^times' "$log" | tail -5 >&2
        exit 1
      fi
      read -r wall user sys rss <"$dir/time"
      load=$(awk -F'\t' -v s="$loaded" '$1 == "times" && $4 == s { print $2 }' "$log")
      load_cpu=$(awk -F'\t' -v s="$loaded" '$1 == "times" && $4 == s { print $3 }' "$log")
      load=${load:-nan} load_cpu=${load_cpu:-nan}
      line=$(awk -v w="$wall" -v u="$user" -v s="$sys" -v m="$rss" -v l="$load" -v lc="$load_cpu" \
        'BEGIN { printf "%.2f %.2f %.0f ", w, u + s, m / 1024
                 if (l == "nan") printf "- - - -"; else printf "%.2f %.2f %.2f %.2f", l, lc, w - l, u + s - lc }')
      # The run with the least wall time.
      if [ -z "$best" ] || awk -v a="$line" -v b="$best" 'BEGIN { split(a, x, " "); split(b, y, " "); exit !(x[1] < y[1]) }'; then
        best="$line"
      fi
    done
    result["$size,$cmd"]="$best"
    case "$cmd" in
      labels) files=("$temp/zdrlab1.htm") ;;
      list) files=("$temp/zdrlab2.htm") ;;
      post) files=("$temp/zdpost1.csv" "$temp/post.xlsx") ;;
    esac
    for f in "${files[@]}"; do
      sum="$(checksum "$f")"
      key="$size $(basename "$f")"
      new_sums+="$key $sum"$'\n'
      if [ "${ZDR_E2E_RECORD:-0}" != 1 ] && [ -f "$sums" ]; then
        want="$(awk -v k="$key" '$1 " " $2 == k { print $3 }' "$sums")"
        if [ "$want" != "$sum" ]; then
          echo "CHANGED: $key is $sum, recorded ${want:-nothing}" >&2
          bad=1
        fi
      fi
    done
  done
  if [ "${ZDR_E2E_FLOOR:-1}" != 0 ]; then
    result["$size,floor"]="$(floor "$size")"
  fi
done

echo "load: single-thread floor = the same load's files read + bare SQLite appends (bench_import)"
printf '%-6s %-7s %8s %8s %8s %8s %8s %8s %8s %9s %9s\n' size command wall_s cpu_s peak_mb \
  load_s load_cpu out_s out_cpu load/floor out/load
for size in $sizes; do
  read -r fl flcpu <<<"${result[$size,floor]:-}"
  for cmd in labels list post; do
    read -r wall cpu rss load lcpu out ocpu <<<"${result[$size,$cmd]}"
    ratio="-"
    share="-"
    if [ "$load" != - ]; then
      [ -n "$fl" ] && ratio=$(awk -v l="$load" -v f="$fl" 'BEGIN { printf "%.2f", l / f }')
      share=$(awk -v o="$out" -v l="$load" 'BEGIN { printf "%.1f%%", 100 * o / l }')
    fi
    printf '%-6s %-7s %8s %8s %8s %8s %8s %8s %8s %9s %9s\n' "$size" "$cmd" "$wall" "$cpu" "$rss" \
      "$load" "$lcpu" "$out" "$ocpu" "$ratio" "$share"
  done
  [ -n "$fl" ] && echo "$size floor: wall $fl s, processor $flcpu s"
done

if [ "${ZDR_E2E_RECORD:-0}" = 1 ]; then
  printf '%s' "$new_sums" >"$sums"
  echo "checksums recorded in $sums"
elif [ -f "$sums" ]; then
  if [ "$bad" = 0 ]; then echo "outputs: unchanged (checksums as recorded)"; else echo "outputs: CHANGED"; exit 1; fi
fi
