// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "dsplink/host/Packet.h"

#include <errbase.h>

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <thread>

namespace DspLinkHost
{

/// What a connection tells its owner. All calls come from the connection's thread or, `messageSent`, from the sender's
/// own; no lock of the connection is held.
class ConnectionListener
{
public:
    virtual ~ConnectionListener() = default;
    /// `message` begins with the message header and is no longer than `maximumMessageSize`.
    virtual void messageArrived(std::uint32_t queue, ByteView message) = 0;
    /// The socket has taken a message, or will never: its buffer is free.
    virtual void messageSent(const void* buffer) = 0;
    /// False while no further message can be kept.
    virtual bool hasRoomForMessages() = 0;
    /// The peer is gone; nothing comes after this.
    virtual void connectionLost() = 0;
};

/// One connection to whoever serves /dev/dsplink. A thread of its own takes packets off the socket, hands replies to
/// the requests that wait and messages to the listener, and sends what the socket would not take at once.
///
/// A peer that is gone shows as failure codes: no signal, no blocking, no spinning.
///
/// Threads: every operation may be called from any thread but the listener's calls.
class Connection
{
public:
    /// Null with `status` set if nobody serves the path.
    [[nodiscard]] static std::unique_ptr<Connection> open(const char* path, ConnectionListener& listener,
                                                          DSP_STATUS& status);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    [[nodiscard]] bool isAlive() const;

    /// Ends the connection as if it were lost, the listener's last call included. One thread closes; the destructor
    /// does.
    void close();

    /// Sends a request and waits for its reply; `milliseconds` may be WAIT_FOREVER. Returns the reply's status,
    /// `DSP_ETIMEOUT`, or `DSP_EFAIL` when the peer is or gets lost; for a locate also while the transport is closed.
    /// A peer that lets the time of anything but a locate pass is lost from then on.
    [[nodiscard]] DSP_STATUS request(PacketKind kind, ByteView payload, std::uint32_t milliseconds,
                                     std::uint32_t* value = nullptr);

    /// Sends the message without blocking; the listener hears when `message` is no longer needed. `DSP_EFAIL`: the
    /// transport is closed or the peer gone, and the message still the caller's.
    [[nodiscard]] DSP_STATUS send(std::uint32_t queue, ByteView message);

    /// From here on messages are sent.
    void openTransport();
    /// From here on they are not: ends every locate that waits (`DSP_EFAIL`) and drops what the socket has not taken.
    void closeTransport();

    /// There is room for messages again.
    void resumeReading();

private:
    struct Pending
    {
        PacketKind kind;
        bool done = false;
        DSP_STATUS status = DSP_EFAIL;
        std::uint32_t value = 0;
    };
    struct Outgoing
    {
        Bytes packet;
        const void* buffer = nullptr; ///< of the pool, when the packet is a message
    };

    /// Closes its descriptor at the end, also of a construction that fails.
    struct Descriptor
    {
        explicit Descriptor(int opened) : number(opened) {}
        ~Descriptor();
        Descriptor(const Descriptor&) = delete;
        Descriptor& operator=(const Descriptor&) = delete;
        operator int() const { return number; }

        const int number;
    };

    Connection(int socket, int wakeUp, ConnectionListener& listener);

    void serve();
    [[nodiscard]] short eventsToWaitFor();
    [[nodiscard]] bool receivePackets();
    void handlePacket(ByteView packet);
    void handleReply(ByteView packet);
    [[nodiscard]] bool sendQueued();
    [[nodiscard]] bool sendOrQueue(ByteView head, ByteView body, const void* buffer, bool& taken);
    [[nodiscard]] DSP_STATUS awaitReply(std::unique_lock<std::mutex>& lock, Pending& entry, std::uint32_t milliseconds);
    /// Treats the peer as lost; the mutex is held.
    void giveUp();
    void lose();
    void wake() const;

    const Descriptor socket;
    const Descriptor wakeUp;
    ConnectionListener& listener;

    mutable std::mutex mutex;
    std::condition_variable replied;
    std::map<std::uint32_t, Pending*> pending; ///< by serial; the entries live on their callers' stacks
    std::deque<Outgoing> outgoing;
    std::uint32_t lastSerial = 0;
    bool transportOpen = false;
    bool lost = false;
    bool closing = false;

    Bytes received; ///< the thread's own
    std::thread thread;
};

} // namespace DspLinkHost
