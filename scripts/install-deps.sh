#!/usr/bin/env bash
# Installs the Debian packages that building, testing and running ZDRLab need.
# Idempotent: does nothing when every package is already present.
set -euo pipefail

PACKAGES=(
  build-essential cmake ninja-build pkg-config clang-format
  libicu-dev libsqlite3-dev qt6-base-dev qt6-translations-l10n libxlsxwriter-dev
  libcairo2-dev libpango1.0-dev libgdk-pixbuf-2.0-dev libexpat1-dev glabels-data
  libgtest-dev libgmock-dev libbenchmark-dev
  culmus fonts-dejavu-core
  chromium poppler-utils python3-openpyxl
)

missing=()
for p in "${PACKAGES[@]}"; do
  if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed"; then
    missing+=("$p")
  fi
done

if [ ${#missing[@]} -eq 0 ]; then
  exit 0
fi

echo "Installing: ${missing[*]}" >&2
SUDO=""
if [ "$(id -u)" -ne 0 ]; then
  SUDO="sudo"
fi
export DEBIAN_FRONTEND=noninteractive
$SUDO apt-get update -qq
$SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}"
