/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef POOLDEFS_H
#define POOLDEFS_H

#include "gpptypes.h"

/* A pool in the memory that both processors share. */
typedef struct SMAPOOL_Attrs_tag
{
    Uint32 numBufPools; /* entries of the two tables, at most MAX_SMABUFENTRIES */
    Uint32* bufSizes;   /* bytes, multiples of DSPLINK_BUF_ALIGN */
    Uint32* numBuffers; /* buffers of each size */
    Bool exactMatchReq; /* true: only sizes of the table can be allocated */
} SMAPOOL_Attrs;

#endif
