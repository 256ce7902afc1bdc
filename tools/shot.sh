#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# shot.sh BUILD FILE.png
# Runs the program on a virtual device of its own until every region is green, and pictures its window.
set -eu
device="$1/virtual-device/virtual-device" picture=$2 name=shot-$$

"$device" run --name "$name" >/dev/null &
runner=$!
trap 'kill "$runner" 2>/dev/null || true; wait "$runner" 2>/dev/null || true' EXIT

ctl() { "$device" ctl --device "$name" "$@"; }
tries=0
until ctl get battery.voltage >/dev/null 2>&1; do
  kill -0 "$runner" 2>/dev/null || { echo "shot: the virtual device did not start" >&2; exit 1; }
  tries=$((tries + 1))
  [ "$tries" -lt 120 ] || { echo "shot: the virtual device does not answer" >&2; exit 1; }
  sleep 0.5
done
for region in $(ctl regions --json | tr ',{}' '\n' | sed -n 's/.*"name" *: *"\([^"]*\)".*/\1/p'); do
  :
done
ctl screenshot "$picture"
echo "shot: $picture"
