#!/usr/bin/env bash
# Builds the .deb from the build tree, unpacks it into an empty root, checks
# that every installed file is where the system looks for it, lets lintian
# judge it, and runs the unpacked program: a listing and a headless update
# of a lab product, with the data it finds beside its own executable.
# Usage: package_test.sh BUILD_DIR; exit 77 = skipped.
set -euo pipefail
build=$1

for tool in cpack dpkg-deb dpkg-shlibdeps; do
  command -v "$tool" > /dev/null || { echo "SKIP: $tool is not installed"; exit 77; }
done

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
failed=0
fail() { echo "FAIL: $*"; failed=1; }

(cd "$build" && cpack --config CPackConfig.cmake -G DEB -B "$work/cpack" > "$work/cpack.log") ||
  { cat "$work/cpack.log"; exit 1; }
deb=$(ls "$work"/cpack/tavik-fwupdater_*.deb)
echo "built $(basename "$deb"), $(du -k "$deb" | cut -f1) KiB"

depends=$(dpkg-deb --field "$deb" Depends)
echo "Depends: $depends"
for lib in libc6 libqt6widgets6 libudev1 libusb-1.0-0 libftdi1-2 libxml2 libsystemd0; do
  [[ " $depends," == *" $lib "* ]] || fail "Depends lacks $lib"
done
control=$(dpkg-deb --ctrl-tarfile "$deb" | tar -t)
for file in ./postinst ./postrm ./conffiles; do
  grep -qx "$file" <<< "$control" || fail "no $file in the control files"
done

# The maintainer scripts never fail an install, whatever udev can do here:
# as this machine has it, and with a udevadm that refuses everything.
dpkg-deb -e "$deb" "$work/control"
mkdir "$work/stub"
printf '#!/bin/sh\nexit 1\n' > "$work/stub/udevadm"
chmod +x "$work/stub/udevadm"
for path in "$PATH" "$work/stub:$PATH"; do
  PATH=$path sh "$work/control/postinst" configure || fail "postinst failed (PATH=$path)"
  PATH=$path sh "$work/control/postrm" remove || fail "postrm failed (PATH=$path)"
done

root=$work/root
dpkg-deb -x "$deb" "$root"
for path in \
  usr/bin/tavik-fwupdater \
  usr/libexec/tavik-fwupdater/tavik-fwupdater-window \
  usr/libexec/tavik-update-helper \
  usr/share/tavik-fwupdater/fw_loader.ini \
  usr/share/tavik-fwupdater/Firmware/wireless-tablet.pen \
  usr/share/tavik-fwupdater/Firmware/display-ftdi.bin \
  usr/share/locale/en/LC_MESSAGES/tavik-fwupdater.mo \
  usr/share/locale/de/LC_MESSAGES/Devices.mo \
  usr/share/icons/hicolor/scalable/apps/com.tavik.fwupdater.svg \
  usr/share/applications/com.tavik.fwupdater.desktop \
  usr/share/metainfo/com.tavik.fwupdater.metainfo.xml \
  usr/lib/udev/rules.d/70-tavik-fwupdater.rules \
  usr/share/dbus-1/system-services/com.tavik.UpdateHelper.service \
  usr/share/dbus-1/system.d/com.tavik.UpdateHelper.conf \
  usr/lib/systemd/system/tavik-update-helper.service \
  usr/share/polkit-1/actions/com.tavik.update-helper.policy \
  etc/tavik/update-helper.conf.example \
  usr/share/doc/tavik-fwupdater/copyright \
  usr/share/doc/tavik-fwupdater/changelog.gz \
  usr/share/tavik-fwupdater/update-report.schema.json \
  usr/share/man/man1/tavik-fwupdater.1.gz \
  usr/share/bash-completion/completions/tavik-fwupdater; do
  [ -e "$root/$path" ] || fail "missing /$path"
done
# The bus and systemd start the helper where the package puts it.
grep -q '^Exec=/usr/libexec/tavik-update-helper$' \
  "$root/usr/share/dbus-1/system-services/com.tavik.UpdateHelper.service" ||
  fail "the bus service names another program"

if command -v lintian > /dev/null; then
  lintian --fail-on error "$deb" > "$work/lintian.log" 2>&1 || fail "lintian reports errors"
  cat "$work/lintian.log"
else
  echo "lintian is not installed: not judged"
fi

# The unpacked program, away from the build tree: its data must come from
# <root>/usr/share, found through its own path.
export HOME=$work/home XDG_STATE_HOME=$work/state XDG_CONFIG_HOME=$work/config
unset DISPLAY WAYLAND_DISPLAY QT_QPA_PLATFORM
program=$root/usr/bin/tavik-fwupdater
if ! (cd "$work" && "$program" --list --lab > "$work/list.log" 2>&1); then
  cat "$work/list.log"; fail "--list --lab failed"
fi
grep -q "$root/usr/share/tavik-fwupdater/fw_loader.ini" "$work/list.log" ||
  { cat "$work/list.log"; fail "--list did not read the unpacked configuration"; }
if ! (cd "$work" && "$program" --lab classic-tablet --lab-fast --headless --yes -p "" \
        > "$work/update.log" 2>&1); then
  cat "$work/update.log"; fail "the lab update failed"
fi
cat "$work/update.log"
# A window run hands over to the unpacked window program, which finds the
# same data from its own folder.
if ! (cd "$work" && QT_QPA_PLATFORM=offscreen "$program" --lab classic-tablet --lab-fast --yes \
        -p "" --verbose > "$work/window.log" 2>&1) ||
   ! grep -qF 'Window: "Programming Successful"' "$work/window.log" ||
   ! grep -qF "$root/usr/share/tavik-fwupdater/" "$work/window.log"; then
  grep -E "window program|fw_loader|Window|Error|\[E\]" "$work/window.log" | tail -20
  fail "the window update failed"
fi
exit $failed
