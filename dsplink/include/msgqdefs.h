/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef MSGQDEFS_H
#define MSGQDEFS_H

#include "gpptypes.h"

typedef Uint16 MSGQ_Id;

/* High half: processor id; low half: queue id. */
typedef Uint32 MSGQ_Queue;

/* 16 bits wide although a queue's handle has 32. */
#define MSGQ_INVALIDMSGQ ((Uint16)0xFFFF)

/* Every message begins with this header; user code touches msgId alone, through the macros of msgq.h. */
typedef struct MSGQ_MsgHeader_tag
{
    Uint32 reserved[2]; /* link words of the transport */
    Uint16 srcProcId;   /* processor of the source queue */
    Uint16 poolId;      /* pool that the message came from */
    Uint16 size;        /* bytes, this header included */
    Uint16 dstId;       /* destination queue */
    Uint16 srcId;       /* queue for replies */
    Uint16 msgId;       /* the user's message id */
} MSGQ_MsgHeader;

typedef MSGQ_MsgHeader* MSGQ_Msg;

static_assert(sizeof(MSGQ_MsgHeader) == 20, "the firmware's data begin 20 bytes into a message");
static_assert(offsetof(MSGQ_MsgHeader, size) == 12, "position of the message's size");
static_assert(offsetof(MSGQ_MsgHeader, msgId) == 18, "position of the user's message id");

/* Optional: callers pass null. */
typedef struct MSGQ_Attrs_tag MSGQ_Attrs;

typedef struct MSGQ_LocateAttrs_tag
{
    Uint32 timeout; /* milliseconds, WAIT_FOREVER or WAIT_NONE */
} MSGQ_LocateAttrs;

/* The zero-copy transport. */
typedef struct ZCPYMQT_Attrs_tag
{
    PoolId poolId; /* pool of its control messages */
} ZCPYMQT_Attrs;

static_assert(sizeof(ZCPYMQT_Attrs) == 2, "one pool id");

#endif
