// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/Link.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <new>
#include <utility>

namespace DspLinkHost
{

namespace
{

constexpr const char* devicePath = "/dev/dsplink";
constexpr std::uint16_t armProcessorId = 1;
constexpr std::size_t maximumQueues = 16;
constexpr std::size_t maximumWaitingMessages = 1024;
constexpr std::uint32_t replyTimeout = 5000;
/// At the end nobody has five seconds left: the whole program is to be down within three.
constexpr std::uint32_t closingReplyTimeout = 300;

bool isReadableFile(const char* path)
{
    struct stat status
    {
    };
    return ::stat(path, &status) == 0 && S_ISREG(status.st_mode) && ::access(path, R_OK) == 0;
}

MSGQ_Queue queueHandle(std::uint16_t number)
{
    return (static_cast<MSGQ_Queue>(armProcessorId) << 16U) | number;
}

} // namespace

Link& Link::instance()
{
    static Link link;
    return link;
}

Link::~Link()
{
    // A process ends with its connection standing. The connection's thread must be gone before what it calls upon.
    if (connection)
        connection->close();
}

DSP_STATUS Link::setup()
{
    const std::lock_guard operation(operationMutex);
    const auto present = currentConnection();
    if (present && present->isAlive())
        return DSP_SALREADYSETUP;
    // Its thread reports the loss, at the latest now, before the new connection can be taken for the lost one.
    if (present)
        present->close();
    return connect();
}

DSP_STATUS Link::connect()
{
    DSP_STATUS status = DSP_EFAIL;
    std::shared_ptr<Connection> fresh = Connection::open(devicePath, *this, status);
    const std::lock_guard lock(mutex);
    connection = std::move(fresh);
    if (connection)
        stage = Stage::SetUp;
    return status;
}

std::shared_ptr<Connection> Link::currentConnection() const
{
    const std::lock_guard lock(mutex);
    return connection;
}

Link::Stage Link::currentStage() const
{
    const std::lock_guard lock(mutex);
    return stage;
}

void Link::setAcceptsMessages(bool accepts)
{
    const std::lock_guard lock(mutex);
    acceptsMessages = accepts;
}

DSP_STATUS Link::ask(PacketKind kind, ByteView payload, Uint32 milliseconds, std::uint32_t* value)
{
    const auto peer = currentConnection();
    return peer ? peer->request(kind, payload, milliseconds, value) : DSP_EFAIL;
}

DSP_STATUS Link::advance(PacketKind kind, ByteView payload, Stage reached, DSP_STATUS success)
{
    const bool closes = kind == PacketKind::Stop || kind == PacketKind::Detach;
    const DSP_STATUS status = ask(kind, payload, closes ? closingReplyTimeout : replyTimeout);
    if (DSP_FAILED(status))
        return status;
    {
        const std::lock_guard lock(mutex);
        if (stage == Stage::Idle) // lost in the meantime
            return DSP_EFAIL;
        stage = reached;
    }
    changed.notify_all();
    return success;
}

DSP_STATUS Link::attach()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now == Stage::Idle)
        return DSP_EWRONGSTATE;
    if (now >= Stage::Attached)
        return DSP_SALREADYATTACHED;
    return advance(PacketKind::Attach, numberPayload(protocolVersion), Stage::Attached, DSP_SOK);
}

DSP_STATUS Link::load(const char* imagePath)
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return now == Stage::Idle ? DSP_ESETUP : DSP_EATTACHED;
    if (now >= Stage::Loaded)
        return now == Stage::Loaded ? DSP_SALREADYLOADED : DSP_EWRONGSTATE;
    if (!isReadableFile(imagePath))
        return DSP_EFILE;
    return advance(PacketKind::Load, textPayload(imagePath), Stage::Loaded, DSP_SOK);
}

