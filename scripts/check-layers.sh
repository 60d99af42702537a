#!/usr/bin/env bash
# check-layers.sh SRC_DIR: fails, naming the lines, when a file includes from a folder of a
# higher layer than its own, or when a core file (every folder up to control) includes Qt.
# The layers, lowest first, are those of src/CMakeLists.txt; folders of one rank do not
# include each other.
set -euo pipefail
src="${1:-$(dirname "$0")/../src}"
declare -A rank=([common]=0 [hosttext]=1 [hostfile]=1 [engine]=2 [workdb]=3 [select]=4
  [import]=4 [output]=5 [control]=6 [qtstore]=7 [gui]=8 [app]=9)
core_top=${rank[control]}
bad=0
for dir in "$src"/*/; do
  folder=$(basename "$dir")
  if [ -z "${rank[$folder]+x}" ]; then
    echo "$dir: a folder without a layer (add it to scripts/check-layers.sh and src/CMakeLists.txt)"
    bad=1
    continue
  fi
  own=${rank[$folder]}
  while IFS=: read -r file line text; do
    target=$(sed -E 's/^[[:space:]]*#[[:space:]]*include[[:space:]]*"([^/"]+)\/.*/\1/' <<<"$text")
    if [ "$target" = "$text" ]; then continue; fi  # an include without a folder
    if [ "$target" != "$folder" ] && { [ -z "${rank[$target]+x}" ] || [ "${rank[$target]}" -ge "$own" ]; }; then
      echo "$file:$line: $folder includes from $target, which is not below it:$text"
      bad=1
    fi
  done < <(grep -HnE '^[[:space:]]*#[[:space:]]*include[[:space:]]*"' "$dir"*.h "$dir"*.cpp 2>/dev/null || true)
  if [ "$own" -le "$core_top" ]; then
    if grep -HnE '^[[:space:]]*#[[:space:]]*include[[:space:]]*<Q' "$dir"*.h "$dir"*.cpp 2>/dev/null; then
      echo "  ^ Qt in the core ($folder): the core runs without Qt; put it in qtstore or gui"
      bad=1
    fi
  fi
done
exit $bad
