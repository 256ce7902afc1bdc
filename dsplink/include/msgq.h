/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* Message queues between the processors. Several threads may send to a queue, one receives on it. */
#ifndef MSGQ_H
#define MSGQ_H

#include "dsplink.h"
#include "msgqdefs.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Creates a local queue to receive on; attrs may be null. */
DSP_STATUS MSGQ_open(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_Attrs* attrs);
DSP_STATUS MSGQ_close(MSGQ_Queue msgqQueue);

/* Asynchronous errors of the transport go to errorQueue, in buffers of that pool. */
DSP_STATUS MSGQ_setErrorHandler(MSGQ_Queue errorQueue, PoolId poolId);

/* Once a process, after attach; attrs: ZCPYMQT_Attrs, never null. */
DSP_STATUS MSGQ_transportOpen(ProcessorId procId, Pvoid attrs);
/* The last user's call gives DSP_SCLOSED. */
DSP_STATUS MSGQ_transportClose(ProcessorId procId);

/* Finds a queue of the other processor, waiting for it as long as attrs says. */
DSP_STATUS MSGQ_locate(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_LocateAttrs* attrs);

/* size counts the header and must exceed it. */
DSP_STATUS MSGQ_alloc(PoolId poolId, Uint16 size, MSGQ_Msg* msg);
DSP_STATUS MSGQ_free(MSGQ_Msg msg);

/* Does not block. On success the message belongs to the receiver, on failure still to the caller. */
DSP_STATUS MSGQ_put(MSGQ_Queue msgqQueue, MSGQ_Msg msg);

/* Local queues only. The message is the caller's to free. */
DSP_STATUS MSGQ_get(MSGQ_Queue msgqQueue, Uint32 timeout, MSGQ_Msg* msg);

#ifdef __cplusplus
}
#endif

#define MSGQ_getMsgId(msg) (((MSGQ_Msg)(msg))->msgId)
#define MSGQ_setMsgId(msg, id) (((MSGQ_Msg)(msg))->msgId = (id))
#define MSGQ_getMsgSize(msg) (((MSGQ_Msg)(msg))->size)

#endif