DSP_STATUS Link::start()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return now == Stage::Idle ? DSP_ESETUP : DSP_EATTACHED;
    if (now >= Stage::Started)
        return DSP_SALREADYSTARTED;
    {
        const std::lock_guard lock(mutex);
        if (!pool)
            return DSP_ECONFIG;
    }
    if (now != Stage::Loaded)
        return DSP_EWRONGSTATE;
    // The firmware's first message may be quicker than the reply, and than the transport on this side.
    setAcceptsMessages(true);
    return advance(PacketKind::Start, {}, Stage::Started, DSP_SOK);
}

DSP_STATUS Link::stop()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return now == Stage::Idle ? DSP_ESETUP : DSP_EATTACHED;
    if (now < Stage::Started)
        return DSP_ESTARTED;
    if (now > Stage::Started)
        return DSP_EWRONGSTATE;
    return advance(PacketKind::Stop, {}, Stage::Attached, DSP_SSTOPPED);
}

DSP_STATUS Link::detach()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return now == Stage::Idle ? DSP_ESETUP : DSP_EATTACHED;
    if (now >= Stage::Started)
        return DSP_EWRONGSTATE;
    return advance(PacketKind::Detach, {}, Stage::SetUp, DSP_SDETACHED);
}

DSP_STATUS Link::openPool(const SMAPOOL_Attrs* attributes)
{
    const std::lock_guard operation(operationMutex);
    if (currentStage() < Stage::Attached)
        return DSP_EACCESSDENIED;
    const DSP_STATUS status = BufferPool::check(attributes);
    const std::lock_guard lock(mutex);
    if (pool)
        return DSP_SALREADYOPENED;
    if (DSP_SUCCEEDED(status))
        pool.emplace(*attributes);
    return status;
}

DSP_STATUS Link::closePool()
{
    const std::lock_guard operation(operationMutex);
    const std::lock_guard lock(mutex);
    if (!pool)
        return DSP_EACCESSDENIED;
    if (!pool->allFree())
        return DSP_EFAIL;
    pool.reset();
    return DSP_SCLOSED;
}

std::uint16_t Link::freeQueueNumber() const
{
    std::uint16_t number = 0;
    while (queues.contains(number))
        ++number;
    return number;
}

DSP_STATUS Link::openQueue(const char* name, MSGQ_Queue* queue)
{
    const std::lock_guard operation(operationMutex);
    std::uint16_t number = 0;
    {
        const std::lock_guard lock(mutex);
        const bool taken =
            std::any_of(queues.begin(), queues.end(), [&](const auto& entry) { return entry.second.name == name; });
        if (stage < Stage::Attached || taken)
            return DSP_EFAIL;
        if (queues.size() >= maximumQueues)
            return DSP_ENOTFOUND;
        number = freeQueueNumber();
        // Known before the DSP hears of it, whose first message may be quicker than its reply.
        queues[number].name = name;
    }
    const DSP_STATUS status = ask(PacketKind::QueueOpen, queueOpenPayload(queueHandle(number), name), replyTimeout);
    if (DSP_SUCCEEDED(status)) {
        *queue = queueHandle(number);
        return DSP_SOK;
    }
    {
        const std::lock_guard lock(mutex);
        dropMessages(queues[number]);
        queues.erase(number);
        giveBuffers();
    }
    changed.notify_all();
    return status;
}

DSP_STATUS Link::closeQueue(MSGQ_Queue queue)
{
    const std::lock_guard operation(operationMutex);
    bool attached = false;
    {
        const std::lock_guard lock(mutex);
        LocalQueue* const closing = localQueue(queue);
        if (closing == nullptr)
            return DSP_EINVALIDARG;
        dropMessages(*closing);
        queues.erase(static_cast<std::uint16_t>(queue & 0xFFFFU));
        giveBuffers();
        attached = stage >= Stage::Attached;
    }
    changed.notify_all();
    // The queue is gone here whatever the DSP's side says to it.
    return attached ? ask(PacketKind::QueueClose, numberPayload(queue), closingReplyTimeout) : DSP_SOK;
}

