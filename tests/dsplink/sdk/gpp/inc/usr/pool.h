/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef POOL_H
#define POOL_H

#include <dsplink.h>
#include <pooldefs.h>

#if defined(__cplusplus)
extern "C" {
#endif

DSP_STATUS POOL_open(IN PoolId poolId, IN Pvoid params);
DSP_STATUS POOL_close(IN PoolId poolId);

#if defined(__cplusplus)
}
#endif

#endif
