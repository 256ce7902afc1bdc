/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef MSGQDEFS_H
#define MSGQDEFS_H

#include <gpptypes.h>

typedef Uint16 MSGQ_Id;
typedef Int16 MSGQ_MqtError;
typedef Uint32 MSGQ_Queue;

#define MSGQ_INVALIDMSGQ ((Uint16)0xFFFF)
#define MSGQ_INVALIDPROCID ((Uint16)0xFFFF)
#define MSGQ_INVALIDMSGID ((Uint16)0xFFFF)

typedef struct MSGQ_MsgHeader_tag
{
    Uint32 reserved[2];
    Uint16 srcProcId;
    Uint16 poolId;
    Uint16 size;
    Uint16 dstId;
    Uint16 srcId;
    Uint16 msgId;
} MSGQ_MsgHeader, *MSGQ_Msg;

typedef Int (*MsgqPend)(Pvoid notifyHandle, Uint32 timeout);
typedef void (*MsgqPost)(Pvoid notifyHandle);

typedef struct MSGQ_Attrs_tag
{
    Pvoid notifyHandle;
    MsgqPend pend;
    MsgqPost post;
} MSGQ_Attrs;

typedef struct MSGQ_LocateAttrs_tag
{
    Uint32 timeout;
} MSGQ_LocateAttrs;

typedef struct MSGQ_AsyncErrorMsg_tag
{
    MSGQ_MsgHeader header;
    MSGQ_MqtError errorType;
    Pvoid arg1;
    Pvoid arg2;
} MSGQ_AsyncErrorMsg;

typedef struct ZCPYMQT_Attrs_tag
{
    PoolId poolId;
} ZCPYMQT_Attrs;

#endif
