#!/bin/sh
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
#
# as-ordinary-user.sh PROGRAM [ARGUMENT...]
# Runs a program without root's rights: as "nobody" where root calls, as the caller otherwise.
set -eu
[ "$(id -u)" = 0 ] || exec "$@"
unset XDG_RUNTIME_DIR
HOME=/tmp exec setpriv --reuid=65534 --regid=65534 --clear-groups -- "$@"
