#!/usr/bin/env bash
# Installs what a cross-build for ARCH (arm64 or armhf) and its test run under
# qemu user-mode emulation need: Debian's cross toolchain, qemu-user and the
# dependencies' multiarch -dev packages beside the host's own.
# Safe to run again: does nothing when everything is present.
# Usage: bash scripts/install-cross-deps.sh arm64|armhf
set -euo pipefail
cd "$(dirname "$0")/.."

ARCH=${1:-}
case "$ARCH" in
  arm64) TRIPLET=aarch64-linux-gnu ;;
  armhf) TRIPLET=arm-linux-gnueabihf ;;
  *) echo "usage: $0 arm64|armhf" >&2; exit 2 ;;
esac

# The host's tools (protoc, python3, speexdec, oggenc, zip) run the code
# generation and the reference decoders of the tests.
bash scripts/install-deps.sh

HOST_PACKAGES=(crossbuild-essential-"$ARCH" qemu-user)
TARGET_PACKAGES=(
  libboost-dev zlib1g-dev libminizip-dev libtinyxml-dev libprotobuf-dev
  libpng-dev libjpeg-dev libogg-dev libspeex-dev libvorbis-dev libopenal-dev libasound2
  libgles-dev libegl-dev libegl-mesa0 libgl1-mesa-dri
  libcurl4-openssl-dev libcpp-httplib-dev
  libgtest-dev libgmock-dev
  libgeographiclib23
)

SUDO=""
if [ "$(id -u)" -ne 0 ]; then
  SUDO="sudo"
fi

installed() {
  dpkg-query -W -f='${Status}' "$1" 2>/dev/null | grep -q "install ok installed"
}

missing=()
for package in "${HOST_PACKAGES[@]}"; do
  installed "$package" || missing+=("$package")
done
for package in "${TARGET_PACKAGES[@]}"; do
  installed "$package:$ARCH" || missing+=("$package:$ARCH")
done

if [ ${#missing[@]} -ne 0 ]; then
  echo "Installing: ${missing[*]}"
  export DEBIAN_FRONTEND=noninteractive
  if ! dpkg --print-foreign-architectures | grep -qx "$ARCH"; then
    $SUDO dpkg --add-architecture "$ARCH"
  fi
  $SUDO apt-get update -qq
  $SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
fi

# libgeographiclib-dev (the tests' independent geodesic reference) is not
# multiarch: its ARCH build would replace the host's. Its ARCH files go to a
# prefix of their own instead, linking the multiarch runtime library.
PREFIX=/opt/mapcore-cross/$TRIPLET
PC_FILE=$PREFIX/usr/lib/$TRIPLET/pkgconfig/geographiclib.pc
version=$(dpkg-query -W -f='${Version}' "libgeographiclib23:$ARCH")
if ! grep -qs "^# $version\$" "$PC_FILE"; then
  work=$(mktemp -d)
  trap 'rm -rf "$work"' EXIT
  (cd "$work" && apt-get download -qq -o APT::Sandbox::User=root "libgeographiclib-dev:$ARCH=$version" >/dev/null)
  $SUDO rm -rf "$PREFIX"
  $SUDO mkdir -p "$PREFIX"
  $SUDO dpkg-deb -x "$work"/libgeographiclib-dev_*.deb "$PREFIX"
  $SUDO sed -i -e "s|^prefix=.*|prefix=$PREFIX/usr|" -e "1i # $version" "$PC_FILE"
  runtime=$(readlink "$PREFIX/usr/lib/$TRIPLET/libGeographicLib.so")
  $SUDO ln -sf "/usr/lib/$TRIPLET/$runtime" "$PREFIX/usr/lib/$TRIPLET/libGeographicLib.so"
fi
