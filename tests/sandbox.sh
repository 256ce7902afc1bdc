#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# sandbox.sh SOURCE BUILD PROGRAM [ARGUMENT...]
# Runs one test program as an ordinary user in a file system of its own, working directory "/": the device's fixed
# paths (/dev, /sys, /mnt, /etc/sounds, /dev/log) are empty, private and writable there, so that a test lays out just
# what its case needs and as root, too, meets the permissions that it sets.
set -eu
source_dir=$1 build_dir=$2
shift 2
exec bwrap --die-with-parent --unshare-user --uid 1000 --gid 1000 --unshare-pid --unshare-net --unshare-ipc \
  --tmpfs / --ro-bind /usr /usr \
  --symlink usr/bin /bin --symlink usr/sbin /sbin --symlink usr/lib /lib --symlink usr/lib64 /lib64 \
  --proc /proc --dev /dev --tmpfs /sys --tmpfs /tmp --tmpfs /run --dir /mnt \
  --dir /etc --dir /etc/sounds --ro-bind-try /etc/fonts /etc/fonts --ro-bind-try /etc/alternatives /etc/alternatives \
  --ro-bind-try /etc/alsa /etc/alsa --ro-bind-try /etc/ld.so.cache /etc/ld.so.cache \
  --ro-bind-try /var/cache/fontconfig /var/cache/fontconfig \
  --ro-bind "$source_dir" "$source_dir" --ro-bind "$build_dir" "$build_dir" \
  --perms 0700 --dir /run/user --setenv XDG_RUNTIME_DIR /run/user --setenv HOME /tmp --chdir / -- "$@"
