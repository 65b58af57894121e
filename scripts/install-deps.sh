#!/usr/bin/env bash
# Installs every build and test dependency from Debian's packages.
# Idempotent and non-interactive: packages already present are skipped.
set -euo pipefail

PKGS=(
  build-essential cmake pkg-config
  libtinyxml-dev libboost-dev libcurl4-openssl-dev
  libproj-dev proj-data
  libpng-dev libjpeg-dev libgif-dev libtiff-dev
  libgtest-dev libgmock-dev libbenchmark-dev libcpp-httplib-dev libssl-dev openssl
  cgi-mapserver gdal-bin
  python3 python3-owslib nlohmann-json3-dev util-linux
)
if [ "${1:-}" = "--with-mapcache" ]; then PKGS+=(mapcache-cgi); fi

missing=()
for p in "${PKGS[@]}"; do
  if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed"; then
    missing+=("$p")
  fi
done

if [ ${#missing[@]} -eq 0 ]; then
  echo "install-deps: all ${#PKGS[@]} packages present"
  exit 0
fi

SUDO=""
if [ "$(id -u)" -ne 0 ]; then SUDO="sudo"; fi
echo "install-deps: installing ${missing[*]}"
export DEBIAN_FRONTEND=noninteractive
$SUDO apt-get update -qq
$SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}"
