# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# For scripts that need the program on a virtual device of their own, $build being the build folder: start_device LABEL
# returns when the device is ready, and the device goes when the script ends. From then on "ctl" talks to it, "$folder"
# is a folder for the script's own files, and "$folder/output" is what the device has printed.
# shellcheck shell=sh
start_device() {
  device="$build/virtual-device/virtual-device" name=$1-$$ folder=$(mktemp -d)
  : >"$folder/output"
  "$device" run --name "$name" >"$folder/output" 2>&1 &
  runner=$!
  trap 'kill "$runner" 2>/dev/null || true; wait "$runner" || true; rm -rf "$folder"' EXIT
  until grep -q '^ready' "$folder/output"; do
    kill -0 "$runner" 2>/dev/null || { cat "$folder/output" >&2; exit 1; }
    sleep 0.2
  done
}

ctl() {
  "$device" ctl --device "$name" "$@"
}
