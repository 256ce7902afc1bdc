/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef ERRBASE_H
#define ERRBASE_H

#include <gpptypes.h>

typedef Int32 DSP_STATUS;

#define DSP_SBASE ((DSP_STATUS)0x00008000l)
#define DSP_SOK (DSP_SBASE + 0x00l)
#define DSP_SLAST ((DSP_STATUS)0x00008500l)
#define DSP_EBASE ((DSP_STATUS)0x80008000l)

#define DSP_SUCCEEDED(status) (((DSP_STATUS)(status) >= (DSP_SBASE)) && ((DSP_STATUS)(status) <= (DSP_SLAST)))
#define DSP_FAILED(status) (!DSP_SUCCEEDED(status))

#endif
