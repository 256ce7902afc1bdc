// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"
#include "virtual-device/sandbox/DeviceFolder.h"

#include <QRegularExpression>
#include <QTest>

#include <csignal>

using TestSupport::DeviceUnderTest;
using TestSupport::ProgramProcess;
using TestSupport::ScreenHealth;
using namespace std::chrono_literals;

namespace
{

/// From the signal to the end of the program's process. Orderly ends take a second or less, at most three where several
/// devices are dead; the rest is for a loaded machine.
constexpr auto endLimit = 6s;
/// The same where the signal meets the start: less than the two waits, six seconds, that it cuts.
constexpr auto startsEndLimit = 5s;
/// After the program, the virtual device takes its mounts and sockets down.
constexpr int tearDownLimit = 20000;

const QString dspTimedOut = QStringLiteral("Timed out waiting for DSP ACK");

/// The value that a control had last, by the events.
QJsonValue lastValue(const DeviceUnderTest& device, const QString& control)
{
    QJsonValue value;
    for (const auto& event : device.events())
        if (event.value("kind") == "control" && event.value("name") == control)
            value = event.value("value");
    return value;
}

/// The radio's rules have time limits, which a stalled machine breaks; the DSP's have none.
bool brokeTheRulesOfTheDsp(const DeviceUnderTest& device)
{
    return std::any_of(device.events().begin(), device.events().end(), [&](const QJsonObject& event) {
        return event.value("event") == "violation" && event.value("source") == "dsp";
    });
}

bool isMounted(const QString& name)
{
    QFile mounts(QStringLiteral("/proc/self/mountinfo"));
    return mounts.open(QIODevice::ReadOnly) && mounts.readAll().contains('/' + name.toUtf8() + '/');
}

} // namespace

/// All the ways in which a run ends.
class EndSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void lostDspEndsTheLoopByAFatalLineAndTheProgramReturnsZero();
    void terminationSignalEndsTheProgramInOrder_data();
    void terminationSignalEndsTheProgramInOrder();
    void whatEndedInOrderStartsAgainOnTheSameFiles();
    void signalDuringASlowStartCutsItsWaits();
    void signalCutsTheWaitsOfAKey_data();
    void signalCutsTheWaitsOfAKey();
    void secondSignalKillsAProgramThatHangs_data();
    void secondSignalKillsAProgramThatHangs();

private:
    static void checkEnded(DeviceUnderTest& device, int status);
};

/// The virtual device's exit status is the program's, because nobody has asked the device itself to end.
void EndSystemTest::checkEnded(DeviceUnderTest& device, int status)
{
    QTRY_COMPARE_WITH_TIMEOUT(device.process().state(), QProcess::NotRunning, tearDownLimit);
    QCOMPARE(device.process().exitStatus(), QProcess::NormalExit);
    QVERIFY2(device.process().exitCode() == status, qPrintable(device.output()));
    QVERIFY(!QFile::exists(VirtualDevice::DeviceFolder::root() + '/' + device.name()));
    QVERIFY(!isMounted(device.name()));
}

void EndSystemTest::lostDspEndsTheLoopByAFatalLineAndTheProgramReturnsZero()
{
    DeviceUnderTest device;
    REQUIRE(device.start());
    REQUIRE(device.waitControl("dsp.state", "connected"));
    REQUIRE(ScreenHealth::isReached(device)); // the loop runs: the beacon's label is green by a ping of its timer
    const auto program = device.program();
    QVERIFY(program);
    REQUIRE(device.follow());
    REQUIRE(device.set("dsp.presence", "missing"));
    REQUIRE(device.tap("Soft3"));
    QVERIFY(program->endsWithin(30s));
    checkEnded(device, 0);
    QList<QJsonObject> fatal;
    for (const auto& event : device.events())
        if (event.value("kind") == "log" && event.value("priority").toInt() == 0)
            fatal.append(event);
    QVERIFY(!fatal.isEmpty());
    static const QRegularExpression line(
        QRegularExpression::anchoredPattern("Domain/src/DomainLayer/DspPort\\.cpp, \\d+, "
                                            "MSGQ_put\\(this->privateData->dspMessageQueue, "
                                            "message\\.messageQueueMessage\\)\\. Status = 0x[0-9a-f]+"));
    for (const auto& event : std::as_const(fatal)) {
        const QString text = event.value("text").toString();
        QVERIFY2(line.match(text).hasMatch(), qPrintable(text));
        QCOMPARE(event.value("identity").toString(), "VQK");
    }
    QVERIFY(device.programOutput().contains("VQK: " + fatal.front().value("text").toString() + '\n'));
}

void EndSystemTest::terminationSignalEndsTheProgramInOrder_data()
{
    QTest::addColumn<QStringList>("settings");
    QTest::addColumn<QString>("control");
    QTest::addColumn<QJsonValue>("value");
    const auto row = [](const char* name, const QStringList& settings, const char* control = "",
                        const QJsonValue& value = {}) { QTest::addRow("%s", name) << settings << control << value; };
    row("healthy", {});
    row("silent radio", {"radio.ack=off"});
    row("radio that falls silent", {}, "radio.ack", "off");
    row("no radio line", {"radio.presence=missing"});
    row("line that hangs up", {}, "radio.line", "hung-up");
    row("no DSP", {"dsp.presence=missing"});
    row("silent DSP", {"dsp.ack=off"});
    row("DSP link that answers nothing any more", {}, "dsp.replies", false);
    row("DSP that is lost", {}, "dsp.presence", "missing");
    row("no sound card", {"audio.presence=missing"});
    row("broken card", {}, "sd.fault", "EIO");
    row("nobody answers any more", {"radio.ack=off", "dsp.ack=off", "sd.fault=EIO", "log.stalled=true"}, "dsp.replies",
        false);
    row("nothing at all", {"rtc.fault=ENOENT", "usb.hid=off", "sd.present=off", "radio.presence=missing",
                           "dsp.presence=missing", "audio.presence=missing"});
}

