#!/bin/sh
# Seeds for fuzz_tsreader, cut from the real captures into the build tree (never committed):
# 64 packets from the start, the middle and the end of each, and the first 512 packets.
# usage: ts-seeds.sh CAPTURE_DIR OUT_DIR
set -eu
mkdir -p "$2"
for ts in "$1"/*.ts; do
  [ -f "$ts" ] || { echo "no captures in $1: fuzz_tsreader starts from nothing"; exit 0; }
  name=$(basename "$ts" .ts)
  packets=$(( $(wc -c <"$ts") / 188 ))
  for at in 0 $((packets / 2)) $((packets > 64 ? packets - 64 : 0)); do
    dd if="$ts" of="$2/$name-$at" bs=188 skip="$at" count=64 status=none
  done
  dd if="$ts" of="$2/$name-head" bs=188 count=512 status=none
done
