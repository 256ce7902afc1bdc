// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/control/LineSplitter.h"

#include <QHash>
#include <QJsonObject>
#include <QJsonValue>
#include <QLocalSocket>
#include <QObject>
#include <QString>

#include <chrono>
#include <optional>

namespace VirtualDevice
{

/// What came back for one request.
struct ControlReply
{
    QJsonValue result = QJsonValue::Undefined;
    /// 0, one of `JsonRpc::ErrorCode`, or `ControlClient::connectionLost`.
    int code = 0;
    QString message; ///< of an error
    QJsonValue data = QJsonValue::Undefined;

    [[nodiscard]] bool isOk() const { return code == 0; }
};

/// The other end of `ControlServer`.
///
/// Threads: lives in the thread that makes it. `call` runs the event loop until the answer is there, so that other
/// objects of the thread go on; one call at a time.
class ControlClient : public QObject
{
    Q_OBJECT

public:
    static constexpr int connectionLost = -1;
    /// Pictures and logs are longer than what the server takes.
    static constexpr qsizetype longestLine = 64 * 1024 * 1024;

    explicit ControlClient(QObject* parent = nullptr);

    /// Returns what went wrong.
    [[nodiscard]] std::optional<QString> open(const QString& socketPath);
    [[nodiscard]] bool isOpen() const { return socket.state() == QLocalSocket::ConnectedState; }
    void close() { socket.abort(); }

    /// Without a limit it ends only with an answer or the connection.
    [[nodiscard]] ControlReply call(const QString& method, const QJsonObject& params = {},
                                    std::optional<std::chrono::milliseconds> limit = {});

signals:
    void notified(const QString& method, const QJsonObject& params);
    void closed();

private:
    void receive();
    void take(const QJsonObject& message);

    QLocalSocket socket;
    LineSplitter splitter{longestLine};
    qint64 lastId = 0;
    QHash<qint64, ControlReply> replies;

signals:
    void replied();
};

} // namespace VirtualDevice
