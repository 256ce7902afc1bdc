// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/control/ControlContext.h"
#include "virtual-device/control/JsonRpc.h"
#include "virtual-device/control/LineSplitter.h"

#include <QLocalSocket>
#include <QObject>
#include <QStringList>

#include <functional>
#include <span>
#include <string_view>

namespace VirtualDevice
{

class PendingWait;

/// One client of the control socket. Owns the socket and deletes itself when the client goes; a wait that is under way
/// ends with it, a key that it holds is released all the same. A client that does not read its answers is cut off, and
/// what it asked in the same breath is not carried out.
///
/// Threads: lives in the main thread, with everything that its context names.
class ControlSession : public QObject
{
    Q_OBJECT

public:
    static constexpr qsizetype longestLine = 64 * 1024;
    static constexpr qint64 largestBacklog = 16 * 1024 * 1024;
    static constexpr qsizetype mostWaits = 1000;

    ControlSession(QLocalSocket* client, const ControlContext& reached, QObject* parent);

private:
    /// Answers later, by itself.
    struct Deferred
    {
    };
    using Outcome = std::variant<QJsonValue, JsonRpc::Error, Deferred>;
    struct Method
    {
        std::string_view name;
        std::string_view params; ///< words separated by "|"
        Outcome (ControlSession::*handler)(const JsonRpc::Request& request);
    };

    void receive();
    void handle(const LineSplitter::Line& line);
    void dispatch(const JsonRpc::Request& request);
    void answer(const QJsonValue& id, const Outcome& outcome);
    void send(const QByteArray& line);
    void sendEvent(const QString& kind, QJsonObject event);

    static std::span<const Method> methods();
    static QStringList methodNames();

    Outcome list(const JsonRpc::Request& request);
    Outcome get(const JsonRpc::Request& request);
    Outcome set(const JsonRpc::Request& request);
    Outcome press(const JsonRpc::Request& request);
    Outcome release(const JsonRpc::Request& request);
    Outcome hold(const JsonRpc::Request& request);
    Outcome screenshot(const JsonRpc::Request& request);
    Outcome regions(const JsonRpc::Request& request);
    Outcome log(const JsonRpc::Request& request);
    Outcome wait(const JsonRpc::Request& request);
    Outcome events(const JsonRpc::Request& request);

    /// Each returns what is wrong with the parameters; nothing: the wait is under way.
    [[nodiscard]] std::optional<JsonRpc::Error> condition(PendingWait& pending, const QJsonObject& params);
    [[nodiscard]] std::optional<JsonRpc::Error> regionCondition(PendingWait& pending, const QJsonObject& params);
    [[nodiscard]] std::optional<JsonRpc::Error> controlCondition(PendingWait& pending, const QJsonObject& params);
    [[nodiscard]] std::optional<JsonRpc::Error> logCondition(PendingWait& pending, const QJsonObject& params);
    void subscribe();

    QLocalSocket* socket;
    ControlContext context;
    LineSplitter splitter{longestLine};
    QStringList kinds;
    bool isSubscribed = false;
    bool isAbandoned = false; ///< a client that reads too slowly gets no further answers
};

} // namespace VirtualDevice
