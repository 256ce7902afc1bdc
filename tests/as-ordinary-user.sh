#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# as-ordinary-user.sh PROGRAM [ARGUMENT...]
# Runs a program without root's rights: as "nobody" where root calls, as the caller otherwise.
set -eu
[ "$(id -u)" = 0 ] || exec "$@"
unset XDG_RUNTIME_DIR
# A folder that only root may enter hides the program from everybody else; 77 tells ctest that the test was skipped.
setpriv --reuid=65534 --regid=65534 --clear-groups -- test -x "$1" || {
  echo "skipped: an ordinary user cannot reach $1"
  exit 77
}
HOME=/tmp exec setpriv --reuid=65534 --regid=65534 --clear-groups -- "$@"
