/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef POOLDEFS_H
#define POOLDEFS_H

#include <gpptypes.h>

typedef struct SMAPOOL_Attrs_tag
{
    Uint32 numBufPools;
    Uint32* bufSizes;
    Uint32* numBuffers;
    Bool exactMatchReq;
} SMAPOOL_Attrs;

#endif