/// Two devices at once, one for each signal.
void EndSystemTest::terminationSignalEndsTheProgramInOrder()
{
    QFETCH(const QStringList, settings);
    QFETCH(const QString, control);
    QFETCH(const QJsonValue, value);
    QStringList arguments;
    for (const auto& setting : settings)
        arguments << "--set" << setting;
    std::array<DeviceUnderTest, 2> devices;
    for (auto& device : devices)
        REQUIRE(device.begin(arguments));
    for (auto& device : devices) {
        REQUIRE(device.waitReady());
        REQUIRE(device.waitRegion("trigger", "green"));
        if (!control.isEmpty())
            REQUIRE(device.set(control, value));
        REQUIRE(device.follow());
    }
    for (std::size_t index = 0; index < devices.size(); ++index) {
        auto& device = devices[index];
        const auto program = device.program();
        QVERIFY(program);
        const auto processes = ProgramProcess::descendants(device.process().processId());
        const bool isConnected = device.get("dsp.state") == "connected";
        QVERIFY(program->signal(index == 0 ? SIGTERM : SIGINT));
        QVERIFY(program->endsWithin(endLimit));
        checkEnded(device, 0);
        for (const qint64 process : processes)
            QVERIFY(!ProgramProcess::isRunning(process));
        // The DSP was stopped and given back by its rules.
        if (isConnected)
            QCOMPARE(lastValue(device, "dsp.state"), "off");
        QVERIFY(!brokeTheRulesOfTheDsp(device));
    }
}

void EndSystemTest::whatEndedInOrderStartsAgainOnTheSameFiles()
{
    DeviceUnderTest device;
    for (int run = 0; run < 2; ++run) {
        REQUIRE(device.start());
        REQUIRE(ScreenHealth::isReached(device));
        const auto program = device.program();
        QVERIFY(program && program->signal(SIGTERM));
        QVERIFY(program->endsWithin(endLimit));
        checkEnded(device, 0);
    }
}

/// The first commands to a silent radio are waited for before the loop runs, three seconds each.
void EndSystemTest::signalDuringASlowStartCutsItsWaits()
{
    DeviceUnderTest device;
    REQUIRE(device.begin({"--set", "radio.ack=off"}));
    REQUIRE(device.waitLog("DspPort: open complete."));
    const auto program = device.program();
    QVERIFY(program);
    QVERIFY(program->signal(SIGTERM));
    QVERIFY(program->endsWithin(startsEndLimit));
    checkEnded(device, 0);
}

void EndSystemTest::signalCutsTheWaitsOfAKey_data()
{
    QTest::addColumn<int>("signal");
    QTest::addRow("SIGTERM") << SIGTERM;
    QTest::addRow("SIGINT") << SIGINT;
}

/// With a silent radio and a silent DSP the antenna key alone would take fifteen seconds.
void EndSystemTest::signalCutsTheWaitsOfAKey()
{
    QFETCH(const int, signal);
    DeviceUnderTest device;
    REQUIRE(device.start());
    REQUIRE(ScreenHealth::isReached(device));
    const auto program = device.program();
    QVERIFY(program);
    REQUIRE(device.set("radio.ack", "off"));
    REQUIRE(device.set("dsp.ack", "off"));
    REQUIRE(device.follow());
    const qint64 mark = device.logMark();
    REQUIRE(device.press("Soft3"));
    REQUIRE(device.waitLog(dspTimedOut, DeviceUnderTest::usual, mark));
    QVERIFY(program->signal(signal));
    QVERIFY(program->endsWithin(endLimit));
    checkEnded(device, 0);
    // The key's fourth command of the DSP, its last command at all, was not waited for: the signal came meanwhile.
    const auto waits = std::count_if(device.events().begin(), device.events().end(), [](const QJsonObject& event) {
        return event.value("kind") == "log" && event.value("text").toString().contains(dspTimedOut);
    });
    QVERIFY2(waits > 0 && waits < 4, qPrintable(QString::number(waits)));
}

void EndSystemTest::secondSignalKillsAProgramThatHangs_data()
{
    QTest::addColumn<int>("second");
    QTest::addRow("SIGTERM") << SIGTERM;
    QTest::addRow("SIGINT") << SIGINT;
}

/// A DSP whose firmware never makes its queue keeps the start waiting for ever.
void EndSystemTest::secondSignalKillsAProgramThatHangs()
{
    QFETCH(const int, second);
    DeviceUnderTest device;
    REQUIRE(device.begin({"--set", "dsp.locate=never"}));
    REQUIRE(device.waitLog("DspLink: DSP execution started successfully."));
    const auto program = device.program();
    QVERIFY(program);
    QVERIFY(program->catches(SIGTERM) && program->catches(SIGINT));
    QVERIFY(program->signal(SIGTERM));
    QTRY_VERIFY_WITH_TIMEOUT(!program->catches(SIGTERM) && !program->catches(SIGINT), 20000);
    QVERIFY(!program->endsWithin(0ms));
    QVERIFY(program->signal(second));
    QVERIFY(program->endsWithin(endLimit));
    checkEnded(device, 128 + second);
}

QTEST_GUILESS_MAIN(EndSystemTest)
#include "EndSystemTest.moc"
