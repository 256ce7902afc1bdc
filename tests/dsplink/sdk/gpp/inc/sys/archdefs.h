/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef ARCHDEFS_H
#define ARCHDEFS_H

/* What the device is like is told by the defines that go with a build of the library. */
#if !defined(MAX_DSPS)
#error "the defines of the build are missing"
#endif

#define DSPLINK_BUF_ALIGN 128u
#define DSP_MAUSIZE 1u

#endif
