// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/ControlSession.h"

#include "virtual-device/control/ControlDescription.h"
#include "virtual-device/control/Monitor.h"
#include "virtual-device/control/PendingWait.h"
#include "virtual-device/log/LogStore.h"
#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/registry/Values.h"
#include "virtual-device/screen/KeyTable.h"
#include "virtual-device/screen/RegionMap.h"
#include "virtual-device/screen/RegionWatch.h"
#include "virtual-device/screen/Screen.h"

#include <QJsonArray>
#include <QPointer>

#include <algorithm>
#include <array>
#include <cmath>

namespace VirtualDevice
{

namespace
{

using JsonRpc::Error;
using JsonRpc::ErrorCode;

constexpr qint64 longestHold = 600'000;
constexpr double longestWait = 86'400;
constexpr double usualWait = 10;
constexpr qint64 lastNumber = 1LL << 53; ///< the largest that a JSON number counts to without a gap

const QStringList allKinds{"control", "log", "region", "monitor"};

Error wrong(const QString& message)
{
    return {ErrorCode::InvalidParams, message, QJsonValue::Undefined};
}

QJsonObject logObject(const LogLine& line)
{
    return {{"number", line.number},     {"received", line.received.toString(Qt::ISODateWithMs)},
            {"priority", line.priority}, {"facility", line.facility},
            {"identity", line.identity}, {"text", line.text}};
}

/// What is wrong with the members' names, if anything: a misspelt one must not be passed over.
std::optional<Error> unknownMember(const QJsonObject& params, const QStringList& allowed)
{
    for (const auto& key : params.keys())
        if (!allowed.contains(key))
            return wrong(QStringLiteral("unknown parameter \"%1\"; allowed: %2")
                             .arg(key, allowed.join("").isEmpty() ? QStringLiteral("none") : allowed.join(", ")));
    return std::nullopt;
}

std::optional<Error> unknownKey(const QString& key)
{
    if (KeyTable::symbol(key))
        return std::nullopt;
    return wrong(QStringLiteral("unknown key \"%1\"; keys: %2").arg(key, KeyTable::names().join(", ")));
}

Error unknownControl(const QString& name)
{
    QStringList names;
    for (const auto& spec : controlTable())
        names.append(fromView(spec.name));
    return wrong(QStringLiteral("unknown control \"%1\"; controls: %2").arg(name, names.join(", ")));
}

Error notConnected()
{
    return {ErrorCode::Unavailable, "the program shows no window", QJsonValue::Undefined};
}

/// "after" is the number of the last log line that is known already; 0 or nothing: none is.
std::optional<Error> wrongMark(const QJsonObject& params)
{
    if (!params.contains("after") || isWholeNumberWithin(params.value("after"), 0, lastNumber))
        return std::nullopt;
    return wrong(QStringLiteral("\"after\" takes a whole number from 0"));
}

} // namespace

std::span<const ControlSession::Method> ControlSession::methods()
{
    static constexpr std::array table{
        Method{"list", "", &ControlSession::list},
        Method{"get", "name", &ControlSession::get},
        Method{"set", "name|value", &ControlSession::set},
        Method{"press", "key", &ControlSession::press},
        Method{"release", "key", &ControlSession::release},
        Method{"hold", "key|milliseconds", &ControlSession::hold},
        Method{"screenshot", "", &ControlSession::screenshot},
        Method{"regions", "", &ControlSession::regions},
        Method{"log", "after", &ControlSession::log},
        Method{"wait", "region|colour|control|value|log|after|within", &ControlSession::wait},
        Method{"events", "kinds", &ControlSession::events},
    };
    return table;
}

QStringList ControlSession::methodNames()
{
    QStringList names;
    for (const auto& method : methods())
        names.append(fromView(method.name));
    return names;
}

ControlSession::ControlSession(QLocalSocket* client, const ControlContext& reached, QObject* parent)
    : QObject(parent), socket(client), context(reached)
{
    socket->setParent(this);
    connect(socket, &QLocalSocket::readyRead, this, &ControlSession::receive);
    connect(socket, &QLocalSocket::disconnected, this, &QObject::deleteLater);
    receive();
}

void ControlSession::receive()
{
    splitter.append(socket->readAll());
    while (!isAbandoned) {
        const auto line = splitter.next();
        if (!line)
            return;
        handle(*line);
    }
}

void ControlSession::handle(const LineSplitter::Line& line)
{
    if (line.isTooLong) {
        send(JsonRpc::errorLine({}, {ErrorCode::InvalidRequest,
                                     QStringLiteral("a line is at most %1 bytes long").arg(longestLine),
                                     QJsonValue::Undefined}));
        return;
    }
    const auto message = JsonRpc::parseRequest(line.text);
    if (const auto* const refusal = std::get_if<JsonRpc::Refusal>(&message))
        send(JsonRpc::errorLine(refusal->id, refusal->error));
    else
        dispatch(std::get<JsonRpc::Request>(message));
}

void ControlSession::dispatch(const JsonRpc::Request& request)
{
    const auto table = methods();
    const auto method = std::find_if(table.begin(), table.end(),
                                     [&](const Method& row) { return fromView(row.name) == request.method; });
    if (method == table.end()) {
        answer(request.id,
               Error{ErrorCode::MethodNotFound,
                     QStringLiteral("unknown method \"%1\"; methods: %2").arg(request.method, methodNames().join(", ")),
                     QJsonValue::Undefined});
        return;
    }
    if (auto error = unknownMember(request.params, fromView(method->params).split(u'|')))
        answer(request.id, *error);
    else
        answer(request.id, (this->*method->handler)(request));
}

void ControlSession::answer(const QJsonValue& id, const Outcome& outcome)
{
    if (id.isUndefined())
        return;
    if (const auto* const value = std::get_if<QJsonValue>(&outcome))
        send(JsonRpc::resultLine(id, *value));
    else if (const auto* const error = std::get_if<Error>(&outcome))
        send(JsonRpc::errorLine(id, *error));
}

void ControlSession::send(const QByteArray& line)
{
    if (socket->bytesToWrite() > largestBacklog) {
        isAbandoned = true;
        socket->abort();
    } else if (socket->state() == QLocalSocket::ConnectedState) {
        socket->write(line);
    }
}

void ControlSession::sendEvent(const QString& kind, QJsonObject event)
{
    if (!kinds.contains(kind))
        return;
    event.insert("kind", kind);
    send(JsonRpc::notificationLine("event", event));
}

ControlSession::Outcome ControlSession::list(const JsonRpc::Request& /*request*/)
{
    QJsonArray rows;
    for (const auto& spec : controlTable()) {
        QJsonObject row = ControlDescription::object(spec);
        row.insert("value", context.registry.value(fromView(spec.name)));
        rows.append(row);
    }
    return QJsonValue(rows);
}

ControlSession::Outcome ControlSession::get(const JsonRpc::Request& request)
{
    const QString name = request.params.value("name").toString();
    if (Registry::find(name) == nullptr)
        return unknownControl(name);
    return context.registry.value(name);
}

ControlSession::Outcome ControlSession::set(const JsonRpc::Request& request)
{
    const QString name = request.params.value("name").toString();
    if (Registry::find(name) == nullptr)
        return unknownControl(name);
    if (const auto problem = context.registry.set(name, request.params.value("value")))
        return wrong(*problem);
    return context.registry.value(name);
}

ControlSession::Outcome ControlSession::press(const JsonRpc::Request& request)
{
    const QString key = request.params.value("key").toString();
    if (auto error = unknownKey(key))
        return *error;
    return context.screen.press(key) ? Outcome(QJsonValue(true)) : Outcome(notConnected());
}

ControlSession::Outcome ControlSession::release(const JsonRpc::Request& request)
{
    const QString key = request.params.value("key").toString();
    if (auto error = unknownKey(key))
        return *error;
    return context.screen.release(key) ? Outcome(QJsonValue(true)) : Outcome(notConnected());
}

ControlSession::Outcome ControlSession::hold(const JsonRpc::Request& request)
{
    const QString key = request.params.value("key").toString();
    const QJsonValue duration = request.params.value("milliseconds");
    if (auto error = unknownKey(key))
        return *error;
    if (!isWholeNumberWithin(duration, 1, longestHold))
        return wrong(QStringLiteral("\"milliseconds\" takes 1..%1").arg(longestHold));
    const auto released = [session = QPointer(this), id = request.id] {
        if (session)
            session->answer(id, QJsonValue(true));
    };
    if (!context.screen.hold(key, std::chrono::milliseconds(duration.toInteger()), released))
        return notConnected();
    return Deferred{};
}

ControlSession::Outcome ControlSession::screenshot(const JsonRpc::Request& /*request*/)
{
    const QByteArray png = context.screen.png();
    if (png.isEmpty())
        return notConnected();
    return QJsonValue(QString::fromLatin1(png.toBase64()));
}

ControlSession::Outcome ControlSession::regions(const JsonRpc::Request& /*request*/)
{
    QJsonArray rows;
    for (const auto& region : RegionMap::regions())
        rows.append(QJsonObject{{"name", fromView(region.name)},
                                {"colour", RegionMap::word(context.regions.colour(fromView(region.name)))},
                                {"x", region.x},
                                {"y", region.y},
                                {"width", region.width},
                                {"height", region.height},
                                {"help", fromView(region.help)}});
    return QJsonValue(rows);
}

ControlSession::Outcome ControlSession::log(const JsonRpc::Request& request)
{
    if (auto error = wrongMark(request.params))
        return *error;
    QJsonArray lines;
    for (const auto& line : context.log.linesAfter(request.params.value("after").toInteger()))
        lines.append(logObject(line));
    return QJsonValue(lines);
}

ControlSession::Outcome ControlSession::wait(const JsonRpc::Request& request)
{
    const QJsonValue within = request.params.value("within");
    if (!within.isUndefined() && (!within.isDouble() || within.toDouble() < 0 || within.toDouble() > longestWait))
        return wrong(QStringLiteral("\"within\" takes 0..%1 seconds").arg(longestWait));
    if (findChildren<PendingWait*>(QString(), Qt::FindDirectChildrenOnly).size() >= mostWaits)
        return Error{ErrorCode::Unavailable, QStringLiteral("a client has at most %1 waits under way").arg(mostWaits),
                     QJsonValue::Undefined};
    const double seconds = within.toDouble(usualWait);
    auto* const pending = new PendingWait(this);
    if (auto error = condition(*pending, request.params)) {
        delete pending;
        return *error;
    }
    connect(pending, &PendingWait::cameTrue, this,
            [this, id = request.id](const QJsonValue& seen) { answer(id, seen); });
    connect(pending, &PendingWait::timedOut, this, [this, id = request.id, seconds](const QJsonValue& seen) {
        answer(id, Error{ErrorCode::TimedOut, QStringLiteral("did not come true within %1 s").arg(seconds), seen});
    });
    pending->start(std::chrono::milliseconds(std::llround(seconds * 1000)));
    return Deferred{};
}

std::optional<Error> ControlSession::condition(PendingWait& pending, const QJsonObject& params)
{
    using Check = std::optional<Error> (ControlSession::*)(PendingWait&, const QJsonObject&);
    struct Condition
    {
        const char* name;
        QStringList members;
        Check check;
    };
    static const std::array<Condition, 3> conditions{{
        {"region", {"region", "colour", "within"}, &ControlSession::regionCondition},
        {"control", {"control", "value", "within"}, &ControlSession::controlCondition},
        {"log", {"log", "after", "within"}, &ControlSession::logCondition},
    }};
    const auto isGiven = [&](const Condition& row) { return params.contains(QLatin1String(row.name)); };
    if (std::count_if(conditions.begin(), conditions.end(), isGiven) != 1)
        return wrong(R"(one of "region", "control" and "log" says what to wait for)");
    const auto* const given = std::find_if(conditions.begin(), conditions.end(), isGiven);
    if (auto error = unknownMember(params, given->members))
        return error;
    return (this->*given->check)(pending, params);
}

std::optional<Error> ControlSession::regionCondition(PendingWait& pending, const QJsonObject& params)
{
    const QString region = params.value("region").toString();
    const QString colour = params.value("colour").toString();
    if (RegionMap::find(region) == nullptr)
        return wrong(QStringLiteral("unknown region \"%1\"; regions: %2").arg(region, RegionMap::names().join(", ")));
    if (!RegionMap::words().contains(colour))
        return wrong(QStringLiteral("unknown colour \"%1\"; colours: %2").arg(colour, RegionMap::words().join(", ")));
    pending.forRegion(context.regions, region, colour);
    return std::nullopt;
}

std::optional<Error> ControlSession::controlCondition(PendingWait& pending, const QJsonObject& params)
{
    const QString name = params.value("control").toString();
    const ControlSpec* const spec = Registry::find(name);
    if (spec == nullptr)
        return unknownControl(name);
    if (!Registry::accepts(*spec, params.value("value")))
        return wrong(QStringLiteral("control \"%1\" takes %2").arg(name, Registry::allowed(*spec)));
    pending.forControl(context.registry, name, params.value("value"));
    return std::nullopt;
}

std::optional<Error> ControlSession::logCondition(PendingWait& pending, const QJsonObject& params)
{
    if (params.value("log").toString().isEmpty())
        return wrong("\"log\" takes a text");
    if (auto error = wrongMark(params))
        return error;
    pending.forLog(context.log, params.value("log").toString(), params.value("after").toInteger());
    return std::nullopt;
}

ControlSession::Outcome ControlSession::events(const JsonRpc::Request& request)
{
    QStringList chosen;
    const QJsonValue wanted = request.params.value("kinds");
    for (const auto& kind : wanted.toArray())
        chosen.append(kind.toString());
    const bool isKnown =
        std::all_of(chosen.begin(), chosen.end(), [](const QString& kind) { return allKinds.contains(kind); });
    if (!isKnown || !(wanted.isUndefined() || wanted.isArray()))
        return wrong(QStringLiteral("\"kinds\" takes an array of: %1").arg(allKinds.join(", ")));
    kinds = wanted.isUndefined() ? allKinds : chosen;
    if (!std::exchange(isSubscribed, true))
        subscribe();
    return QJsonValue(true);
}

void ControlSession::subscribe()
{
    connect(&context.registry, &Registry::changed, this, [this](const QString& name, const QJsonValue& value) {
        sendEvent("control", {{"name", name}, {"value", value}});
    });
    connect(&context.log, &LogStore::lineReceived, this,
            [this](const LogLine& line) { sendEvent("log", logObject(line)); });
    connect(&context.regions, &RegionWatch::changed, this, [this](const QString& region, RegionColour colour) {
        sendEvent("region", {{"name", region}, {"colour", RegionMap::word(colour)}});
    });
    connect(&context.monitor, &Monitor::raised, this,
            [this](const QString& source, const QString& event, const QJsonObject& details) {
                sendEvent("monitor", {{"source", source}, {"event", event}, {"details", details}});
            });
}

} // namespace VirtualDevice
