#!/usr/bin/env bash
# Runs the guest test program inside a small qemu machine on a Debian kernel:
# the real HID core, uhid and hidraw, with no udev daemon. The kernel
# package is fetched once with apt-get download into CACHE and unpacked
# there; busybox-static makes the rest of the initramfs.
#
#   kernel_vm.sh GUEST_PROGRAM CACHE [gtest arguments...]
#
# Exit: 0 when the guest's tests passed, 1 when they failed or the guest
# never reported, 77 (skipped) when qemu, busybox or the kernel cannot be had.
set -u
GUEST="$1"
CACHE="$2"
shift 2
skip() { echo "SKIP: $*"; exit 77; }

QEMU="$(command -v qemu-system-x86_64)" || skip "qemu-system-x86_64 is not installed (package qemu-system-x86)"
BUSYBOX=/bin/busybox
if [ ! -x "$BUSYBOX" ] || ldd "$BUSYBOX" >/dev/null 2>&1; then
  skip "no statically linked /bin/busybox (package busybox-static)"
fi
mkdir -p "$CACHE"

# The kernel: the image package linux-image-amd64 points at, unpacked.
if [ ! -f "$CACHE/kernel/ready" ]; then
  rm -rf "$CACHE/kernel" && mkdir -p "$CACHE/kernel"
  package="$(apt-cache depends linux-image-amd64 2>/dev/null | awk '/Depends: linux-image-[0-9]/ { print $2; exit }')"
  [ -n "$package" ] || skip "apt knows no linux-image-amd64 (no package lists?)"
  (cd "$CACHE/kernel" && apt-get download "$package" >download.log 2>&1) ||
    skip "apt-get download $package failed: $(tail -1 "$CACHE/kernel/download.log")"
  dpkg-deb -x "$CACHE"/kernel/*.deb "$CACHE/kernel/root" || skip "cannot unpack $package"
  rm -f "$CACHE"/kernel/*.deb
  vmlinuz="$(ls "$CACHE"/kernel/root/boot/vmlinuz-* | head -1)"
  # TCG boots the uncompressed kernel faster than it decompresses one: take
  # the xz payload of the bzImage, or boot the bzImage where there is none.
  offset="$(LC_ALL=C grep -abo $'\xfd7zXZ\x00' "$vmlinuz" 2>/dev/null | head -1 | cut -d: -f1)"
  if [ -n "$offset" ] && tail -c +$((offset + 1)) "$vmlinuz" | xz -dcq >"$CACHE/kernel/vmlinux" 2>/dev/null ||
     [ -s "$CACHE/kernel/vmlinux" ]; then :; fi
  [ -s "$CACHE/kernel/vmlinux" ] || cp "$vmlinuz" "$CACHE/kernel/vmlinux"
  # Only the three HID modules are kept of the package's few hundred MB.
  mkdir -p "$CACHE/kernel/hid"
  for module in hid uhid hid-generic; do
    cp "$CACHE"/kernel/root/lib/modules/*/kernel/drivers/hid/"$module".ko* "$CACHE/kernel/hid/" ||
      skip "the kernel package holds no $module module"
  done
  rm -rf "$CACHE/kernel/root"
  touch "$CACHE/kernel/ready"
fi
MODULES="$CACHE/kernel/hid"

# The initramfs: busybox, the three modules, the guest program with the
# libraries it links, and an init that reports through isa-debug-exit.
ROOT="$(mktemp -d "$CACHE/initramfs.XXXXXX")"
trap 'rm -rf "$ROOT"' EXIT
mkdir -p "$ROOT"/{bin,dev,proc,sys,run,tmp,modules}
cp "$BUSYBOX" "$ROOT/bin/busybox"
for tool in sh mount insmod poweroff dd printf echo cat sleep; do ln -s busybox "$ROOT/bin/$tool"; done
for module in hid uhid hid-generic; do
  file="$(ls "$MODULES/$module.ko"* | head -1)"
  case "$file" in
    *.xz) xz -dc "$file" >"$ROOT/modules/$module.ko" ;;
    *.zst) zstd -dcq "$file" >"$ROOT/modules/$module.ko" ;;
    *) cp "$file" "$ROOT/modules/$module.ko" ;;
  esac
done
cp "$GUEST" "$ROOT/bin/guest"
for library in $(ldd "$GUEST" | grep -o '/[^ ]*'); do
  mkdir -p "$ROOT$(dirname "$library")"
  cp -L "$library" "$ROOT$library"
done
{
  echo '#!/bin/sh'
  echo 'mount -t proc proc /proc; mount -t sysfs sys /sys; mount -t devtmpfs dev /dev'
  echo 'for m in hid uhid hid-generic; do insmod /modules/$m.ko || echo "guest: insmod $m failed"; done'
  printf '/bin/guest'
  printf " '%s'" "$@"
  echo
  echo 'status=$?'
  echo 'echo "guest: tests exited with $status"'
  # qemu exits with (value << 1) | 1: 0x10 gives 33, the pass; 0x01 gives 3.
  echo 'if [ $status -eq 0 ]; then value="\020"; else value="\001"; fi'
  echo 'printf "$value" | dd of=/dev/port bs=1 seek=244 count=1 2>/dev/null'
  echo 'poweroff -f'
} >"$ROOT/init"
chmod +x "$ROOT/init"
(cd "$ROOT" && find . | "$BUSYBOX" cpio -o -H newc 2>/dev/null | gzip -1) >"$ROOT.cpio.gz"
trap 'rm -rf "$ROOT" "$ROOT.cpio.gz"' EXIT

timeout 600 "$QEMU" -accel tcg -smp 1 -m 512 -nodefaults -no-user-config \
  -kernel "$CACHE/kernel/vmlinux" -initrd "$ROOT.cpio.gz" \
  -append 'console=ttyS0 quiet panic=-1' -display none -serial stdio -no-reboot \
  -device isa-debug-exit,iobase=0xf4,iosize=0x04 </dev/null
status=$?
# 0 is a poweroff or a panic, never a pass.
if [ "$status" -eq 33 ]; then exit 0; fi
echo "FAIL: the guest ended with qemu status $status (33 is a pass)"
exit 1
