// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/InstantDsp.h"

#include <msgq.h>
#include <pool.h>
#include <proc.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
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
    // Never destroyed: a port that is static itself reads from it until the very end of the program.
    static Link& instance = *new Link;
    return instance;
}

std::uint8_t* dataOf(MSGQ_Msg message)
{
    return reinterpret_cast<std::uint8_t*>(message) + headerSize;
}

constexpr std::size_t longestCall = 120;
constexpr std::size_t callsKept = 32;

/// The calls that open and close the link; of fixed size, too.
struct Record
{
    std::array<std::array<char, longestCall>, callsKept> calls{};
    std::size_t count = 0;
    // The port's own thread asks for messages.
    std::atomic<std::size_t> fetches = 0;
    std::atomic<Uint32> fetchTimeout = 0;
    std::atomic<const char*> refused = "";
    const char* eventful = "";
    void (*happens)() = nullptr;
};

Record record;

bool isRefused(const char* call)
{
    return std::strcmp(call, record.refused) == 0;
}

const char* presence(const void* pointer)
{
    return pointer == nullptr ? "null" : "something";
}

/// Keeps the call; its result unless it is to be refused.
template <typename... Arguments>
DSP_STATUS called(DSP_STATUS result, const char* name, const char* format, Arguments... arguments)
{
    if (record.count < callsKept) {
        char* const text = record.calls[record.count++].data();
        const auto length = static_cast<std::size_t>(std::snprintf(text, longestCall, "%s(", name));
        const auto rest =
            static_cast<std::size_t>(std::snprintf(text + length, longestCall - length, format, arguments...));
        std::snprintf(text + length + rest, longestCall - length - rest, ")");
    }
    if (record.happens != nullptr && std::strcmp(name, record.eventful) == 0)
        record.happens();
    return isRefused(name) ? static_cast<DSP_STATUS>(TestSupport::InstantDsp::refusal) : result;
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

QStringList TestSupport::InstantDsp::takeCalls()
{
    QStringList all;
    for (std::size_t index = 0; index < record.count; ++index)
        all.append(QString::fromLatin1(record.calls[index].data()));
    record.count = 0;
    return all;
}

std::uint32_t TestSupport::InstantDsp::fetchTimeout()
{
    return record.fetchTimeout;
}

std::size_t TestSupport::InstantDsp::fetches()
{
    return record.fetches;
}

void TestSupport::InstantDsp::during(const char* call, void (*happens)())
{
    record.eventful = call;
    record.happens = happens;
}

void TestSupport::InstantDsp::refuse(const char* call)
{
    record.refused = call;
}

DSP_STATUS PROC_setup(LINKCFG_Object* linkCfg)
{
    return called(DSP_SOK, "PROC_setup", "%s", presence(linkCfg));
}

DSP_STATUS PROC_attach(ProcessorId procId, PROC_Attrs* attr)
{
    return called(DSP_SOK, "PROC_attach", "%u, %s", procId, presence(attr));
}

DSP_STATUS PROC_load(ProcessorId procId, Char8* imagePath, Uint32 argc, Char8** argv)
{
    return called(DSP_SOK, "PROC_load", "%u, %s, %u, %s", procId, imagePath, argc, presence(argv));
}

DSP_STATUS PROC_start(ProcessorId procId)
{
    return called(DSP_SOK, "PROC_start", "%u", procId);
}

DSP_STATUS PROC_stop(ProcessorId procId)
{
    return called(DSP_SSTOPPED, "PROC_stop", "%u", procId);
}

DSP_STATUS PROC_detach(ProcessorId procId)
{
    return called(DSP_SDETACHED, "PROC_detach", "%u", procId);
}

DSP_STATUS POOL_open(PoolId poolId, Pvoid params)
{
    const auto* const pool = static_cast<const SMAPOOL_Attrs*>(params);
    std::array<char, longestCall> sizes{};
    std::size_t length = 0;
    for (Uint32 entry = 0; entry < pool->numBufPools && length < sizes.size(); ++entry)
        length += static_cast<std::size_t>(std::snprintf(sizes.data() + length, sizes.size() - length, " %u x %u,",
                                                         pool->numBuffers[entry], pool->bufSizes[entry]));
    return called(DSP_SOK, "POOL_open", "%u, %u:%s %s", poolId, pool->numBufPools, sizes.data(),
                  pool->exactMatchReq == TRUE ? "exact" : "any");
}

DSP_STATUS POOL_close(PoolId poolId)
{
    return called(DSP_SCLOSED, "POOL_close", "%u", poolId);
}

DSP_STATUS MSGQ_open(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_Attrs* attrs)
{
    const DSP_STATUS status = called(DSP_SOK, "MSGQ_open", "%s, %s", queueName, presence(attrs));
    if (DSP_SUCCEEDED(status))
        *msgqQueue = hostQueue;
    return status;
}

DSP_STATUS MSGQ_close(MSGQ_Queue msgqQueue)
{
    return called(DSP_SOK, "MSGQ_close", "%x", msgqQueue);
}

DSP_STATUS MSGQ_setErrorHandler(MSGQ_Queue errorQueue, PoolId poolId)
{
    return called(DSP_SOK, "MSGQ_setErrorHandler", "%x, %u", errorQueue, poolId);
}

DSP_STATUS MSGQ_transportOpen(ProcessorId procId, Pvoid attrs)
{
    return called(DSP_SOK, "MSGQ_transportOpen", "%u, %u", procId, static_cast<const ZCPYMQT_Attrs*>(attrs)->poolId);
}

DSP_STATUS MSGQ_transportClose(ProcessorId procId)
{
    return called(DSP_SCLOSED, "MSGQ_transportClose", "%u", procId);
}

DSP_STATUS MSGQ_locate(Pstr queueName, MSGQ_Queue* msgqQueue, MSGQ_LocateAttrs* attrs)
{
    const DSP_STATUS status = called(DSP_SOK, "MSGQ_locate", "%s, %x", queueName, attrs->timeout);
    if (DSP_SUCCEEDED(status))
        *msgqQueue = dspQueue;
    return status;
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
    record.fetchTimeout = timeout;
    ++record.fetches;
    if (isRefused("MSGQ_get"))
        return static_cast<DSP_STATUS>(TestSupport::InstantDsp::refusal);
    std::unique_lock lock(link().mutex);
    const auto arrived = [] { return link().waitingCount > 0; };
    if (!link().changed.wait_for(lock, std::chrono::milliseconds(timeout), arrived))
        return DSP_ETIMEOUT;
    *msg = link().dequeue();
    return DSP_SOK;
}
