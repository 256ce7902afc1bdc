// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/ControlBench.h"
#include "virtual-device/control/ControlClient.h"

#include <QElapsedTimer>
#include <QJsonArray>
#include <QTest>
#include <QTimer>

#include <memory>
#include <thread>

using namespace VirtualDevice;
using TestSupport::ControlBench;

namespace
{

constexpr int limit = 20000;
const QString control = QStringLiteral("battery.voltage");

} // namespace

/// What the control socket pushes by itself: the answers of waits, and events.
class ControlWaitTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void waitForWhatHoldsAlreadyComesTrueAtOnce();
    void waitForAValueIsPushedWhenItIsSet();
    void waitForAValueSeesOneThatHeldOnlyForAMoment();
    void waitForAValueSeesAChangeFromAnotherThread();
    void waitForALogLineIsPushedWhenItArrives();
    void waitForALogLineSeesThoseThatAreThere();
    void waitForALogLineAfterAMarkSeesOnlyLaterOnes();
    void waitForARegionWithoutAPicture();
    void waitThatDoesNotComeTrueSaysWhatThereIs();
    void badWaitIsRefused_data();
    void badWaitIsRefused();
    void eventsComeForWhatWasSubscribed();
    void eventsOfKindsThatAreUnknownAreRefused();

private:
    [[nodiscard]] bool log(const QByteArray& text) const
    {
        return TestSupport::sendLog(bench->logPath(), "<12>Jan  1 00:00:00 VQK: " + text);
    }

    std::unique_ptr<ControlBench> bench;
    std::unique_ptr<ControlClient> client;
};

void ControlWaitTest::init()
{
    bench = std::make_unique<ControlBench>();
    client = std::make_unique<ControlClient>();
    QVERIFY(!client->open(bench->socketPath()));
}

void ControlWaitTest::cleanup()
{
    client.reset();
    bench.reset();
}

void ControlWaitTest::waitForWhatHoldsAlreadyComesTrueAtOnce()
{
    const auto reply = client->call("wait", {{"control", control}, {"value", 4100000}, {"within", 0}});
    QVERIFY2(reply.isOk(), qPrintable(reply.message));
    QCOMPARE(reply.result, QJsonValue(4100000));
}

void ControlWaitTest::waitForAValueIsPushedWhenItIsSet()
{
    QTimer::singleShot(50, &bench->monitor, [this] { bench->registry.publish(control, 9); });
    const auto reply = client->call("wait", {{"control", control}, {"value", 9}, {"within", 20}});
    QVERIFY2(reply.isOk(), qPrintable(reply.message));
    QCOMPARE(reply.result, QJsonValue(9));
}

void ControlWaitTest::waitForAValueSeesOneThatHeldOnlyForAMoment()
{
    QTimer::singleShot(50, &bench->monitor, [this] {
        bench->registry.publish(control, 9);
        bench->registry.publish(control, 10);
    });
    QVERIFY(client->call("wait", {{"control", control}, {"value", 9}, {"within", 20}}).isOk());
    QCOMPARE(bench->registry.integer(control), 10);
}

void ControlWaitTest::waitForAValueSeesAChangeFromAnotherThread()
{
    std::thread other;
    QTimer::singleShot(50, &bench->monitor,
                       [&] { other = std::thread([this] { bench->registry.publish(control, 9); }); });
    const auto reply = client->call("wait", {{"control", control}, {"value", 9}, {"within", 20}});
    other.join();
    QVERIFY2(reply.isOk(), qPrintable(reply.message));
}

void ControlWaitTest::waitForALogLineIsPushedWhenItArrives()
{
    QTimer::singleShot(50, &bench->monitor, [this] { QVERIFY(log("the power failed twice")); });
    const auto reply = client->call("wait", {{"log", "power failed"}, {"within", 20}});
    QVERIFY2(reply.isOk(), qPrintable(reply.message));
    QCOMPARE(reply.result, "the power failed twice");
}

void ControlWaitTest::waitForALogLineSeesThoseThatAreThere()
{
    QVERIFY(log("early"));
    QTRY_COMPARE_WITH_TIMEOUT(bench->log.lines().size(), 1, limit);
    QVERIFY(client->call("wait", {{"log", "early"}, {"within", 0}}).isOk());
}

void ControlWaitTest::waitForALogLineAfterAMarkSeesOnlyLaterOnes()
{
    QVERIFY(log("again 1"));
    QTRY_COMPARE_WITH_TIMEOUT(bench->log.lines().size(), 1, limit);
    QVERIFY(!client->call("wait", {{"log", "again"}, {"after", 1}, {"within", 0}}).isOk());
    QTimer::singleShot(50, &bench->monitor, [this] { QVERIFY(log("again 2")); });
    QCOMPARE(client->call("wait", {{"log", "again"}, {"after", 1}, {"within", 20}}).result, "again 2");
}

void ControlWaitTest::waitForARegionWithoutAPicture()
{
    QVERIFY(client->call("wait", {{"region", "trigger"}, {"colour", "none"}, {"within", 0}}).isOk());
    const auto reply = client->call("wait", {{"region", "trigger"}, {"colour", "green"}, {"within", 0.01}});
    QCOMPARE(reply.code, -32000);
    QCOMPARE(reply.data, "none");
}

