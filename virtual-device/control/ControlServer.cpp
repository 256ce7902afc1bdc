// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlServer.h"

#include "virtual-device/control/ControlSession.h"

#include <QFile>

namespace VirtualDevice
{

ControlServer::ControlServer(const ControlContext& reached, QObject* parent) : QObject(parent), context(reached)
{
    // Without it there is a moment in which the socket exists with the process's usual mode.
    server.setSocketOptions(QLocalServer::UserAccessOption);
    connect(&server, &QLocalServer::newConnection, this, &ControlServer::accept);
}

ControlServer::~ControlServer()
{
    close();
}

void ControlServer::stopListening()
{
    server.close();
}

void ControlServer::close()
{
    stopListening();
    qDeleteAll(findChildren<ControlSession*>(Qt::FindDirectChildrenOnly));
}

std::optional<QString> ControlServer::listen(const QString& path)
{
    QLocalServer::removeServer(path);
    if (!server.listen(path))
        return QStringLiteral("cannot listen on %1: %2").arg(path, server.errorString());
    if (!QFile::setPermissions(path, QFile::ReadOwner | QFile::WriteOwner))
        return QStringLiteral("cannot protect %1").arg(path);
    return std::nullopt;
}

void ControlServer::accept()
{
    while (auto* socket = server.nextPendingConnection())
        new ControlSession(socket, context, this);
}

} // namespace VirtualDevice
