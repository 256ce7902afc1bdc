// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlClient.h"

#include "virtual-device/control/JsonRpc.h"

#include <QEventLoop>
#include <QJsonDocument>
#include <QTimer>

namespace VirtualDevice
{

namespace
{

constexpr int connectMilliseconds = 5000;

} // namespace

ControlClient::ControlClient(QObject* parent) : QObject(parent)
{
    connect(&socket, &QLocalSocket::readyRead, this, &ControlClient::receive);
    connect(&socket, &QLocalSocket::disconnected, this, &ControlClient::closed);
}

std::optional<QString> ControlClient::open(const QString& socketPath)
{
    splitter = LineSplitter(longestLine);
    socket.connectToServer(socketPath);
    if (socket.waitForConnected(connectMilliseconds))
        return std::nullopt;
    return QStringLiteral("cannot reach the virtual device at %1: %2").arg(socketPath, socket.errorString());
}

ControlReply ControlClient::call(const QString& method, const QJsonObject& params,
                                 std::optional<std::chrono::milliseconds> limit)
{
    const qint64 id = ++lastId;
    QEventLoop loop;
    QTimer timer;
    connect(this, &ControlClient::replied, &loop, [&] {
        if (replies.contains(id))
            loop.quit();
    });
    connect(this, &ControlClient::closed, &loop, &QEventLoop::quit);
    connect(&timer, &QTimer::timeout, &loop, &QEventLoop::quit);
    if (limit)
        timer.start(*limit);
    if (isOpen()) {
        socket.write(JsonRpc::requestLine(id, method, params));
        loop.exec();
    }
    const ControlReply lost{QJsonValue::Undefined, connectionLost, "the virtual device did not answer",
                            QJsonValue::Undefined};
    return replies.contains(id) ? replies.take(id) : lost;
}

void ControlClient::receive()
{
    splitter.append(socket.readAll());
    while (const auto line = splitter.next())
        take(QJsonDocument::fromJson(line->text).object());
}

void ControlClient::take(const QJsonObject& message)
{
    if (message.contains("method")) {
        emit notified(message.value("method").toString(), message.value("params").toObject());
        return;
    }
    const QJsonObject error = message.value("error").toObject();
    ControlReply reply{message.value("result"), error.value("code").toInt(), error.value("message").toString(),
                       error.value("data")};
    replies.insert(message.value("id").toInteger(), reply);
    emit replied();
}

} // namespace VirtualDevice
