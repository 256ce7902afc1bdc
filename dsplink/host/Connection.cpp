// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/Connection.h"

#include <constants.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <utility>

namespace DspLinkHost
{

namespace
{

constexpr int connectAttempts = 50;
constexpr std::chrono::milliseconds connectPause{10};

bool connectTo(int socket, const char* path)
{
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const std::size_t length = std::strlen(path);
    if (length >= sizeof address.sun_path)
        return false;
    std::memcpy(address.sun_path, path, length);
    // A server that is just coming up may have its backlog full; one that never accepts must not hold us up.
    for (int attempt = 0; attempt < connectAttempts; ++attempt) {
        if (::connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0)
            return true;
        if (errno != EAGAIN && errno != EINTR)
            return false;
        std::this_thread::sleep_for(connectPause);
    }
    return false;
}

bool hungUp(int socket)
{
    pollfd state{socket, POLLRDHUP, 0};
    return ::poll(&state, 1, 0) > 0 && (state.revents & (POLLHUP | POLLRDHUP | POLLERR)) != 0;
}

/// Greater than 0: sent; 0: the socket is full; less: the peer is gone.
int sendPacket(int socket, ByteView head, ByteView body)
{
    std::array<iovec, 2> parts{iovec{const_cast<std::uint8_t*>(head.data()), head.size()},
                               iovec{const_cast<std::uint8_t*>(body.data()), body.size()}};
    msghdr message{};
    message.msg_iov = parts.data();
    message.msg_iovlen = parts.size();
    ssize_t sent = 0;
    do
        sent = ::sendmsg(socket, &message, MSG_NOSIGNAL | MSG_DONTWAIT);
    while (sent < 0 && errno == EINTR);
    if (sent >= 0)
        return 1;
    return errno == EAGAIN ? 0 : -1;
}

} // namespace

std::unique_ptr<Connection> Connection::open(const char* path, ConnectionListener& listener, DSP_STATUS& status)
{
    const int socket = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (socket < 0 || !connectTo(socket, path)) {
        status = errno == EACCES ? DSP_EACCESSDENIED : DSP_EFAIL;
        if (socket >= 0)
            ::close(socket);
        return nullptr;
    }
    const int wakeUp = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (wakeUp < 0) {
        ::close(socket);
        status = DSP_EMEMORY;
        return nullptr;
    }
    status = DSP_SOK;
    return std::unique_ptr<Connection>(new Connection(socket, wakeUp, listener));
}

Connection::Connection(int connectedSocket, int wakeUpEvent, ConnectionListener& connectionListener)
    : socket(connectedSocket), wakeUp(wakeUpEvent), listener(connectionListener), received(maximumPacketSize)
{
    thread = std::thread([this] { serve(); });
}

Connection::~Connection()
{
    close();
}

Connection::Descriptor::~Descriptor()
{
    ::close(number);
}

void Connection::close()
{
    if (!thread.joinable())
        return;
    {
        const std::lock_guard lock(mutex);
        closing = true;
    }
    wake();
    thread.join();
}

bool Connection::isAlive() const
{
    const std::lock_guard lock(mutex);
    if (lost)
        return false;
    return !hungUp(socket);
}

DSP_STATUS Connection::request(PacketKind kind, ByteView payload, std::uint32_t milliseconds, std::uint32_t* value)
{
    std::unique_lock lock(mutex);
    Pending entry{.kind = kind};
    const std::uint32_t serial = ++lastSerial;
    std::array<std::uint8_t, packetHeaderSize> head{};
    storePacketHeader(head.data(), kind, serial);
    bool taken = false;
    // A locate may wait without limit: the end of the transport, which would end it, must not have gone by.
    if (lost || (kind == PacketKind::Locate && !transportOpen) || !sendOrQueue(head, payload, nullptr, taken))
        return DSP_EFAIL;
    pending.emplace(serial, &entry);
    // The thread may have stopped reading for want of room; a reply has to get through.
    wake();
    const DSP_STATUS status = awaitReply(lock, entry, milliseconds);
    pending.erase(serial);
    // Firmware may be long in making its queue. Any other reply is the driver's own: whoever owes one is dead, although
    // the connection stands, and nobody shall wait for it again.
    if (!entry.done && kind != PacketKind::Locate)
        giveUp();
    if (value != nullptr)
        *value = entry.value;
    return status;
}

DSP_STATUS Connection::awaitReply(std::unique_lock<std::mutex>& lock, Pending& entry, std::uint32_t milliseconds)
{
    const auto answered = [&entry] { return entry.done; };
    if (milliseconds == WAIT_FOREVER)
        replied.wait(lock, answered);
    else if (!replied.wait_for(lock, std::chrono::milliseconds(milliseconds), answered))
        return DSP_ETIMEOUT;
    return entry.status;
}

void Connection::giveUp()
{
    lost = true;
    closing = true;
    wake();
}

DSP_STATUS Connection::send(std::uint32_t queue, ByteView message)
{
    std::array<std::uint8_t, messagePrefixSize> head{};
    storePacketHeader(head.data(), PacketKind::Message, 0);
    store32(head.data() + packetHeaderSize, queue);
    bool taken = false;
    {
        const std::lock_guard lock(mutex);
        if (lost || !transportOpen || !sendOrQueue(head, message, message.data(), taken))
            return DSP_EFAIL;
    }
    if (taken)
        listener.messageSent(message.data());
    return DSP_SOK;
}

bool Connection::sendOrQueue(ByteView head, ByteView body, const void* buffer, bool& taken)
{
    // Nothing overtakes what waits already.
    const int result = outgoing.empty() ? sendPacket(socket, head, body) : 0;
    if (result < 0)
        return false;
    taken = result > 0;
    if (taken)
        return true;
    Outgoing entry{Bytes(head.begin(), head.end()), buffer};
    entry.packet.insert(entry.packet.end(), body.begin(), body.end());
    outgoing.push_back(std::move(entry));
    wake();
    return true;
}

void Connection::openTransport()
{
    const std::lock_guard lock(mutex);
    transportOpen = true;
}

void Connection::closeTransport()
{
    std::deque<Outgoing> dropped;
    {
        const std::lock_guard lock(mutex);
        transportOpen = false;
        for (const auto& [serial, entry] : pending)
            entry->done = entry->done || entry->kind == PacketKind::Locate;
        const auto messages = std::stable_partition(outgoing.begin(), outgoing.end(),
                                                    [](const Outgoing& entry) { return entry.buffer == nullptr; });
        std::move(messages, outgoing.end(), std::back_inserter(dropped));
        outgoing.erase(messages, outgoing.end());
    }
    replied.notify_all();
    for (const auto& entry : dropped)
        listener.messageSent(entry.buffer);
}

void Connection::resumeReading()
{
    wake();
}

void Connection::wake() const
{
    const std::uint64_t one = 1;
    [[maybe_unused]] const auto written = ::write(wakeUp, &one, sizeof one);
}

void Connection::serve()
{
    std::array<pollfd, 2> waits{pollfd{socket, 0, 0}, pollfd{wakeUp, POLLIN, 0}};
    bool connected = true;
    while (connected) {
        waits[0].events = eventsToWaitFor();
        if (::poll(waits.data(), waits.size(), -1) < 0 && errno != EINTR)
            break;
        if ((waits[1].revents & POLLIN) != 0) {
            std::uint64_t count = 0;
            [[maybe_unused]] const auto drained = ::read(wakeUp, &count, sizeof count);
        }
        {
            const std::lock_guard lock(mutex);
            if (closing)
                break;
        }
        if ((waits[0].revents & POLLOUT) != 0)
            connected = sendQueued();
        // A peer that hung up is read to its end whatever room there is: that end is never worse than a socket's
        // buffer away, and poll() would not wait any more.
        if (connected && (waits[0].revents & (POLLIN | POLLHUP | POLLERR)) != 0)
            connected = receivePackets();
    }
    lose();
}

short Connection::eventsToWaitFor()
{
    const bool room = listener.hasRoomForMessages();
    const std::lock_guard lock(mutex);
    const int input = room || !pending.empty() ? POLLIN : 0;
    const int output = outgoing.empty() ? 0 : POLLOUT;
    return static_cast<short>(input | output);
}

bool Connection::receivePackets()
{
    // One packet a call: the caller looks at room, stop and output in between.
    const ssize_t length = ::recv(socket, received.data(), received.size(), MSG_DONTWAIT | MSG_TRUNC);
    // A peer that goes with something unread is told of first; what it said before is still there.
    if (length < 0)
        return errno == EAGAIN || errno == EINTR || errno == ECONNRESET;
    if (length == 0) // the end, or a packet of no bytes
        return !hungUp(socket);
    if (static_cast<std::size_t>(length) <= received.size())
        handlePacket(ByteView(received).first(static_cast<std::size_t>(length)));
    return true;
}

void Connection::handlePacket(ByteView packet)
{
    if (packet.size() < packetHeaderSize)
        return;
    const std::uint16_t kind = load16(packet.data());
    if (kind == static_cast<std::uint16_t>(PacketKind::Reply) && packet.size() >= replySize)
        handleReply(packet);
    if (kind == static_cast<std::uint16_t>(PacketKind::Message) && packet.size() >= messagePrefixSize)
        listener.messageArrived(load32(packet.data() + packetHeaderSize), packet.subspan(messagePrefixSize));
}

void Connection::handleReply(ByteView packet)
{
    const std::lock_guard lock(mutex);
    const auto found = pending.find(load32(packet.data() + 4));
    if (found == pending.end() || found->second->done)
        return;
    found->second->status = static_cast<DSP_STATUS>(load32(packet.data() + packetHeaderSize));
    found->second->value = load32(packet.data() + packetHeaderSize + 4);
    found->second->done = true;
    replied.notify_all();
}

bool Connection::sendQueued()
{
    while (true) {
        const void* buffer = nullptr;
        {
            const std::lock_guard lock(mutex);
            if (outgoing.empty())
                return true;
            const int result = sendPacket(socket, outgoing.front().packet, {});
            if (result <= 0)
                return result == 0;
            buffer = outgoing.front().buffer;
            outgoing.pop_front();
        }
        if (buffer != nullptr)
            listener.messageSent(buffer);
    }
}

void Connection::lose()
{
    std::deque<Outgoing> dropped;
    {
        const std::lock_guard lock(mutex);
        lost = true;
        ::shutdown(socket, SHUT_RDWR);
        for (const auto& [serial, entry] : pending)
            entry->done = true;
        dropped.swap(outgoing);
    }
    replied.notify_all();
    for (const auto& entry : dropped) {
        if (entry.buffer != nullptr)
            listener.messageSent(entry.buffer);
    }
    listener.connectionLost();
}

} // namespace DspLinkHost
