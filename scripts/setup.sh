#!/usr/bin/env bash
# Installs every Debian package the build and the tests need.
# Idempotent: when everything is present it only runs dpkg-query and exits.
set -euo pipefail

PACKAGES=(
  build-essential cmake ninja-build pkg-config git
  clang libclang-rt-14-dev clang-format
  googletest libgtest-dev libgmock-dev libbenchmark-dev
  libxml2-dev libxml2-utils zlib1g-dev
  libudev-dev libusb-1.0-0-dev libftdi1-dev libsystemd-dev
  qt6-base-dev qt6-svg-dev gettext
  umockdev libumockdev-dev libglib2.0-dev edid-decode
  srecord binutils python3 python3-jsonschema dbus-daemon groff man-db time
  openssl
  qemu-system-x86 busybox-static
  udev lintian desktop-file-utils appstream debootstrap
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

echo "setup: installing ${missing[*]}"
SUDO=""
if [ "$(id -u)" -ne 0 ]; then SUDO="sudo"; fi
export DEBIAN_FRONTEND=noninteractive
$SUDO apt-get update
$SUDO apt-get install -y --no-install-recommends "${missing[@]}"
