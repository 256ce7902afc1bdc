// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"

#include "virtual-device/sandbox/DeviceFolder.h"

#include <QCoreApplication>
#include <QDeadlineTimer>
#include <QFile>
#include <QJsonArray>
#include <QJsonDocument>
#include <QJsonObject>
#include <QTest>

namespace TestSupport
{

namespace
{

constexpr int stopMilliseconds = 20000;

QString uniqueName()
{
    static int count = 0;
    return QStringLiteral("test-%1-%2").arg(QCoreApplication::applicationPid()).arg(++count);
}

} // namespace

DeviceUnderTest::DeviceUnderTest()
{
    // Always drained: a full pipe would hold the device up.
    QObject::connect(&runner, &QProcess::readyReadStandardOutput, &runner, [this] {
        written += runner.readAllStandardOutput();
        const auto begin = written.startsWith("ready") ? 0 : written.indexOf("\nready") + 1;
        const auto end = written.indexOf('\n', begin);
        if (ready.isEmpty() && written.mid(begin, 5) == "ready" && end > 0)
            ready = QString::fromUtf8(written.mid(begin, end - begin));
    });
    QObject::connect(&runner, &QProcess::readyReadStandardError, &runner,
                     [this] { written += runner.readAllStandardError(); });
    QObject::connect(&connection, &VirtualDevice::ControlClient::notified, &connection,
                     [this](const QString&, const QJsonObject& event) { kept.append(event); });
}

DeviceUnderTest::~DeviceUnderTest()
{
    stop();
}

bool DeviceUnderTest::start(const QStringList& arguments, std::chrono::milliseconds limit)
{
    const QDeadlineTimer deadline(limit);
    return begin(arguments) && waitReady(std::chrono::milliseconds(deadline.remainingTime()));
}

bool DeviceUnderTest::begin(const QStringList& arguments)
{
    stop();
    ready.clear();
    written.clear();
    kept.clear();
    QFile::remove(scratch.filePath("output"));
    deviceName = uniqueName();
    runner.start(
        qEnvironmentVariable("IMMUNITYRIG_BUILD") + "/virtual-device/virtual-device",
        QStringList{"run", "--name", deviceName, "--state", stateFile({}), "--output", scratch.filePath("output")} +
            arguments);
    const QString path = VirtualDevice::DeviceFolder::controlSocket(deviceName);
    return QTest::qWaitFor([&] { return connectTo(path) || runner.state() == QProcess::NotRunning; },
                           static_cast<int>(std::chrono::milliseconds(usual).count())) &&
           (connection.isOpen() || fail("the device did not start: " + output()));
}

bool DeviceUnderTest::waitReady(std::chrono::milliseconds limit)
{
    const bool isOver = QTest::qWaitFor([this] { return !ready.isEmpty() || runner.state() == QProcess::NotRunning; },
                                        static_cast<int>(limit.count()));
    return (isOver && !ready.isEmpty()) ||
           fail(QStringLiteral("no window in time (%1): %2").arg(runner.errorString(), output()));
}

bool DeviceUnderTest::attach()
{
    const QString path = qEnvironmentVariable("VIRTUAL_DEVICE_CONTROL");
    return path.isEmpty() ? fail("the test does not run on a virtual device") : connectTo(path);
}

void DeviceUnderTest::stop()
{
    connection.close();
    if (runner.state() == QProcess::NotRunning)
        return;
    runner.terminate();
    if (!runner.waitForFinished(stopMilliseconds)) {
        runner.kill();
        runner.waitForFinished(stopMilliseconds);
    }
}

bool DeviceUnderTest::set(const QString& control, const QJsonValue& value)
{
    return call("set", {{"name", control}, {"value", value}}).isOk();
}

QJsonValue DeviceUnderTest::get(const QString& control)
{
    return call("get", {{"name", control}}).result;
}

bool DeviceUnderTest::press(const QString& key)
{
    return call("press", {{"key", key}}).isOk();
}

bool DeviceUnderTest::release(const QString& key)
{
    return call("release", {{"key", key}}).isOk();
}

bool DeviceUnderTest::tap(const QString& key)
{
    return press(key) && release(key);
}

bool DeviceUnderTest::strike(const QString& key, const QString& region)
{
    return press(key) && waitRegion(region, QStringLiteral("green")) && release(key) &&
           waitRegion(region, QStringLiteral("white"));
}

bool DeviceUnderTest::hold(const QString& key, std::chrono::milliseconds duration)
{
    return call("hold", {{"key", key}, {"milliseconds", qint64(duration.count())}}).isOk();
}

bool DeviceUnderTest::waitRegion(const QString& region, const QString& colour, std::chrono::milliseconds limit)
{
    return waitFor({{"region", region}, {"colour", colour}}, limit);
}

bool DeviceUnderTest::waitControl(const QString& control, const QJsonValue& value, std::chrono::milliseconds limit)
{
    return waitFor({{"control", control}, {"value", value}}, limit);
}

bool DeviceUnderTest::waitLog(const QString& text, std::chrono::milliseconds limit, qint64 after)
{
    return waitFor({{"log", text}, {"after", after}}, limit);
}

QString DeviceUnderTest::regionColour(const QString& region)
{
    for (const auto& row : call("regions").result.toArray())
        if (row.toObject().value("name") == region)
            return row.toObject().value("colour").toString();
    return {};
}

qint64 DeviceUnderTest::logMark()
{
    return call("log").result.toArray().last().toObject().value("number").toInteger();
}

QStringList DeviceUnderTest::logTexts(qint64 after)
{
    QStringList texts;
    for (const auto& line : logLines(after))
        texts.append(line.value("text").toString());
    return texts;
}

QList<QJsonObject> DeviceUnderTest::logLines(qint64 after)
{
    QList<QJsonObject> lines;
    for (const auto& line : call("log", {{"after", after}}).result.toArray())
        lines.append(line.toObject());
    return lines;
}

bool DeviceUnderTest::follow()
{
    forgetEvents();
    return call("events").isOk();
}

QStringList DeviceUnderTest::regionsThatTurned(const QString& colour, const QString& about) const
{
    const QStringList flickering{"trigger", "rf.radios"};
    QStringList names;
    for (const auto& event : kept)
        if (event.value("kind") == "region" && event.value("colour") == colour)
            names.append(event.value("name").toString());
    names.removeDuplicates();
    names.removeIf([&](const QString& name) { return name != about && flickering.contains(name); });
    return names;
}

QString DeviceUnderTest::programOutput() const
{
    QFile file(scratch.filePath("output"));
    return file.open(QIODevice::ReadOnly) ? QString::fromUtf8(file.readAll()) : QString();
}

bool DeviceUnderTest::waitOutput(const QString& text, std::chrono::milliseconds limit) const
{
    return QTest::qWaitFor([&] { return programOutput().contains(text); }, static_cast<int>(limit.count()));
}

std::optional<ProgramProcess> DeviceUnderTest::program() const
{
    return ProgramProcess::below(runner.processId(), "immunityrig");
}

QImage DeviceUnderTest::screenshot()
{
    const auto reply = call("screenshot");
    return QImage::fromData(QByteArray::fromBase64(reply.result.toString().toLatin1()), "PNG");
}

VirtualDevice::ControlReply DeviceUnderTest::call(const QString& method, const QJsonObject& params)
{
    auto reply = connection.call(method, params);
    if (!reply.isOk())
        problem = QStringLiteral("%1: %2").arg(method, reply.message);
    return reply;
}

bool DeviceUnderTest::waitFor(const QJsonObject& condition, std::chrono::milliseconds limit)
{
    QJsonObject params = condition;
    params.insert("within", static_cast<double>(limit.count()) / 1000);
    const auto reply = connection.call("wait", params);
    if (reply.isOk())
        return true;
    // What was waited for, and what there was instead.
    const auto text = [](const QJsonObject& object) { return QJsonDocument(object).toJson(QJsonDocument::Compact); };
    return fail(
        QStringLiteral("wait %1: %2, now %3").arg(text(params), reply.message, text({{"present", reply.data}})));
}

bool DeviceUnderTest::connectTo(const QString& path)
{
    socketPath = path;
    const auto refused = connection.open(path);
    return !refused || fail(*refused);
}

bool DeviceUnderTest::fail(const QString& text)
{
    problem = text;
    return false;
}

} // namespace TestSupport