DSP_STATUS Link::checkErrorHandler(MSGQ_Queue queue)
{
    const std::lock_guard lock(mutex);
    if (stage < Stage::Attached)
        return DSP_EFAIL;
    return queue == MSGQ_INVALIDMSGQ || localQueue(queue) != nullptr ? DSP_SOK : DSP_EINVALIDARG;
}

DSP_STATUS Link::openTransport()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return DSP_EATTACHED;
    if (now == Stage::TransportOpen)
        return DSP_SALREADYOPENED;
    if (now < Stage::Started)
        return DSP_EACCESSDENIED;
    setAcceptsMessages(true);
    if (const auto peer = currentConnection())
        peer->openTransport();
    return advance(PacketKind::TransportOpen, {}, Stage::TransportOpen, DSP_SOK);
}

DSP_STATUS Link::closeTransport()
{
    const std::lock_guard operation(operationMutex);
    const Stage now = currentStage();
    if (now < Stage::Attached)
        return DSP_EATTACHED;
    if (now != Stage::TransportOpen)
        return DSP_EOPENED;
    {
        const std::lock_guard lock(mutex);
        stage = Stage::Started;
        acceptsMessages = false;
        for (auto& [number, queue] : queues)
            dropMessages(queue);
    }
    changed.notify_all();
    if (const auto peer = currentConnection())
        peer->closeTransport();
    const DSP_STATUS status = ask(PacketKind::TransportClose, {}, closingReplyTimeout);
    return DSP_FAILED(status) ? status : DSP_SCLOSED;
}

DSP_STATUS Link::locate(const char* name, MSGQ_Queue* queue, Uint32 milliseconds)
{
    // Without a running DSP nobody would ever answer.
    if (currentStage() != Stage::TransportOpen)
        return DSP_EFAIL;
    std::uint32_t handle = MSGQ_INVALIDMSGQ;
    const DSP_STATUS status = ask(PacketKind::Locate, textPayload(name), milliseconds, &handle);
    if (status == DSP_ETIMEOUT && milliseconds == WAIT_NONE)
        return DSP_ENOTCOMPLETE;
    if (DSP_SUCCEEDED(status))
        *queue = handle;
    return status;
}

DSP_STATUS Link::allocate(Uint16 size, MSGQ_Msg* message)
{
    *message = nullptr;
    const std::lock_guard lock(mutex);
    if (!pool)
        return DSP_EFAIL;
    std::uint8_t* buffer = nullptr;
    const DSP_STATUS status = pool->allocate(size, &buffer);
    if (DSP_FAILED(status))
        return status;
    *message = new (buffer) MSGQ_MsgHeader{.reserved = {0, 0},
                                           .srcProcId = armProcessorId,
                                           .poolId = 0,
                                           .size = size,
                                           .dstId = MSGQ_INVALIDMSGQ,
                                           .srcId = MSGQ_INVALIDMSGQ,
                                           .msgId = MSGQ_INVALIDMSGQ};
    return DSP_SOK;
}

DSP_STATUS Link::free(MSGQ_Msg message)
{
    {
        const std::lock_guard lock(mutex);
        if (!pool || !pool->free(message))
            return DSP_EINVALIDARG;
        giveBuffers();
    }
    changed.notify_all();
    return DSP_SOK;
}

DSP_STATUS Link::put(MSGQ_Queue queue, MSGQ_Msg message)
{
    std::shared_ptr<Connection> peer;
    {
        const std::lock_guard lock(mutex);
        if (!pool || !pool->isAllocated(message) || queue == MSGQ_INVALIDMSGQ)
            return DSP_EINVALIDARG;
        if (stage != Stage::TransportOpen)
            return DSP_EFAIL;
        message->dstId = static_cast<Uint16>(queue & 0xFFFFU);
        peer = connection;
    }
    return peer->send(queue, ByteView(reinterpret_cast<const std::uint8_t*>(message), message->size));
}

