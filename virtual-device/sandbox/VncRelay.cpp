// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/VncRelay.h"

#include <QHostAddress>
#include <QLocalSocket>
#include <QTcpSocket>

namespace VirtualDevice
{

namespace
{

/// A viewer that takes nothing more is let go rather than paid for with memory.
constexpr qint64 mostUnsent = 16 * 1024 * 1024;

template <typename From, typename To> void forward(From* from, To* to)
{
    QObject::connect(from, &From::readyRead, to, [from, to] {
        to->write(from->readAll());
        if (to->bytesToWrite() > mostUnsent)
            to->abort();
    });
}

} // namespace

VncRelay::VncRelay(QObject* parent) : QObject(parent)
{
    connect(&server, &QTcpServer::newConnection, this, &VncRelay::accept);
}

std::optional<QString> VncRelay::listen(quint16 port, const QString& path)
{
    socketPath = path;
    if (server.listen(QHostAddress(QHostAddress::LocalHost), port))
        return std::nullopt;
    return QStringLiteral("VNC port %1: %2").arg(port).arg(server.errorString());
}

QString VncRelay::address() const
{
    return QStringLiteral("127.0.0.1:%1").arg(server.serverPort());
}

void VncRelay::accept()
{
    while (QTcpSocket* viewer = server.nextPendingConnection()) {
        auto* screen = new QLocalSocket(viewer);
        forward(viewer, screen);
        forward(screen, viewer);
        connect(viewer, &QTcpSocket::disconnected, viewer, &QObject::deleteLater);
        connect(screen, &QLocalSocket::disconnected, viewer, &QTcpSocket::disconnectFromHost);
        connect(screen, &QLocalSocket::errorOccurred, viewer, &QTcpSocket::disconnectFromHost);
        screen->connectToServer(socketPath);
    }
}

} // namespace VirtualDevice
