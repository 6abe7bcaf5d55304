#!/usr/bin/env bash
# Installs the Debian packages the build, tests and tools need, and only those that are missing.
set -euo pipefail

packages=(
  make
  build-essential cmake ninja-build pkg-config
  libgtest-dev libgmock-dev libbenchmark-dev
  rapidjson-dev libcli11-dev libasio-dev
  systemtap-sdt-dev libevdev-dev libjs-dygraphs
  chromium
  clang libclang-rt-14-dev
)

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
[ ${#missing[@]} -eq 0 ] && exit 0

echo "Installing missing packages: ${missing[*]}" >&2
if [ "$(id -u)" -ne 0 ]; then
  echo "error: missing packages and not root; run: sudo apt-get install ${missing[*]}" >&2
  exit 1
fi
export DEBIAN_FRONTEND=noninteractive
apt-get update -qq
apt-get install -y -qq --no-install-recommends "${missing[@]}"
