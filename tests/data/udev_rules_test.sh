#!/usr/bin/env bash
# Runs the real udevadm over our udev rule, alone, against emulated device
# trees (umockdev), and checks which nodes the rule opens to the seat's
# user. A private mount namespace puts the rule where udevadm reads rules
# and keeps its database out of the real /run.
# Usage: udev_rules_test.sh RULES_FILE DEVICES_FILE; exit 77 = skipped.
set -euo pipefail
rules=$1 devices=$2

for tool in udevadm umockdev-run unshare; do
  command -v "$tool" > /dev/null || { echo "SKIP: $tool is not installed"; exit 77; }
done
unshare -r -m true 2> /dev/null || { echo "SKIP: no user and mount namespaces here"; exit 77; }

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
mkdir "$work/rules" "$work/empty"
cp "$rules" "$work/rules/"
grep -v '^#' "$devices" | cat -s | sed '/./,$!d' > "$work/devices.umockdev"

# name | sysfs path below the controller | opened to the user
cases=(
  "family pen, HID|usb1/1-2/1-2.1/1-2.1:1.0/0003:7A5D:0301.0001/hidraw/hidraw0|yes"
  "family pen as its loader|usb1/1-2/1-2.2/1-2.2:1.0/0003:7A5D:0302.0002/hidraw/hidraw1|yes"
  "family touch controller, USB device|usb1/1-2/1-2.3|yes"
  "HID scalar under the scalar vendor id|usb1/1-2/1-2.4/1-2.4:1.0/0003:5B27:0631.0003/hidraw/hidraw2|yes"
  "pen display's FTDI bridge behind its hub|usb1/1-2/1-2.5|yes"
  "the bridge's interface, not a device node|usb1/1-2/1-2.5/1-2.5:1.0|no"
  "other FTDI chip behind the family hub|usb1/1-2/1-2.6|no"
  "unrelated FTDI bridge on a root port|usb1/1-3|no"
  "unrelated HID device|usb1/1-4/1-4:1.0/0003:046D:C52B.0004/hidraw/hidraw3|no"
  "unrelated USB device|usb1/1-4|no"
)
paths=()
for c in "${cases[@]}"; do
  IFS='|' read -r _ path _ <<< "$c"
  paths+=("/sys/devices/pci0000:00/0000:00:14.0/$path")
done

# Every rules folder udevadm reads is replaced: ours holds only our rule.
# shellcheck disable=SC2016
unshare -r -m bash -c '
  set -e
  work=$1; shift
  mount -t tmpfs tmpfs /run
  for d in /etc/udev/rules.d /usr/local/lib/udev/rules.d /lib/udev/rules.d; do
    [ -d "$d" ] && mount --bind "$work/empty" "$d"
  done
  mount --bind "$work/rules" /usr/lib/udev/rules.d
  exec umockdev-run -d "$work/devices.umockdev" -- bash -c "
    for p; do
      echo \"== \$p\"
      udevadm test \"\$p\" 2>&1 | grep -E \"^(TAGS=|Reading rules file|.*(invalid|Invalid|failed|Failed to parse))\" || true
    done" _ "$@"
' _ "$work" "${paths[@]}" > "$work/out"

failed=0
grep -q "Reading rules file: .*$(basename "$rules")" "$work/out" ||
  { echo "FAIL: udevadm did not read $(basename "$rules")"; failed=1; }
if grep -iE "invalid|failed to parse" "$work/out"; then
  echo "FAIL: udevadm refused part of the rule"; failed=1
fi
for i in "${!cases[@]}"; do
  IFS='|' read -r name _ expected <<< "${cases[$i]}"
  tags=$(awk -v p="== ${paths[$i]}" '$0 == p {on = 1; next} /^== / {on = 0} on && /^TAGS=/' "$work/out")
  got=no
  [[ $tags == *:uaccess:* ]] && got=yes
  if [ "$got" != "$expected" ]; then
    echo "FAIL: $name: uaccess $got, expected $expected"; failed=1
  else
    echo "ok: $name: uaccess $got"
  fi
done
exit $failed
