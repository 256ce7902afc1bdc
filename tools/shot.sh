#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# shot.sh BUILD FILE.png
# Runs the program on a virtual device of its own until everything that can be green is, and pictures its window.
set -eu
build=$1 picture=$2
. "$(dirname "$0")/start-device.sh"

start_device shot
for region in usb-device usb-gadget trigger sd-card rf.beacon rf.radios; do
  ctl wait region "$region" green --within 30 ||
    { echo "shot: $region does not turn green" >&2; exit 1; }
done
ctl screenshot "$picture"
