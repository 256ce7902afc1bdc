// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QImage>
#include <QObject>
#include <QRegion>
#include <QSocketNotifier>
#include <QTimer>

#include <atomic>
#include <memory>
#include <mutex>

// rfbclient.h defines short lower-case macros and is for the source file alone.
struct _rfbClient;

namespace VirtualDevice
{

/// The conversation of `Screen` with the program's VNC server (remote framebuffer protocol, 32 bits a pixel, raw).
///
/// Threads: lives in a thread of its own, because a program that is stuck in the middle of an answer keeps the library
/// waiting in its read; only `stop()` and `picture()` may be called from elsewhere.
class RfbConnection : public QObject
{
    Q_OBJECT

public:
    RfbConnection() = default;
    ~RfbConnection() override;

    /// The last complete picture; null while there is none.
    [[nodiscard]] QImage picture() const;
    /// Makes a read or an attempt that is under way fail, and every later one.
    void stop();

public slots:
    /// Connects to the Unix socket, and again whenever the connection ends.
    void open(const QString& socketPath);
    void sendKey(quint32 symbol, bool pressed);

signals:
    void opened();
    void updated(const QRect& area);
    void closed();

private:
    struct Deleter
    {
        void operator()(_rfbClient* dying) const;
    };
    using Client = std::unique_ptr<_rfbClient, Deleter>;

    void connectNow();
    [[nodiscard]] bool handshake();
    void receive();
    void drop();
    void publish(const QRect& area);
    [[nodiscard]] bool adopt(int descriptor);
    void release();
    static signed char allocateFrame(_rfbClient* client);
    static void areaReceived(_rfbClient* client, int x, int y, int width, int height);
    static void updateFinished(_rfbClient* client);

    QString path;
    Client client;
    std::unique_ptr<QSocketNotifier> notifier;
    std::unique_ptr<QTimer> retry;
    QImage frame; ///< what the library writes into
    QRect pending;
    bool open_ = false;

    mutable std::mutex mutex;
    QImage shown;
    int socket = -1;
    bool stopped = false;
};

} // namespace VirtualDevice
