// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/Link.h"

#include <cstring>

/// The calls of the interface: arguments checked, then handed to the one link of this process. No exception leaves
/// them.

namespace
{

using DspLinkHost::Link;

constexpr ProcessorId onlyProcessor = 0;
constexpr PoolId onlyPool = 0;

bool isQueueName(const Char8* name)
{
    if (name == nullptr)
        return false;
    const std::size_t length = ::strnlen(name, DSP_MAX_STRLEN);
    return length > 0 && length < DSP_MAX_STRLEN;
}

template <typename Operation> DSP_STATUS guarded(bool argumentsAreValid, Operation operation) noexcept
{
    if (!argumentsAreValid)
        return DSP_EINVALIDARG;
    try {
        return operation();
    } catch (...) {
        return DSP_EMEMORY;
    }
}

} // namespace

DSP_STATUS PROC_setup(LINKCFG_Object* linkCfg)
{
    return guarded(linkCfg == nullptr, [] { return Link::instance().setup(); });
}

DSP_STATUS PROC_attach(ProcessorId procId, PROC_Attrs* attr)
{
    return guarded(procId == onlyProcessor && attr == nullptr, [] { return Link::instance().attach(); });
}

DSP_STATUS PROC_load(ProcessorId procId, Char8* imagePath, Uint32 argc, Char8** argv)
{
    return guarded(procId == onlyProcessor && imagePath != nullptr && (argc == 0) == (argv == nullptr),
                   [=] { return Link::instance().load(imagePath); });
}

DSP_STATUS PROC_start(ProcessorId procId)
{
    return guarded(procId == onlyProcessor, [] { return Link::instance().start(); });
}

DSP_STATUS PROC_stop(ProcessorId procId)
{
    return guarded(procId == onlyProcessor, [] { return Link::instance().stop(); });
}

DSP_STATUS PROC_detach(ProcessorId procId)
{
    return guarded(procId == onlyProcessor, [] { return Link::instance().detach(); });
}

DSP_STATUS POOL_open(PoolId poolId, Pvoid params)
{
    return guarded(poolId == onlyPool && params != nullptr,
                   [=] { return Link::instance().openPool(static_cast<const SMAPOOL_Attrs*>(params)); });
}

DSP_STATUS POOL_close(PoolId poolId)
{
    return guarded(poolId == onlyPool, [] { return Link::instance().closePool(); });
}

DSP_STATUS MSGQ_open(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_Attrs* attrs)
{
    return guarded(isQueueName(queueName) && msgqQueue != nullptr && attrs == nullptr,
                   [=] { return Link::instance().openQueue(queueName, msgqQueue); });
}

DSP_STATUS MSGQ_close(MSGQ_Queue msgqQueue)
{
    return guarded(true, [=] { return Link::instance().closeQueue(msgqQueue); });
}

DSP_STATUS MSGQ_setErrorHandler(MSGQ_Queue errorQueue, PoolId poolId)
{
    return guarded(poolId == onlyPool, [=] { return Link::instance().checkErrorHandler(errorQueue); });
}

DSP_STATUS MSGQ_transportOpen(ProcessorId procId, Pvoid attrs)
{
    return guarded(procId == onlyProcessor && attrs != nullptr &&
                       static_cast<const ZCPYMQT_Attrs*>(attrs)->poolId == onlyPool,
                   [] { return Link::instance().openTransport(); });
}

DSP_STATUS MSGQ_transportClose(ProcessorId procId)
{
    return guarded(procId == onlyProcessor, [] { return Link::instance().closeTransport(); });
}

DSP_STATUS MSGQ_locate(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_LocateAttrs* attrs)
{
    return guarded(isQueueName(queueName) && msgqQueue != nullptr && attrs != nullptr,
                   [=] { return Link::instance().locate(queueName, msgqQueue, attrs->timeout); });
}

DSP_STATUS MSGQ_alloc(PoolId poolId, Uint16 size, MSGQ_Msg* msg)
{
    return guarded(poolId == onlyPool && msg != nullptr && size > sizeof(MSGQ_MsgHeader),
                   [=] { return Link::instance().allocate(size, msg); });
}

DSP_STATUS MSGQ_free(MSGQ_Msg msg)
{
    return guarded(msg != nullptr, [=] { return Link::instance().free(msg); });
}

DSP_STATUS MSGQ_put(MSGQ_Queue msgqQueue, MSGQ_Msg msg)
{
    return guarded(msg != nullptr, [=] { return Link::instance().put(msgqQueue, msg); });
}

DSP_STATUS MSGQ_get(MSGQ_Queue msgqQueue, Uint32 timeout, MSGQ_Msg* msg)
{
    return guarded(msg != nullptr, [=] { return Link::instance().get(msgqQueue, timeout, msg); });
}
