#!/usr/bin/env bash
# Installs the .deb with apt into a fresh Debian 12 root made by debootstrap,
# which pulls in the dependencies dpkg-shlibdeps named, then runs the
# installed program there: a listing and a headless lab update. Needs root,
# the network and a few minutes, so it runs only with TAV_DEB_INSTALL_TEST=1.
# Usage: package_install_test.sh BUILD_DIR; exit 77 = skipped.
set -euo pipefail
build=$1

[ "${TAV_DEB_INSTALL_TEST:-}" = 1 ] || { echo "SKIP: set TAV_DEB_INSTALL_TEST=1 to run"; exit 77; }
[ "$(id -u)" = 0 ] || { echo "SKIP: debootstrap and chroot need root"; exit 77; }
for tool in cpack debootstrap chroot; do
  command -v "$tool" > /dev/null || { echo "SKIP: $tool is not installed"; exit 77; }
done

work=$(mktemp -d)
trap 'umount "$work/root/proc" 2> /dev/null || true; rm -rf --one-file-system "$work"' EXIT
(cd "$build" && cpack --config CPackConfig.cmake -G DEB -B "$work/cpack" > /dev/null)
deb=$(ls "$work"/cpack/tavik-fwupdater_*.deb)

root=$work/root
start=$SECONDS
debootstrap --variant=minbase bookworm "$root" > "$work/debootstrap.log" 2>&1 ||
  { tail -20 "$work/debootstrap.log"; exit 1; }
echo "debootstrap: $((SECONDS - start)) s"
cp "$deb" "$root/tmp/"
# The program finds its data through /proc/self/exe, as on a running system.
mount -t proc proc "$root/proc"
start=$SECONDS
chroot "$root" env DEBIAN_FRONTEND=noninteractive \
  apt-get install -y --no-install-recommends "/tmp/$(basename "$deb")" > "$work/apt.log" 2>&1 ||
  { tail -30 "$work/apt.log"; exit 1; }
echo "apt-get install: $((SECONDS - start)) s"

run() { chroot "$root" env HOME=/root "$@"; }
run tavik-fwupdater --list --lab
run tavik-fwupdater --lab classic-tablet --lab-fast --headless --yes -p ""
run sh -c 'dpkg -s tavik-fwupdater | grep -q "^Status: install ok installed"'
run apt-get remove -y tavik-fwupdater > /dev/null
echo "installed, run and removed in a fresh Debian 12 root"
