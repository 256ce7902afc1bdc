/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef CONSTANTS_H
#define CONSTANTS_H

/* Time-outs are in milliseconds. */
#define WAIT_FOREVER 0xFFFFFFFFu
#define WAIT_NONE 0u

/* Queue names are shorter than this. */
#define DSP_MAX_STRLEN 32u

#define MAX_SMABUFENTRIES 16u
#define DSPLINK_BUF_ALIGN 128u

#endif
