#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# soak.sh BUILD [NAME [ARGUMENT...]]
# The runs that are too long for a test, all of them or one:
#   RadioLinkSoak [SECONDS]  the radio line at its full rate both ways
#   DspSoak [SECONDS]        full messages from the DSP, a thousand a second
#   bench [MINUTES]          the whole program on the virtual device: no gap in the sound, no region ever wrong
set -eu
build=$(realpath "$1") source=$(realpath "$(dirname "$0")/..")
shift

# The default sound is two seconds long; a new playback begins within a second and a callback (256 ms) of its end.
longest_gap_ms=1256

bench() {
  minutes=${1:-20} device="$build/virtual-device/virtual-device"
  name=soak-$$ output=$(mktemp)
  "$device" run --name "$name" >"$output" 2>&1 &
  runner=$!
  trap 'kill "$runner" 2>/dev/null || true; wait "$runner" || true; rm -f "$output"' EXIT
  until grep -q '^ready' "$output"; do
    kill -0 "$runner" 2>/dev/null || { cat "$output" >&2; exit 1; }
    sleep 0.2
  done
  ctl() { "$device" ctl --device "$name" "$@"; }
  for region in usb-device usb-gadget trigger sd-card rf.beacon rf.radios; do
    ctl wait region "$region" green --within 30
  done
  # Any of them turning red is what must not happen: wait for it, all at once, for the whole run.
  end=$(($(date +%s) + minutes * 60)) failed=0
  while [ "$(date +%s)" -lt "$end" ]; do
    for region in usb-device usb-gadget trigger sd-card rf.beacon rf.radios rtc; do
      if ctl wait region "$region" red --within 1 2>/dev/null; then
        echo "soak: $region turned red"
        failed=1
      fi
    done
  done
  for control in audio.gap_ms audio.mismatches audio.sounds radio.violations dsp.violations; do
    echo "$control $(ctl get "$control")"
  done
  [ "$(ctl get audio.gap_ms)" -le "$longest_gap_ms" ] || { echo "soak: the sound had a longer gap"; failed=1; }
  [ "$(ctl get audio.mismatches)" -eq 0 ] || { echo "soak: the sound was not the file's"; failed=1; }
  [ "$(ctl get radio.violations)" -eq 0 ] || { echo "soak: the program broke the radio line's rules"; failed=1; }
  [ "$(ctl get dsp.violations)" -eq 0 ] || { echo "soak: the program broke the DSP's rules"; failed=1; }
  return $failed
}

# soak PROGRAM [ARGUMENT...]
soak() {
  program=$1
  shift
  case $program in
  # It serves /dev/dsplink, which here must not be the machine's.
  DspSoak) "$source/tests/sandbox.sh" "$source" "$build" "$build/benchmarks/$program" "$@" ;;
  *) "$build/benchmarks/$program" "$@" ;;
  esac
}

case ${1:-all} in
all)
  soak RadioLinkSoak
  soak DspSoak
  bench
  ;;
bench)
  shift
  bench "$@"
  ;;
*) soak "$@" ;;
esac
echo "soak: passed"