void ControlWaitTest::waitThatDoesNotComeTrueSaysWhatThereIs()
{
    QElapsedTimer clock;
    clock.start();
    const auto reply = client->call("wait", {{"control", control}, {"value", 1}, {"within", 0.2}});
    QVERIFY(clock.elapsed() >= 180); // its timer is a coarse one
    QCOMPARE(reply.code, -32000);
    QCOMPARE(reply.message, "did not come true within 0.2 s");
    QCOMPARE(reply.data, QJsonValue(4100000));
}

void ControlWaitTest::badWaitIsRefused_data()
{
    QTest::addColumn<QJsonObject>("params");
    QTest::addColumn<QString>("message");
    const QString one = "one of \"region\", \"control\" and \"log\" says what to wait for";
    QTest::addRow("nothing") << QJsonObject{} << one;
    QTest::addRow("two conditions") << QJsonObject{{"log", "x"}, {"control", control}, {"value", 1}} << one;
    QTest::addRow("unknown region") << QJsonObject{{"region", "moon"}, {"colour", "red"}}
                                    << "unknown region \"moon\"; ";
    QTest::addRow("unknown colour") << QJsonObject{{"region", "rtc"}, {"colour", "blue"}}
                                    << "unknown colour \"blue\"; colours: none, green, red, white, other";
    QTest::addRow("unknown control") << QJsonObject{{"control", "moon"}, {"value", 1}} << "unknown control \"moon\"; ";
    QTest::addRow("impossible value") << QJsonObject{{"control", control}, {"value", "x"}}
                                      << "control \"battery.voltage\" takes -2147483648..2147483647 uV";
    QTest::addRow("no text") << QJsonObject{{"log", ""}} << "\"log\" takes a text";
    QTest::addRow("negative time") << QJsonObject{{"log", "x"}, {"within", -1}} << "\"within\" takes 0..86400 seconds";
    QTest::addRow("value of a region") << QJsonObject{{"region", "rtc"}, {"colour", "red"}, {"value", 1}}
                                       << "unknown parameter \"value\"; allowed: region, colour, within";
    QTest::addRow("mark of a control") << QJsonObject{{"control", control}, {"value", 1}, {"after", 1}}
                                       << "unknown parameter \"after\"; allowed: control, value, within";
    QTest::addRow("colour of a log line")
        << QJsonObject{{"log", "x"}, {"colour", "red"}} << "unknown parameter \"colour\"; allowed: log, after, within";
    const QString mark = "\"after\" takes a whole number from 0";
    QTest::addRow("mark that is a text") << QJsonObject{{"log", "x"}, {"after", "1"}} << mark;
    QTest::addRow("mark that is negative") << QJsonObject{{"log", "x"}, {"after", -1}} << mark;
    QTest::addRow("mark with a fraction") << QJsonObject{{"log", "x"}, {"after", 1.5}} << mark;
    QTest::addRow("mark that is a switch") << QJsonObject{{"log", "x"}, {"after", true}} << mark;
    QTest::addRow("no time") << QJsonObject{{"log", "x"}, {"within", "1"}} << "\"within\" takes 0..86400 seconds";
}

void ControlWaitTest::badWaitIsRefused()
{
    QFETCH(const QJsonObject, params);
    QFETCH(const QString, message);
    const auto reply = client->call("wait", params);
    QCOMPARE(reply.code, -32602);
    QVERIFY2(reply.message.startsWith(message), qPrintable(reply.message));
}

void ControlWaitTest::eventsComeForWhatWasSubscribed()
{
    QList<QJsonObject> seen;
    connect(client.get(), &ControlClient::notified, client.get(), [&](const QString& method, const QJsonObject& event) {
        QCOMPARE(method, "event");
        seen.append(event);
    });
    QVERIFY(client->call("events", {{"kinds", QJsonArray{"control", "monitor"}}}).isOk());
    bench->registry.publish(control, 3);
    QVERIFY(log("not asked for"));
    bench->monitor.raise("radio", "command", {{"code", 2}});
    QTRY_COMPARE_WITH_TIMEOUT(seen.size(), 2, limit);
    QCOMPARE(seen[0], (QJsonObject{{"kind", "control"}, {"name", control}, {"value", 3}}));
    QCOMPARE(
        seen[1],
        (QJsonObject{
            {"kind", "monitor"}, {"source", "radio"}, {"event", "command"}, {"details", QJsonObject{{"code", 2}}}}));

    QVERIFY(client->call("events").isOk());
    QVERIFY(log("now asked for"));
    QTRY_COMPARE_WITH_TIMEOUT(seen.size(), 3, limit);
    QCOMPARE(seen[2].value("kind"), "log");
    QCOMPARE(seen[2].value("text"), "now asked for");
    QCOMPARE(seen[2].value("priority"), 4);
    QCOMPARE(seen[2].value("identity"), "VQK");
}

void ControlWaitTest::eventsOfKindsThatAreUnknownAreRefused()
{
    QCOMPARE(client->call("events", {{"kinds", QJsonArray{"weather"}}}).message,
             "\"kinds\" takes an array of: control, log, region, monitor");
    QCOMPARE(client->call("events", {{"kinds", "log"}}).code, -32602);
}

QTEST_GUILESS_MAIN(ControlWaitTest)
#include "ControlWaitTest.moc"
