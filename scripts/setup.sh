#!/usr/bin/env bash
# Installs every build and test dependency from Debian's packages. Idempotent: when everything is
# already there it prints nothing and changes nothing.
set -euo pipefail
packages=(
  build-essential cmake ninja-build pkg-config
  libcurl4-openssl-dev libexpat1-dev libssl-dev uuid-dev libsqlite3-dev
  libcpp-httplib-dev nlohmann-json3-dev libcli11-dev
  libgtest-dev libgmock-dev libbenchmark-dev
  curl openssl
  clang clang-format libclang-rt-14-dev
)
missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
[ ${#missing[@]} -eq 0 ] && exit 0
echo "setup: installing ${missing[*]}"
SUDO=""; [ "$(id -u)" -ne 0 ] && SUDO="sudo"
export DEBIAN_FRONTEND=noninteractive
$SUDO apt-get update -qq
$SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
