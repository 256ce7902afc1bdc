/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* Result codes. A call may succeed with more than one code (orderly shutdown never says DSP_SOK), so test the range. */
#ifndef ERRBASE_H
#define ERRBASE_H

#include "gpptypes.h"

typedef Int32 DSP_STATUS;

#define DSP_SBASE ((DSP_STATUS)0x00008000)
#define DSP_SOK (DSP_SBASE + 0x00)
#define DSP_SALREADYATTACHED (DSP_SBASE + 0x01)
#define DSP_SALREADYOPENED (DSP_SBASE + 0x04)
#define DSP_SALREADYSETUP (DSP_SBASE + 0x07)
#define DSP_SDETACHED (DSP_SBASE + 0x09)
#define DSP_SALREADYLOADED (DSP_SBASE + 0x0A)
#define DSP_SALREADYSTARTED (DSP_SBASE + 0x0B)
#define DSP_SSTOPPED (DSP_SBASE + 0x0C)
#define DSP_SCLOSED (DSP_SBASE + 0x0D)
#define DSP_SLAST ((DSP_STATUS)0x00008500)

#define DSP_EBASE ((DSP_STATUS)0x80008000u)
#define DSP_EACCESSDENIED (DSP_EBASE + 0x00)
#define DSP_EATTACHED (DSP_EBASE + 0x02)
#define DSP_EFAIL (DSP_EBASE + 0x08)
#define DSP_EFILE (DSP_EBASE + 0x09)
#define DSP_EINVALIDARG (DSP_EBASE + 0x0B)
#define DSP_EMEMORY (DSP_EBASE + 0x0C)
#define DSP_ESETUP (DSP_EBASE + 0x0D)
#define DSP_ESTARTED (DSP_EBASE + 0x0E)
#define DSP_ETIMEOUT (DSP_EBASE + 0x17)
#define DSP_EOPENED (DSP_EBASE + 0x19)
#define DSP_EWRONGSTATE (DSP_EBASE + 0x1B)
#define DSP_ENOTFOUND (DSP_EBASE + 0x2D)
#define DSP_ENOTCOMPLETE (DSP_EBASE + 0x51)
#define DSP_ECONFIG (DSP_EBASE + 0x52)

/* Evaluate their argument twice: pass a variable, never a call. */
#define DSP_SUCCEEDED(status) (((DSP_STATUS)(status) >= DSP_SBASE) && ((DSP_STATUS)(status) <= DSP_SLAST))
#define DSP_FAILED(status) (!DSP_SUCCEEDED(status))

#endif
