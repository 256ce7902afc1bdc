// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/RfbConnection.h"

#include <QFile>

#include <pthread.h>
#include <rfb/rfbclient.h>
#include <sys/socket.h>

#include <csignal>
#include <utility>

namespace VirtualDevice
{

namespace
{

constexpr int retryMilliseconds = 50;
constexpr unsigned int connectSeconds = 5;
/// The device's screen is 240 by 320; what announces much more is no screen.
constexpr int largestSide = 4096;

// Its address is the key under which the library keeps our pointer.
int ownerTag = 0;

RfbConnection* ownerOf(rfbClient* client)
{
    return static_cast<RfbConnection*>(rfbClientGetClientData(client, &ownerTag));
}

/// The program may end between our look at the socket and our write: that is an error code here, not the end of us.
void ignoreBrokenPipes()
{
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, SIGPIPE);
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
}

rfbClient* makeClient()
{
    constexpr int bitsPerSample = 8;
    constexpr int samplesPerPixel = 3;
    constexpr int bytesPerPixel = 4;
    rfbEnableClientLogging = FALSE;
    rfbClient* client = rfbGetClient(bitsPerSample, samplesPerPixel, bytesPerPixel);
    client->format.redShift = 16;
    client->format.greenShift = 8;
    client->format.blueShift = 0;
    client->appData.encodingsString = "raw";
    client->appData.useRemoteCursor = FALSE;
    client->canHandleNewFBSize = FALSE;
    return client;
}

} // namespace

void RfbConnection::Deleter::operator()(rfbClient* dying) const
{
    // The picture's memory belongs to `frame`.
    dying->frameBuffer = nullptr;
    rfbClientCleanup(dying);
}

RfbConnection::~RfbConnection()
{
    notifier.reset();
    release();
}

QImage RfbConnection::picture() const
{
    const std::lock_guard lock(mutex);
    return shown;
}

void RfbConnection::stop()
{
    const std::lock_guard lock(mutex);
    stopped = true;
    if (socket >= 0)
        ::shutdown(socket, SHUT_RDWR);
}

void RfbConnection::open(const QString& socketPath)
{
    ignoreBrokenPipes();
    path = socketPath;
    retry = std::make_unique<QTimer>();
    retry->setSingleShot(true);
    connect(retry.get(), &QTimer::timeout, this, &RfbConnection::connectNow);
    connectNow();
}

void RfbConnection::connectNow()
{
    client.reset(makeClient());
    rfbClientSetClientData(client.get(), &ownerTag, this);
    client->MallocFrameBuffer = &RfbConnection::allocateFrame;
    client->GotFrameBufferUpdate = &RfbConnection::areaReceived;
    client->FinishedFrameBufferUpdate = &RfbConnection::updateFinished;
    if (!adopt(ConnectClientToUnixSockWithTimeout(QFile::encodeName(path).constData(), connectSeconds)) ||
        !handshake()) {
        drop();
        return;
    }
    notifier = std::make_unique<QSocketNotifier>(client->sock, QSocketNotifier::Read);
    connect(notifier.get(), &QSocketNotifier::activated, this, &RfbConnection::receive);
    open_ = true;
    emit opened();
    receive();
}

/// Takes the socket over, unless `stop()` came first.
bool RfbConnection::adopt(int descriptor)
{
    client->sock = descriptor;
    const std::lock_guard lock(mutex);
    socket = descriptor;
    return descriptor >= 0 && !stopped;
}

bool RfbConnection::handshake()
{
    if (!InitialiseRFBConnection(client.get()))
        return false;
    client->width = client->si.framebufferWidth;
    client->height = client->si.framebufferHeight;
    // The server paints nothing for a client that has not said its pixel format first.
    return client->MallocFrameBuffer(client.get()) && SetFormatAndEncodings(client.get()) &&
           SendFramebufferUpdateRequest(client.get(), 0, 0, client->width, client->height, FALSE);
}

void RfbConnection::receive()
{
    // What the library has already buffered wakes no notifier.
    while (client && (client->buffered > 0 || WaitForMessage(client.get(), 0) > 0))
        if (!HandleRFBServerMessage(client.get())) {
            drop();
            return;
        }
}

void RfbConnection::drop()
{
    if (notifier) {
        // It may be the one that is calling.
        notifier->setEnabled(false);
        notifier.release()->deleteLater();
    }
    release();
    const bool wasOpen = std::exchange(open_, false);
    {
        const std::lock_guard lock(mutex);
        shown = QImage();
        if (!stopped)
            retry->start(retryMilliseconds);
    }
    if (wasOpen)
        emit closed();
}

/// The library closes the socket, so `stop()` must no longer know its number.
void RfbConnection::release()
{
    {
        const std::lock_guard lock(mutex);
        socket = -1;
    }
    client.reset();
}

void RfbConnection::sendKey(quint32 symbol, bool pressed)
{
    if (open_ && !SendKeyEvent(client.get(), symbol, pressed ? TRUE : FALSE))
        drop();
}

signed char RfbConnection::allocateFrame(rfbClient* client)
{
    if (client->width > largestSide || client->height > largestSide)
        return FALSE;
    auto& frame = ownerOf(client)->frame;
    frame = QImage(client->width, client->height, QImage::Format_RGB32);
    frame.fill(Qt::black);
    client->frameBuffer = frame.bits();
    return frame.isNull() ? FALSE : TRUE;
}

void RfbConnection::areaReceived(rfbClient* client, int x, int y, int width, int height)
{
    ownerOf(client)->pending |= QRect(x, y, width, height);
}

void RfbConnection::updateFinished(rfbClient* client)
{
    auto* const owner = ownerOf(client);
    owner->publish(std::exchange(owner->pending, QRect()));
}

void RfbConnection::publish(const QRect& area)
{
    QImage copy = frame.copy();
    {
        const std::lock_guard lock(mutex);
        shown = std::move(copy);
    }
    emit updated(area);
}

} // namespace VirtualDevice
