// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QList>
#include <QSet>
#include <QString>

#include <atomic>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace TestSupport
{

/// The DSP's side of /dev/dsplink for tests: a real SOCK_SEQPACKET server with a codec of its own, written from
/// docs/dsplink-host-protocol.md. It grants every request unless told otherwise. Needs the private /dev of
/// tests/sandbox.sh.
///
/// Threads: a thread of its own serves one connection at a time and calls the message handler; everything else may be
/// called from any thread.
class DspPeer
{
public:
    enum Kind : quint16
    {
        Attach = 1,
        QueueOpen = 2,
        Load = 3,
        Start = 4,
        TransportOpen = 5,
        Locate = 6,
        TransportClose = 7,
        Stop = 8,
        QueueClose = 9,
        Detach = 10,
        Reply = 128,
        Message = 256,
    };

    struct Request
    {
        Kind kind;
        QByteArray payload;
    };
    struct HostMessage
    {
        quint32 destination = 0;
        QByteArray header; ///< 20 bytes
        QByteArray data;   ///< all that follows it
        [[nodiscard]] quint16 id() const;
        [[nodiscard]] quint32 word(qsizetype offset) const; ///< little-endian, of the data
    };
    using MessageHandler = std::function<void(DspPeer&, const HostMessage&)>;
    using RequestHandler = std::function<void(DspPeer&, Kind)>;

    static constexpr quint32 dspQueue = 0x00000003;
    static constexpr quint32 done = 0x8000;

    DspPeer();
    ~DspPeer();
    DspPeer(const DspPeer&) = delete;
    DspPeer& operator=(const DspPeer&) = delete;

    // What it answers.
    void answer(Kind kind, quint32 status);
    void keepSilentOn(Kind kind);
    /// Answers, as the firmware does that has made its queue only now, every locate that was kept waiting.
    void answerLocate(quint32 status = done);
    void onMessage(MessageHandler handler);
    /// Called before the request is answered.
    void onRequest(RequestHandler handler);
    /// Acknowledges every command from now on.
    void acknowledgeAll();
    /// Takes nothing off the socket any more, until told to.
    void setReading(bool reads);

    // What it has seen.
    [[nodiscard]] QList<Request> requests() const;
    [[nodiscard]] QList<Kind> requestKinds() const;
    [[nodiscard]] QList<HostMessage> messages() const;
    [[nodiscard]] bool isConnected() const;
    [[nodiscard]] quint32 hostQueue() const;

    // What it says. False if nobody is connected or the host has gone.
    bool sendPacket(const QByteArray& packet);
    /// A message whose data is `data`; `size` is the size field, or what is really sent when not given.
    bool sendMessage(const QByteArray& data, quint16 id = 100, std::optional<quint16> size = {});
    bool sendMessageTo(quint32 queue, const QByteArray& data, quint16 id = 100, std::optional<quint16> size = {});
    /// Type and length words, then the payload; `padTo` fills the message up to that many bytes of data.
    bool sendDsp(quint32 type, const QByteArray& payload, qsizetype padTo = 0);

    /// Closes the connection; the next may come.
    void hangUp();

    [[nodiscard]] static QByteArray words(std::initializer_list<quint32> values);
    [[nodiscard]] static QByteArray dspMessage(quint32 type, const QByteArray& payload);

private:
    void serve();
    void accept();
    void receive();
    void handle(const QByteArray& packet);
    void handleRequest(Kind kind, quint32 serial, const QByteArray& payload);
    void reply(quint32 serial, quint32 status, quint32 value);
    void dropClient();
    void wake() const;

    int listener = -1;
    int wakeUp[2] = {-1, -1};
    std::atomic<bool> stopping = false;
    std::atomic<bool> reading = true;
    std::atomic<bool> hangUpAsked = false;
    mutable std::mutex mutex;
    mutable std::mutex sendMutex; ///< keeps the client's descriptor while it is written to
    int client = -1;
    quint32 queueOfHost = 0xFFFF;
    std::map<quint16, quint32> answers;
    QSet<quint16> silent;
    QList<quint32> waitingLocates;
    std::vector<Request> seenRequests; ///< not shared with the copies that the test gets
    std::vector<HostMessage> seenMessages;
    MessageHandler handler;
    RequestHandler requestHandler;
    std::thread thread;
};

} // namespace TestSupport
