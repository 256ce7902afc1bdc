// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DspPeer.h"

#include <QtEndian>

#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>

namespace TestSupport
{

namespace
{

constexpr const char* devicePath = "/dev/dsplink";
constexpr qsizetype packetHeader = 8;
constexpr qsizetype messageHeader = 20;

template <typename Number> QByteArray bytesOf(Number number)
{
    const Number little = qToLittleEndian(number);
    return {reinterpret_cast<const char*>(&little), sizeof little};
}

template <typename Number> Number numberOf(const QByteArray& bytes, qsizetype offset)
{
    return offset + qsizetype{sizeof(Number)} <= bytes.size() ? qFromLittleEndian<Number>(bytes.constData() + offset)
                                                              : Number{0};
}

QByteArray packetOf(quint16 kind, quint32 serial, const QByteArray& rest)
{
    return bytesOf(kind) + bytesOf(quint16{0}) + bytesOf(serial) + rest;
}

} // namespace

quint16 DspPeer::HostMessage::id() const
{
    return numberOf<quint16>(header, 18);
}

quint32 DspPeer::HostMessage::word(qsizetype offset) const
{
    return numberOf<quint32>(data, offset);
}

DspPeer::DspPeer()
{
    ::unlink(devicePath);
    listener = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    qstrncpy(address.sun_path, devicePath, sizeof address.sun_path);
    if (::bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(listener, 4) != 0 || ::pipe(wakeUp) != 0)
        qFatal("No private /dev/dsplink: run the test through tests/sandbox.sh");
    thread = std::thread([this] { serve(); });
}

DspPeer::~DspPeer()
{
    stopping = true;
    wake();
    thread.join();
    dropClient();
    ::close(listener);
    ::close(wakeUp[0]);
    ::close(wakeUp[1]);
    ::unlink(devicePath);
}

void DspPeer::wake() const
{
    [[maybe_unused]] const auto written = ::write(wakeUp[1], "", 1);
}

void DspPeer::serve()
{
    while (!stopping) {
        const bool connected = isConnected();
        std::array<pollfd, 2> waits{
            pollfd{connected ? client : listener, static_cast<short>(connected && !reading ? 0 : POLLIN), 0},
            pollfd{wakeUp[0], POLLIN, 0}};
        ::poll(waits.data(), waits.size(), -1);
        if (waits[1].revents != 0) {
            char ignored = 0;
            [[maybe_unused]] const auto drained = ::read(wakeUp[0], &ignored, 1);
            if (hangUpAsked.exchange(false))
                dropClient();
            continue;
        }
        if (!connected)
            accept();
        else if (waits[0].revents != 0)
            receive();
    }
}

void DspPeer::accept()
{
    const int accepted = ::accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
    // A host that stops reading fails the test instead of holding it up.
    const timeval limit{10, 0};
    ::setsockopt(accepted, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
    const std::scoped_lock lock(mutex, sendMutex);
    client = accepted;
}

void DspPeer::dropClient()
{
    const std::scoped_lock lock(mutex, sendMutex);
    if (client >= 0)
        ::close(client);
    client = -1;
    queueOfHost = 0xFFFF;
    waitingLocates.clear();
}

void DspPeer::receive()
{
    QByteArray packet(65536, Qt::Uninitialized);
    const auto length = ::recv(client, packet.data(), static_cast<size_t>(packet.size()), MSG_DONTWAIT);
    if (length <= 0) {
        dropClient();
        return;
    }
    packet.truncate(length);
    handle(packet);
}

void DspPeer::handle(const QByteArray& packet)
{
    const auto kind = numberOf<quint16>(packet, 0);
    const QByteArray rest = packet.mid(packetHeader);
    if (kind != Message) {
        handleRequest(static_cast<Kind>(kind), numberOf<quint32>(packet, 4), rest);
        return;
    }
    const HostMessage message{numberOf<quint32>(rest, 0), rest.mid(4, messageHeader), rest.mid(4 + messageHeader)};
    MessageHandler receiver;
    {
        const std::lock_guard lock(mutex);
        seenMessages.push_back(message);
        receiver = handler;
    }
    if (receiver)
        receiver(*this, message);
}

void DspPeer::handleRequest(Kind kind, quint32 serial, const QByteArray& payload)
{
    quint32 status = done;
    RequestHandler receiver;
    {
        const std::lock_guard lock(mutex);
        receiver = requestHandler;
        seenRequests.push_back({kind, payload});
        if (kind == QueueOpen && payload.mid(4) == "GPPMSGQ1")
            queueOfHost = numberOf<quint32>(payload, 0);
        if (silent.contains(kind)) {
            if (kind == Locate)
                waitingLocates.append(serial);
            return;
        }
        if (const auto found = answers.find(kind); found != answers.end())
            status = found->second;
    }
    if (receiver)
        receiver(*this, kind);
    reply(serial, status, kind == Locate ? dspQueue : 0);
}

void DspPeer::reply(quint32 serial, quint32 status, quint32 value)
{
    sendPacket(packetOf(Reply, serial, bytesOf(status) + bytesOf(value)));
}

void DspPeer::answer(Kind kind, quint32 status)
{
    const std::lock_guard lock(mutex);
    silent.remove(kind);
    answers[kind] = status;
}

void DspPeer::keepSilentOn(Kind kind)
{
    const std::lock_guard lock(mutex);
    silent.insert(kind);
}

void DspPeer::answerLocate(quint32 status)
{
    QList<quint32> serials;
    {
        const std::lock_guard lock(mutex);
        silent.remove(Locate);
        serials.swap(waitingLocates);
    }
    for (const quint32 serial : serials)
        reply(serial, status, dspQueue);
}

void DspPeer::onMessage(MessageHandler newHandler)
{
    const std::lock_guard lock(mutex);
    handler = std::move(newHandler);
}

void DspPeer::onRequest(RequestHandler newHandler)
{
    const std::lock_guard lock(mutex);
    requestHandler = std::move(newHandler);
}

void DspPeer::acknowledgeAll()
{
    onMessage([](DspPeer& peer, const HostMessage& message) { peer.sendDsp(0x1100B, words({message.word(0)})); });
}

void DspPeer::setReading(bool reads)
{
    reading = reads;
    wake();
}

void DspPeer::hangUp()
{
    hangUpAsked = true;
    wake();
}

QList<DspPeer::Request> DspPeer::requests() const
{
    const std::lock_guard lock(mutex);
    return {seenRequests.begin(), seenRequests.end()};
}

QList<DspPeer::Kind> DspPeer::requestKinds() const
{
    QList<Kind> kinds;
    for (const auto& request : requests())
        kinds.append(request.kind);
    return kinds;
}

QList<DspPeer::HostMessage> DspPeer::messages() const
{
    const std::lock_guard lock(mutex);
    return {seenMessages.begin(), seenMessages.end()};
}

bool DspPeer::isConnected() const
{
    const std::lock_guard lock(mutex);
    return client >= 0;
}

quint32 DspPeer::hostQueue() const
{
    const std::lock_guard lock(mutex);
    return queueOfHost;
}

bool DspPeer::sendPacket(const QByteArray& packet)
{
    const std::lock_guard lock(sendMutex);
    return client >= 0 &&
           ::send(client, packet.constData(), static_cast<size_t>(packet.size()), MSG_NOSIGNAL) == packet.size();
}

bool DspPeer::sendMessage(const QByteArray& data, quint16 id, std::optional<quint16> size)
{
    return sendMessageTo(hostQueue(), data, id, size);
}

bool DspPeer::sendMessageTo(quint32 queue, const QByteArray& data, quint16 id, std::optional<quint16> size)
{
    const auto length = static_cast<quint16>(messageHeader + data.size());
    const QByteArray header = QByteArray(8, '\0') + bytesOf(quint16{0}) + bytesOf(quint16{0}) +
                              bytesOf(size.value_or(length)) + bytesOf(static_cast<quint16>(queue)) +
                              bytesOf(quint16{0xFFFF}) + bytesOf(id);
    return sendPacket(packetOf(Message, 0, bytesOf(queue) + header + data));
}

bool DspPeer::sendDsp(quint32 type, const QByteArray& payload, qsizetype padTo)
{
    return sendMessage(dspMessage(type, payload).leftJustified(padTo, '\0'));
}

QByteArray DspPeer::words(std::initializer_list<quint32> values)
{
    QByteArray bytes;
    for (const quint32 value : values)
        bytes += bytesOf(value);
    return bytes;
}

QByteArray DspPeer::dspMessage(quint32 type, const QByteArray& payload)
{
    return bytesOf(type) + bytesOf(static_cast<quint32>(payload.size())) + payload;
}

} // namespace TestSupport
