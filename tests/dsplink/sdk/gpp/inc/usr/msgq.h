/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef MSGQ_H
#define MSGQ_H

#include <dsplink.h>
#include <msgqdefs.h>

#if defined(__cplusplus)
extern "C" {
#endif

DSP_STATUS MSGQ_transportOpen(IN ProcessorId procId, IN Pvoid attrs);
DSP_STATUS MSGQ_transportClose(IN ProcessorId procId);
DSP_STATUS MSGQ_open(IN Pstr queueName, OUT MSGQ_Queue* msgqQueue, IN MSGQ_Attrs* attrs);
DSP_STATUS MSGQ_close(IN MSGQ_Queue msgqQueue);
DSP_STATUS MSGQ_locate(IN Pstr queueName, OUT MSGQ_Queue* msgqQueue, IN MSGQ_LocateAttrs* attrs);
DSP_STATUS MSGQ_alloc(IN PoolId poolId, IN Uint16 size, OUT MSGQ_Msg* msg);
DSP_STATUS MSGQ_free(IN MSGQ_Msg msg);
DSP_STATUS MSGQ_put(IN MSGQ_Queue msgqQueue, IN MSGQ_Msg msg);
DSP_STATUS MSGQ_get(IN MSGQ_Queue msgqQueue, IN Uint32 timeout, OUT MSGQ_Msg* msg);
DSP_STATUS MSGQ_setErrorHandler(IN MSGQ_Queue errorQueue, IN PoolId poolId);

#if defined(__cplusplus)
}
#endif

#define MSGQ_getMsgId(msg) (((MSGQ_Msg)(msg))->msgId)
#define MSGQ_getMsgSize(msg) (((MSGQ_Msg)(msg))->size)
#define MSGQ_setMsgId(msg, id) (((MSGQ_Msg)(msg))->msgId = (MSGQ_Id)(id))

#endif
