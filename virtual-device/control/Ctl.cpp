// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/Ctl.h"

#include "virtual-device/control/ControlClient.h"
#include "virtual-device/control/CtlParser.h"
#include "virtual-device/control/JsonRpc.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/sandbox/DeviceFolder.h"

#include <QCoreApplication>
#include <QEventLoop>
#include <QJsonArray>
#include <QJsonDocument>
#include <QSaveFile>
#include <QTextStream>

#include <algorithm>
#include <array>
#include <chrono>
#include <cmath>
#include <cstdio>

namespace VirtualDevice
{

namespace
{

constexpr int done = 0;
constexpr int notInTime = 1;
constexpr int wrongUse = 2;
/// A device that works answers at once; what a request takes by itself comes on top.
constexpr std::chrono::milliseconds answerLimit(10'000);
constexpr std::chrono::milliseconds longestDuration(86'400'000); ///< the device refuses what is longer

int complain(const QString& text)
{
    QTextStream(stderr) << "virtual-device ctl: " << text << "\n";
    return wrongUse;
}

/// What follows a stream of events ends when nobody reads it any more.
void print(const QString& text)
{
    const QByteArray line = text.toUtf8() + '\n';
    const auto length = static_cast<std::size_t>(line.size());
    if (std::fwrite(line.constData(), 1, length, stdout) != length || std::fflush(stdout) != 0)
        QCoreApplication::exit();
}

/// A value as a person would type it; anything that is no plain value as JSON.
QString word(const QJsonValue& value)
{
    if (value.isString())
        return value.toString();
    if (value.isBool())
        return value.toBool() ? QStringLiteral("true") : QStringLiteral("false");
    if (value.isDouble())
        return QString::number(value.toInteger());
    return QString::fromUtf8(value.isArray() ? QJsonDocument(value.toArray()).toJson(QJsonDocument::Compact)
                                             : QJsonDocument(value.toObject()).toJson(QJsonDocument::Compact));
}

QString json(const QJsonValue& value)
{
    // A document holds no plain value: wrapped in an array, without its brackets.
    return QString::fromUtf8(QJsonDocument(QJsonArray{value}).toJson(QJsonDocument::Compact)).chopped(1).mid(1);
}

/// The word as the control's type; as it is when it does not fit, so that the device says what it takes.
QJsonValue typed(const QString& control, const QString& text)
{
    const ControlSpec* const spec = Registry::find(control);
    const QJsonValue value = spec == nullptr ? QJsonValue() : Registry::parsed(*spec, text);
    return value.isNull() ? QJsonValue(text) : value;
}

QJsonValue numberOrWord(const QString& text)
{
    bool isNumber = false;
    const qint64 number = text.toLongLong(&isNumber);
    return isNumber ? QJsonValue(number) : QJsonValue(text);
}

QString logText(const QJsonObject& line)
{
    static const std::array<const char*, 8> priorities{"emerg",   "alert",  "crit", "err",
                                                       "warning", "notice", "info", "debug"};
    const auto priority = static_cast<std::size_t>(line.value("priority").toInt() & 7);
    return QStringLiteral("%1 %2 %3: %4")
        .arg(line.value("received").toString(), QString::fromLatin1(priorities.at(priority)),
             line.value("identity").toString(), line.value("text").toString());
}

QString eventText(const QJsonObject& event)
{
    const QString kind = event.value("kind").toString();
    if (kind == u"log")
        return QStringLiteral("log ") + logText(event);
    if (kind == u"region")
        return QStringLiteral("region %1 %2").arg(event.value("name").toString(), event.value("colour").toString());
    if (kind == u"control")
        return QStringLiteral("control %1 %2").arg(event.value("name").toString(), word(event.value("value")));
    return QStringLiteral("%1 %2 %3 %4")
        .arg(kind, event.value("source").toString(), event.value("event").toString(), word(event.value("details")));
}

/// One run of the command, connected to its device.
class Session
{
public:
    Session(ControlClient& connection, const CtlRequest& parsed) : client(connection), request(parsed) {}

    int run()
    {
        const auto row = std::find_if(commands.begin(), commands.end(), [this](const Command& candidate) {
            return request.command == QLatin1String(candidate.name);
        });
        return row == commands.end() ? wrongUse : (this->*row->handler)();
    }

private:
    struct Command
    {
        const char* name;
        int (Session::*handler)();
    };
    static const std::array<Command, 11> commands;

    [[nodiscard]] ControlReply call(const QString& method, const QJsonObject& params = {},
                                    std::chrono::milliseconds duration = {})
    {
        return client.call(method, params, answerLimit + std::clamp(duration, {}, longestDuration));
    }

    [[nodiscard]] QString argument(int index) const { return request.words.at(index); }

    /// Prints the result, or what was refused.
    int finish(const ControlReply& reply, const std::optional<QString>& plain = {}) const
    {
        if (!reply.isOk()) {
            complain(reply.message);
            return reply.code == static_cast<int>(JsonRpc::ErrorCode::TimedOut) ? notInTime : wrongUse;
        }
        if (request.isJson)
            print(json(reply.result));
        else if (plain)
            print(*plain);
        return done;
    }

    int list()
    {
        const auto reply = call("list");
        QStringList lines;
        for (const auto& row : reply.result.toArray()) {
            const auto control = row.toObject();
            const bool isReadOnly = control.value("access") == "device";
            lines.append(QStringLiteral("%1 %2 %3")
                             .arg(control.value("name").toString(), -28)
                             .arg(word(control.value("value")), -20)
                             .arg(isReadOnly ? QStringLiteral("read only") : control.value("allowed").toString()));
        }
        return finish(reply, lines.join(u'\n'));
    }

    int get()
    {
        const auto reply = call("get", {{"name", argument(0)}});
        return finish(reply, word(reply.result));
    }

    int set() { return finish(call("set", {{"name", argument(0)}, {"value", typed(argument(0), argument(1))}})); }
    int press() { return finish(call("press", {{"key", argument(0)}})); }
    int release() { return finish(call("release", {{"key", argument(0)}})); }

    int hold()
    {
        const QJsonValue duration = numberOrWord(argument(1));
        return finish(call("hold", {{"key", argument(0)}, {"milliseconds", duration}},
                           std::chrono::milliseconds(duration.toInteger())));
    }

    int screenshot()
    {
        const auto reply = call("screenshot");
        if (!reply.isOk())
            return finish(reply);
        QSaveFile file(argument(0));
        const QByteArray png = QByteArray::fromBase64(reply.result.toString().toLatin1());
        if (!file.open(QIODevice::WriteOnly) || file.write(png) != png.size() || !file.commit())
            return complain(QStringLiteral("cannot write %1: %2").arg(argument(0), file.errorString()));
        return done;
    }

    int regions()
    {
        const auto reply = call("regions");
        QStringList lines;
        for (const auto& row : reply.result.toArray())
            lines.append(QStringLiteral("%1 %2")
                             .arg(row.toObject().value("name").toString(), -20)
                             .arg(row.toObject().value("colour").toString()));
        return finish(reply, lines.join(u'\n'));
    }

    int log()
    {
        qint64 last = 0;
        QEventLoop loop;
        QObject::connect(&client, &ControlClient::closed, &loop, &QEventLoop::quit);
        const auto show = [&](const QJsonObject& line) {
            // A line may be both in the answer and among the events before it.
            if (line.value("number").toInteger() <= last)
                return;
            last = line.value("number").toInteger();
            print(request.isJson ? json(line) : logText(line));
        };
        QList<QJsonObject> early;
        bool isCaughtUp = false;
        QObject::connect(&client, &ControlClient::notified, &loop, [&](const QString&, const QJsonObject& line) {
            if (isCaughtUp)
                show(line);
            else
                early.append(line);
        });
        if (request.follows)
            static_cast<void>(call("events", {{"kinds", QJsonArray{"log"}}}));
        const auto reply = call("log");
        for (const auto& line : reply.result.toArray())
            show(line.toObject());
        isCaughtUp = true;
        for (const auto& line : std::as_const(early))
            show(line);
        if (!reply.isOk())
            return finish(reply);
        if (request.follows && client.isOpen())
            loop.exec();
        return done;
    }

    int wait()
    {
        QJsonObject params{{"within", request.within}};
        if (argument(0) == u"region") {
            params.insert("region", argument(1));
            params.insert("colour", argument(2));
        } else if (argument(0) == u"control") {
            params.insert("control", argument(1));
            params.insert("value", typed(argument(1), argument(2)));
        } else {
            params.insert("log", argument(1));
        }
        const double most = std::chrono::duration<double>(longestDuration).count();
        const double seconds = request.within > 0 ? std::min(request.within, most) : 0;
        const auto reply = call("wait", params, std::chrono::milliseconds(std::llround(seconds * 1000)));
        // The device went: what was waited for will never come true.
        if (reply.code == ControlClient::connectionLost) {
            complain(reply.message);
            return notInTime;
        }
        return finish(reply);
    }

    int events()
    {
        QEventLoop loop;
        QObject::connect(&client, &ControlClient::closed, &loop, &QEventLoop::quit);
        QObject::connect(&client, &ControlClient::notified, &loop, [this](const QString&, const QJsonObject& event) {
            print(request.isJson ? json(event) : eventText(event));
        });
        const auto reply = call("events");
        if (!reply.isOk())
            return finish(reply);
        loop.exec();
        return done;
    }

    ControlClient& client;
    const CtlRequest& request;
};

const std::array<Session::Command, 11> Session::commands{{
    {"list", &Session::list},
    {"get", &Session::get},
    {"set", &Session::set},
    {"press", &Session::press},
    {"release", &Session::release},
    {"hold", &Session::hold},
    {"screenshot", &Session::screenshot},
    {"regions", &Session::regions},
    {"log", &Session::log},
    {"wait", &Session::wait},
    {"events", &Session::events},
}};

/// The control socket of the device that is meant, or what is wrong.
std::variant<QString, std::optional<QString>> findDevice(const QString& name)
{
    const QString given = qEnvironmentVariable("VIRTUAL_DEVICE_CONTROL");
    if (name.isEmpty() && !given.isEmpty())
        return given;
    const QStringList running = DeviceFolder::running();
    if (name.isEmpty() && running.isEmpty())
        return std::optional(QStringLiteral("no virtual device is running: start one with \"virtual-device run\""));
    if (name.isEmpty() && running.size() > 1)
        return std::optional(QStringLiteral("several virtual devices are running: choose one with --device: %1")
                                 .arg(running.join(", ")));
    if (!name.isEmpty() && !running.contains(name))
        return std::optional(QStringLiteral("no virtual device \"%1\" is running; running: %2")
                                 .arg(name, running.isEmpty() ? QStringLiteral("none") : running.join(", ")));
    return DeviceFolder::controlSocket(name.isEmpty() ? running.front() : name);
}

} // namespace

int runCtl(const QStringList& arguments)
{
    const CtlRequest request = parseCtl(arguments);
    if (!request.problem.isEmpty())
        return complain(request.problem);
    if (!request.help.isEmpty()) {
        print(request.help);
        return done;
    }
    const auto found = findDevice(request.device);
    if (const auto* const problem = std::get_if<std::optional<QString>>(&found))
        return complain(**problem);
    ControlClient client;
    if (const auto problem = client.open(std::get<QString>(found)))
        return complain(*problem);
    return Session(client, request).run();
}

} // namespace VirtualDevice
