#!/usr/bin/env bash
# Times `tavik-fwupdater --inspect FILE --output-binary OUT` beside srec_cat
# and objcopy on the same 16 MiB image, as S-record (S3, 32 bytes a line) in
# address order and shuffled, and on the largest Intel hex image the reader
# takes. Prints seconds, MB/s of input text and peak memory of each run, and
# checks that every tool wrote the same bytes.
#
#   bench/firmware_peers.sh [path/to/tavik-fwupdater] [runs]
#
# The default binary is the release build: cmake --preset release &&
# cmake --build --preset release.
set -euo pipefail

here="$(cd "$(dirname "$0")" && pwd)"
updater="${1:-$here/../build/release/src/app/tavik-fwupdater}"
runs="${2:-3}"
for tool in srec_cat objcopy python3 /usr/bin/time; do
  command -v "$tool" >/dev/null || { echo "missing $tool" >&2; exit 1; }
done
[ -x "$updater" ] || { echo "no updater at $updater" >&2; exit 1; }

work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT

python3 - "$work" <<'EOF'
import os, random, sys
work = sys.argv[1]
rng = random.Random(20240611)
size = 16 * 1024 * 1024
image = os.urandom(size)
open(os.path.join(work, "image.bin"), "wb").write(image)

def s3(address, chunk):
    body = bytes([len(chunk) + 5]) + address.to_bytes(4, "big") + chunk
    return "S3" + body.hex().upper() + "%02X" % (~sum(body) & 0xFF)

lines = [s3(offset, image[offset:offset + 32]) for offset in range(0, size, 32)]
header, end = "S00600004844521B", "S70500000000FA"
with open(os.path.join(work, "sorted.srec"), "w") as out:
    out.write("\n".join([header] + lines + [end]) + "\n")
rng.shuffle(lines)
with open(os.path.join(work, "shuffled.srec"), "w") as out:
    out.write("\n".join([header] + lines + [end]) + "\n")

# The largest Intel hex image the reader takes: 180224 bytes from 0x8000.
hex_size = 180224
hex_image = os.urandom(hex_size)
open(os.path.join(work, "hex.bin"), "wb").write(hex_image)
def ihex(address, kind, data):
    body = bytes([len(data), address >> 8 & 0xFF, address & 0xFF, kind]) + data
    return ":" + body.hex().upper() + "%02X" % (-sum(body) & 0xFF)
records = [ihex(0, 4, b"\x00\x00")]
for offset in range(0, hex_size, 16):
    address = 0x8000 + offset
    if address % 0x10000 == 0:
        records.append(ihex(0, 4, (address >> 16).to_bytes(2, "big")))
    records.append(ihex(address & 0xFFFF, 0, hex_image[offset:offset + 16]))
records.append(ihex(0, 1, b""))
with open(os.path.join(work, "image.hex"), "w", newline="") as out:
    out.write("\r\n".join(records) + "\r\n")
EOF

# Best of the runs: wall seconds (date, nanoseconds) and the peak resident
# memory of that run (/usr/bin/time), then MB/s of the input text.
measure() {
  local label="$1" input="$2" output="$3" expected="$4"
  shift 4
  local best_ns="" best_kib="" start end
  for _ in $(seq "$runs"); do
    rm -f "$output"
    start=$(date +%s%N)
    /usr/bin/time -f "%M" -o "$work/time" "$@" >/dev/null 2>"$work/stderr" || {
      echo "$label failed:" >&2; cat "$work/stderr" >&2; exit 1; }
    end=$(date +%s%N)
    if [ -z "$best_ns" ] || [ $((end - start)) -lt "$best_ns" ]; then
      best_ns=$((end - start))
      best_kib=$(tail -n 1 "$work/time")
    fi
  done
  cmp -s "$output" "$expected" || { echo "$label wrote a different image" >&2; exit 1; }
  awk -v l="$label" -v ns="$best_ns" -v b="$(stat -c %s "$input")" -v k="$best_kib" \
    'BEGIN{s=ns/1e9; printf "%-36s %7.3f s %8.1f MB/s %7.1f MiB peak\n", l, s, b/s/1e6, k/1024}'
}

echo "input: 16 MiB image, $(stat -c %s "$work/sorted.srec") bytes of S3 text; best of $runs runs"
for order in sorted shuffled; do
  in="$work/$order.srec"
  cp "$in" "$work/$order.tav"
  measure "srec_cat $order" "$in" "$work/out.bin" "$work/image.bin" \
    srec_cat "$in" -Motorola -o "$work/out.bin" -Binary
  measure "objcopy $order" "$in" "$work/out.bin" "$work/image.bin" \
    objcopy -I srec -O binary --gap-fill 0xFF "$in" "$work/out.bin"
  measure "tavik-fwupdater --inspect $order" "$in" "$work/out.bin" "$work/image.bin" \
    "$updater" --inspect "$work/$order.tav" --output-binary "$work/out.bin"
done
measure "tavik-fwupdater --inspect hex" "$work/image.hex" "$work/out.bin" "$work/hex.bin" \
  "$updater" --inspect "$work/image.hex" --output-binary "$work/out.bin"