DSP_STATUS Link::get(MSGQ_Queue queue, Uint32 milliseconds, MSGQ_Msg* message)
{
    *message = nullptr;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
    std::unique_lock lock(mutex);
    bool expired = milliseconds == WAIT_NONE;
    while (true) {
        const DSP_STATUS status = tryGet(queue, message);
        // What time can mend: no message yet, or none that has found a buffer.
        if (status != DSP_ENOTCOMPLETE && status != DSP_EMEMORY)
            return status;
        if (expired)
            return status == DSP_ENOTCOMPLETE && milliseconds != WAIT_NONE ? DSP_ETIMEOUT : status;
        if (milliseconds == WAIT_FOREVER)
            changed.wait(lock);
        else
            expired = changed.wait_until(lock, deadline) == std::cv_status::timeout;
    }
}

DSP_STATUS Link::tryGet(MSGQ_Queue queue, MSGQ_Msg* message)
{
    LocalQueue* const from = localQueue(queue);
    if (from == nullptr)
        return DSP_EINVALIDARG;
    // What had arrived is delivered even when the peer is gone.
    if (!from->messages.empty()) {
        *message = takeMessage(*from);
        return DSP_SOK;
    }
    if (!from->withoutBuffer.empty())
        return DSP_EMEMORY;
    return stage == Stage::TransportOpen ? DSP_ENOTCOMPLETE : DSP_EFAIL;
}

MSGQ_Msg Link::takeMessage(LocalQueue& from)
{
    const MSGQ_Msg message = from.messages.front();
    from.messages.pop_front();
    // What a lost peer has left behind is fetched without a connection.
    if (waitingMessages-- == maximumWaitingMessages && connection)
        connection->resumeReading();
    return message;
}

void Link::giveBuffers()
{
    for (auto& [number, queue] : queues)
        giveBuffers(queue);
}

void Link::giveBuffers(LocalQueue& queue)
{
    while (!queue.withoutBuffer.empty()) {
        const Bytes& first = queue.withoutBuffer.front();
        std::uint8_t* const buffer = pool->allocateAtLeast(first.size());
        if (buffer == nullptr)
            return;
        std::memcpy(buffer, first.data(), first.size());
        const auto message = reinterpret_cast<MSGQ_Msg>(buffer);
        message->size = static_cast<Uint16>(first.size());
        queue.messages.push_back(message);
        queue.withoutBuffer.pop_front();
    }
}

void Link::dropMessages(LocalQueue& queue)
{
    waitingMessages -= queue.messages.size() + queue.withoutBuffer.size();
    for (const MSGQ_Msg message : queue.messages) {
        [[maybe_unused]] const bool freed = pool->free(message);
    }
    queue.messages.clear();
    queue.withoutBuffer.clear();
}

Link::LocalQueue* Link::localQueue(MSGQ_Queue queue)
{
    const auto found = queues.find(static_cast<std::uint16_t>(queue & 0xFFFFU));
    return queue >> 16U == armProcessorId && found != queues.end() ? &found->second : nullptr;
}

void Link::messageArrived(std::uint32_t queue, ByteView message)
{
    {
        const std::lock_guard lock(mutex);
        LocalQueue* const to = localQueue(queue);
        const bool wanted = to != nullptr && acceptsMessages && pool && pool->hasSizeFor(message.size());
        if (!wanted || message.size() < sizeof(MSGQ_MsgHeader) || waitingMessages >= maximumWaitingMessages)
            return;
        to->withoutBuffer.emplace_back(message.begin(), message.end());
        ++waitingMessages;
        giveBuffers(*to);
    }
    changed.notify_all();
}

void Link::messageSent(const void* buffer)
{
    {
        const std::lock_guard lock(mutex);
        if (pool && pool->free(buffer))
            giveBuffers();
    }
    changed.notify_all();
}

bool Link::hasRoomForMessages()
{
    const std::lock_guard lock(mutex);
    return waitingMessages < maximumWaitingMessages;
}

void Link::connectionLost()
{
    {
        const std::lock_guard lock(mutex);
        stage = Stage::Idle;
        acceptsMessages = false;
    }
    changed.notify_all();
}

} // namespace DspLinkHost
