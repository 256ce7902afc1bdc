// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspSocket.h"

#include "virtual-device/dsp/DspProtocol.h"
#include "virtual-device/sandbox/UnixSocket.h"

#include <QFile>
#include <QSocketNotifier>

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>

namespace VirtualDevice
{

namespace
{

/// A notifier may be the sender of the very call that ends it.
void discard(std::unique_ptr<QSocketNotifier>& notifier)
{
    if (!notifier)
        return;
    notifier->setEnabled(false);
    notifier.release()->deleteLater();
}

void closeEnd(int& descriptor)
{
    if (descriptor >= 0)
        ::close(descriptor);
    descriptor = -1;
}

} // namespace

DspSocket::DspSocket(QObject* parent) : QObject(parent) {}

DspSocket::~DspSocket()
{
    blockSignals(true);
    close();
}

std::optional<QString> DspSocket::bind(const QString& path)
{
    close();
    const auto bound = boundUnixSocket(path, SOCK_SEQPACKET | SOCK_NONBLOCK);
    listener = bound.descriptor;
    if (listener < 0)
        return bound.error;
    file = path;
    return std::nullopt;
}

std::optional<QString> DspSocket::listen(const QString& path)
{
    if (auto problem = bind(path))
        return problem;
    constexpr int backlog = 4;
    if (::listen(listener, backlog) != 0)
        return QStringLiteral("%1: %2").arg(path, qt_error_string(errno));
    acceptNotifier = std::make_unique<QSocketNotifier>(listener, QSocketNotifier::Read);
    connect(acceptNotifier.get(), &QSocketNotifier::activated, this, &DspSocket::accept);
    return std::nullopt;
}

std::optional<QString> DspSocket::refuse(const QString& path)
{
    return bind(path);
}

void DspSocket::close()
{
    hangUp();
    discard(acceptNotifier);
    closeEnd(listener);
    if (!file.isEmpty())
        QFile::remove(file);
    file.clear();
}

void DspSocket::hangUp()
{
    if (!isConnected())
        return;
    release();
    emit disconnected();
}

void DspSocket::release()
{
    discard(readNotifier);
    discard(writeNotifier);
    closeEnd(connection);
    waiting.clear();
}

void DspSocket::accept()
{
    const int descriptor = ::accept4(listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
    if (descriptor < 0)
        return;
    readAvailable(); // the end of the program before may not have been noticed yet
    if (isConnected())
        ::close(descriptor);
    else
        adopt(descriptor);
}

void DspSocket::adopt(int descriptor)
{
    connection = descriptor;
    readNotifier = std::make_unique<QSocketNotifier>(connection, QSocketNotifier::Read);
    connect(readNotifier.get(), &QSocketNotifier::activated, this, &DspSocket::readAvailable);
    writeNotifier = std::make_unique<QSocketNotifier>(connection, QSocketNotifier::Write);
    writeNotifier->setEnabled(false);
    connect(writeNotifier.get(), &QSocketNotifier::activated, this, &DspSocket::flush);
    emit connected();
}

void DspSocket::readAvailable()
{
    // Who sends as fast as it is read must not keep the thread from everything else; what is left is announced again.
    constexpr int mostAtOnce = 1000;
    for (int remaining = mostAtOnce; remaining > 0 && isConnected() && readOne(); --remaining) {
    }
}

bool DspSocket::readOne()
{
    QByteArray packet(DspProtocol::longestPacket + 1, Qt::Uninitialized);
    const auto count = ::recv(connection, packet.data(), static_cast<std::size_t>(packet.size()), 0);
    if (count < 0 && (errno == EAGAIN || errno == EINTR))
        return false;
    if (count <= 0) {
        hangUp();
        return false;
    }
    packet.truncate(count);
    emit received(packet);
    return true;
}

bool DspSocket::send(const QByteArray& packet, Urgency urgency)
{
    if (!isConnected() || waiting.size() >= (urgency == Urgency::Answer ? 2 * capacity : capacity))
        return false;
    waiting.append(packet);
    flush();
    return true;
}

void DspSocket::flush()
{
    while (isConnected() && !waiting.isEmpty()) {
        const QByteArray& packet = waiting.front();
        const auto size = static_cast<std::size_t>(packet.size());
        if (::send(connection, packet.constData(), size, MSG_NOSIGNAL) < 0) {
            if (errno == EAGAIN || errno == EINTR)
                break;
            waiting.clear(); // the end of the connection is read as such, after what the program had still sent
            break;
        }
        waiting.removeFirst();
    }
    if (writeNotifier)
        writeNotifier->setEnabled(!waiting.isEmpty());
}

} // namespace VirtualDevice
