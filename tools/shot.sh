#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# shot.sh BUILD FILE.png
# Runs the program on a virtual device of its own until everything that can be green is, and pictures its window.
set -eu
device="$1/virtual-device/virtual-device" picture=$2
name=shot-$$ output=$(mktemp)

"$device" run --name "$name" >"$output" 2>&1 &
runner=$!
trap 'kill "$runner" 2>/dev/null || true; wait "$runner" || true; rm -f "$output"' EXIT

until grep -q '^ready' "$output"; do
  kill -0 "$runner" 2>/dev/null || { cat "$output" >&2; exit 1; }
  sleep 0.2
done
for region in usb-device usb-gadget trigger sd-card rf.beacon rf.radios; do
  "$device" ctl --device "$name" wait region "$region" green --within 30 ||
    { echo "shot: $region does not turn green" >&2; exit 1; }
done
"$device" ctl --device "$name" screenshot "$picture"
