#!/usr/bin/env bash
# Installs every Debian package the build, the tests, the benchmarks and the demo need.
# Safe to run again: packages already present are skipped without touching apt.
set -euo pipefail

PACKAGES=(
  build-essential cmake ninja-build pkg-config ccache clang-format
  libboost-dev zlib1g-dev libminizip-dev libtinyxml-dev
  libprotobuf-dev protobuf-compiler
  libpng-dev libjpeg-dev libjpeg-turbo-progs
  libogg-dev libspeex-dev libvorbis-dev libopenal-dev libasound2 speex vorbis-tools
  libgles-dev libegl-dev libegl-mesa0 libgl1-mesa-dri
  libcurl4-openssl-dev libcpp-httplib-dev
  libgtest-dev libgmock-dev libbenchmark-dev
  libgeographiclib-dev
  zip
  clang libclang-rt-14-dev
  locales
  python3
)

missing=()
for package in "${PACKAGES[@]}"; do
  if ! dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q "install ok installed"; then
    missing+=("$package")
  fi
done

# The number-parsing tests check that a decimal-comma locale does not leak in.
ensure_test_locale() {
  if ! locale -a 2>/dev/null | grep -qi '^de_DE\.utf-\?8$'; then
    $SUDO localedef -i de_DE -f UTF-8 de_DE.UTF-8 >/dev/null 2>&1 || true
  fi
}

SUDO=""
if [ "$(id -u)" -ne 0 ]; then
  SUDO="sudo"
fi

if [ ${#missing[@]} -eq 0 ]; then
  ensure_test_locale
  exit 0
fi

echo "Installing: ${missing[*]}"
export DEBIAN_FRONTEND=noninteractive
$SUDO apt-get update -qq
$SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
ensure_test_locale
