/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* A tree with the shape of the chip maker's SDK, as far as the program meets it: other folders and more files than
 * dsplink/include, 32-bit types on "long", markers before parameters, the defines of a build. It is only compiled
 * against. */
#ifndef DSPLINK_H
#define DSPLINK_H

#include <archdefs.h>
#include <constants.h>
#include <errbase.h>
#include <gpptypes.h>
#include <linkcfgdefs.h>

#endif
