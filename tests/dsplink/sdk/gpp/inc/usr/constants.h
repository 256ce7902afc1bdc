/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef CONSTANTS_H
#define CONSTANTS_H

#include <gpptypes.h>

#define WAIT_FOREVER ((Uint32)-1)
#define WAIT_NONE ((Uint32)0)
#define DSP_MAX_STRLEN 32u
#define MAX_POOLENTRIES 32u
#define MAX_SMABUFENTRIES 16u

#endif
