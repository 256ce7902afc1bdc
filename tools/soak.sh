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
. "$(dirname "$0")/start-device.sh"

# The device's sound is one second long; a new playback begins within a second and a callback (256 ms) of its end.
longest_gap_ms=1256
# Buffers come every 256 ms, give or take what else the machine does: a stream that stutters is heard, too.
longest_delay_ms=256

goes_on() {
  kill -0 "$runner" 2>/dev/null && kill -0 "$watcher" 2>/dev/null ||
    { echo "soak: the device ended by itself at $(date +%T)"; return 1; }
}

# One stream of events for the whole run: what is wrong for a moment only is in it as well. While nothing is broken no
# region changes its colour, whichever it has. Everything counts from the moment at which the stream is open, which its
# first event tells.
watch() {
  : >"$folder/events"
  "$device" ctl --device "$name" events >>"$folder/events" &
  watcher=$!
  until grep -q '^control audio.forget' "$folder/events"; do
    goes_on || return 1
    ctl set audio.forget true
    sleep 0.2
  done
  ctl regions >"$folder/regions"
  end=$(($(date +%s) + $1 * 60))
  while [ "$(date +%s)" -lt "$end" ]; do
    goes_on || return 1
    sleep 1
  done
}

bench() {
  failed=0
  start_device soak
  for region in usb-device usb-gadget trigger sd-card rf.beacon rf.radios; do
    ctl wait region "$region" green --within 30
  done
  watch "${1:-20}" || { cat "$folder/output"; return 1; }
  if grep ' red$' "$folder/regions"; then
    echo "soak: these were red from the start"
    failed=1
  fi
  if grep '^region ' "$folder/events"; then
    echo "soak: these regions have changed"
    failed=1
  fi
  grep '^log ' "$folder/events" || echo "soak: nothing was logged"
  for control in audio.gap_ms audio.late_ms audio.mismatches audio.sounds radio.violations dsp.violations; do
    echo "$control $(ctl get "$control")"
  done
  [ "$(ctl get audio.sounds)" -gt 0 ] || { echo "soak: there was no sound"; failed=1; }
  [ "$(ctl get audio.gap_ms)" -le "$longest_gap_ms" ] || { echo "soak: the sound had a longer gap"; failed=1; }
  [ "$(ctl get audio.late_ms)" -le "$longest_delay_ms" ] || { echo "soak: the sound stuttered"; failed=1; }
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
