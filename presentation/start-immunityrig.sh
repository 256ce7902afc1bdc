#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# Starts the program on the device: on the framebuffer, with the keys of the kernel's input devices. What is set already
# stays.
set -eu

# Some of the kernel's files are named relative to it.
cd /

export QT_QPA_PLATFORM="${QT_QPA_PLATFORM:-linuxfb}"
# There is no pointer.
export QT_QPA_FB_HIDECURSOR="${QT_QPA_FB_HIDECURSOR:-1}"
# The keypad is read from its event device, which needs neither udev nor keyboard layouts.
export QT_QPA_FB_NO_LIBINPUT="${QT_QPA_FB_NO_LIBINPUT:-1}"
# A keyboard at the USB socket must not end the run with Ctrl-Alt-Backspace.
export QT_QPA_EVDEV_KEYBOARD_PARAMETERS="${QT_QPA_EVDEV_KEYBOARD_PARAMETERS:-disable-zap}"

exec immunityrig "$@"
