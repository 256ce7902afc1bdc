/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* Pools of fixed-size buffers. */
#ifndef POOL_H
#define POOL_H

#include "dsplink.h"
#include "pooldefs.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Needs PROC_attach; params: SMAPOOL_Attrs. */
DSP_STATUS POOL_open(PoolId poolId, Pvoid params);

/* Every buffer must have been freed. The last user's call gives DSP_SCLOSED. */
DSP_STATUS POOL_close(PoolId poolId);

#ifdef __cplusplus
}
#endif

#endif
