// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/InstantDsp.h"

#include <msgq.h>
#include <pool.h>
#include <proc.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <condition_variable>
#include <cstring>
#include <mutex>

namespace
{

constexpr std::size_t buffers = 10;
constexpr std::size_t bufferSize = 2048;
constexpr std::size_t headerSize = sizeof(MSGQ_MsgHeader);
constexpr std::uint16_t incomingId = 100;
constexpr MSGQ_Queue hostQueue = 0x00010000;
constexpr MSGQ_Queue dspQueue = 0x00000003;
/// Type, length of the payload, the command's code as payload.
constexpr std::array<std::uint32_t, 2> acknowledgement{0x1100B, 4};

struct alignas(128) Buffer
{
    std::array<std::uint8_t, bufferSize> bytes;
};

/// A fixed store: the link itself must not allocate, or it would be counted.
struct Link
{
    std::mutex mutex;
    std::condition_variable changed;
    std::array<Buffer, buffers> memory{};
    std::array<MSGQ_Msg, buffers> idle{};
    std::size_t idleCount = 0;
    std::array<MSGQ_Msg, buffers> waiting{};
    std::size_t first = 0;
    std::size_t waitingCount = 0;

    Link()
    {
        for (Buffer& buffer : memory)
            idle[idleCount++] = reinterpret_cast<MSGQ_Msg>(buffer.bytes.data());
    }

    MSGQ_Msg take() { return idle[--idleCount]; }
    void giveBack(MSGQ_Msg message) { idle[idleCount++] = message; }
    void enqueue(MSGQ_Msg message) { waiting[(first + waitingCount++) % buffers] = message; }
    MSGQ_Msg dequeue()
    {
        const MSGQ_Msg message = waiting[first];
        first = (first + 1) % buffers;
        --waitingCount;
        return message;
    }
};

Link& link()
{
    static Link instance;
    return instance;
}

std::uint8_t* dataOf(MSGQ_Msg message)
{
    return reinterpret_cast<std::uint8_t*>(message) + headerSize;
}

} // namespace

void TestSupport::InstantDsp::deliver(const QByteArray& data, std::uint16_t id)
{
    std::unique_lock lock(link().mutex);
    link().changed.wait(lock, [] { return link().idleCount > 1; }); // one stays for the commands
    const MSGQ_Msg message = link().take();
    const auto size = std::min(static_cast<std::size_t>(data.size()), bufferSize - headerSize);
    std::memcpy(dataOf(message), data.constData(), size);
    message->size = static_cast<Uint16>(headerSize + size);
    message->msgId = id;
    link().enqueue(message);
    link().changed.notify_all();
}

DSP_STATUS PROC_setup(LINKCFG_Object* /*linkCfg*/)
{
    return DSP_SOK;
}

DSP_STATUS PROC_attach(ProcessorId /*procId*/, PROC_Attrs* /*attr*/)
{
    return DSP_SOK;
}

DSP_STATUS PROC_load(ProcessorId /*procId*/, Char8* /*imagePath*/, Uint32 /*argc*/, Char8** /*argv*/)
{
    return DSP_SOK;
}

DSP_STATUS PROC_start(ProcessorId /*procId*/)
{
    return DSP_SOK;
}

DSP_STATUS PROC_stop(ProcessorId /*procId*/)
{
    return DSP_SSTOPPED;
}

DSP_STATUS PROC_detach(ProcessorId /*procId*/)
{
    return DSP_SDETACHED;
}

DSP_STATUS POOL_open(PoolId /*poolId*/, Pvoid /*params*/)
{
    return DSP_SOK;
}

DSP_STATUS POOL_close(PoolId /*poolId*/)
{
    return DSP_SCLOSED;
}

DSP_STATUS MSGQ_open(Pstr /*queueName*/, MSGQ_Queue* msgqQueue, MSGQ_Attrs* /*attrs*/)
{
    *msgqQueue = hostQueue;
    return DSP_SOK;
}

DSP_STATUS MSGQ_close(MSGQ_Queue /*msgqQueue*/)
{
    return DSP_SOK;
}

DSP_STATUS MSGQ_setErrorHandler(MSGQ_Queue /*errorQueue*/, PoolId /*poolId*/)
{
    return DSP_SOK;
}

DSP_STATUS MSGQ_transportOpen(ProcessorId /*procId*/, Pvoid /*attrs*/)
{
    return DSP_SOK;
}

DSP_STATUS MSGQ_transportClose(ProcessorId /*procId*/)
{
    return DSP_SCLOSED;
}

DSP_STATUS MSGQ_locate(Pstr /*queueName*/, MSGQ_Queue* msgqQueue, MSGQ_LocateAttrs* /*attrs*/)
{
    *msgqQueue = dspQueue;
    return DSP_SOK;
}

DSP_STATUS MSGQ_alloc(PoolId /*poolId*/, Uint16 size, MSGQ_Msg* msg)
{
    const std::lock_guard lock(link().mutex);
    if (link().idleCount == 0)
        return DSP_EMEMORY;
    *msg = link().take();
    (*msg)->size = size;
    return DSP_SOK;
}

DSP_STATUS MSGQ_free(MSGQ_Msg msg)
{
    {
        const std::lock_guard lock(link().mutex);
        link().giveBack(msg);
    }
    link().changed.notify_all();
    return DSP_SOK;
}

DSP_STATUS MSGQ_put(MSGQ_Queue /*msgqQueue*/, MSGQ_Msg msg)
{
    {
        const std::lock_guard lock(link().mutex);
        std::memmove(dataOf(msg) + sizeof acknowledgement, dataOf(msg), sizeof(std::uint32_t));
        std::memcpy(dataOf(msg), acknowledgement.data(), sizeof acknowledgement);
        msg->msgId = incomingId;
        link().enqueue(msg);
    }
    link().changed.notify_all();
    return DSP_SOK;
}

DSP_STATUS MSGQ_get(MSGQ_Queue /*msgqQueue*/, Uint32 timeout, MSGQ_Msg* msg)
{
    std::unique_lock lock(link().mutex);
    const auto arrived = [] { return link().waitingCount > 0; };
    if (!link().changed.wait_for(lock, std::chrono::milliseconds(timeout), arrived))
        return DSP_ETIMEOUT;
    *msg = link().dequeue();
    return DSP_SOK;
}
