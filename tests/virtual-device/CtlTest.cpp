// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/ControlBench.h"
#include "virtual-device/control/CtlParser.h"
#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Values.h"
#include "virtual-device/sandbox/DeviceFolder.h"
#include "virtual-device/screen/KeyTable.h"
#include "virtual-device/screen/RegionMap.h"

#include <QDir>
#include <QFile>
#include <QJsonArray>
#include <QJsonDocument>
#include <QLocalServer>
#include <QProcess>
#include <QTest>
#include <QTimer>

#include <memory>

using namespace VirtualDevice;
using TestSupport::ControlBench;

namespace
{

constexpr int limit = 60000;

QString program()
{
    return qEnvironmentVariable("IMMUNITYRIG_BUILD") + "/virtual-device/virtual-device";
}

struct Result
{
    int status = -1;
    QString output;
    QString error;
};

/// `virtual-device ctl` as a process of its own, while this one goes on serving.
class Ctl
{
public:
    Ctl(const QStringList& arguments, const QString& socket)
    {
        auto environment = QProcessEnvironment::systemEnvironment();
        if (socket.isEmpty())
            environment.remove("VIRTUAL_DEVICE_CONTROL");
        else
            environment.insert("VIRTUAL_DEVICE_CONTROL", socket);
        process.setProcessEnvironment(environment);
        process.start(program(), QStringList("ctl") + arguments);
    }

    bool waitForOutput(const QString& text)
    {
        return QTest::qWaitFor(
            [&] {
                written += process.readAllStandardOutput();
                return written.contains(text.toUtf8());
            },
            limit);
    }

    Result finish()
    {
        if (!QTest::qWaitFor([&] { return process.state() == QProcess::NotRunning; }, limit))
            return {};
        written += process.readAllStandardOutput();
        return {process.exitStatus() == QProcess::NormalExit ? process.exitCode() : -1, QString::fromUtf8(written),
                QString::fromUtf8(process.readAllStandardError())};
    }

    QProcess process;
    QByteArray written;
};

} // namespace

class CtlTest : public QObject
{
    Q_OBJECT

private slots:
    void init() { bench = std::make_unique<ControlBench>(); }
    void cleanup() { bench.reset(); }

    void getPrintsTheValueAlone();
    void getPrintsEveryTypeAsOneWouldTypeIt();
    void setIsSilent();
    void negativeNumberIsAValueAndNoOption();
    void refusalIsOneLineOnTheErrorOutput_data();
    void refusalIsOneLineOnTheErrorOutput();
    void wrongUseIsFoundBeforeAnyDeviceIsAsked_data();
    void wrongUseIsFoundBeforeAnyDeviceIsAsked();
    void helpIsNoError();
    void listShowsValueAndRange();
    void regionsShowsNameAndColour();
    void jsonIsTheWholeResult();
    void waitEndsWithZeroWhenItComesTrue();
    void waitEndsWithOneWhenItDoesNotInTime();
    void waitEndsWithOneWhenTheDeviceGoes();
    void deviceThatDoesNotAnswerIsNotWaitedForWithoutEnd();
    void waitForALogText();
    void logPrintsWhatIsThere();
    void logFollowPrintsEachLineOnceAndEndsWithTheDevice();
    void logFollowEndsWhenNobodyReadsIt();
    void eventsArePrintedAsTheyCome();
    void onlyRunningDeviceIsFoundByItself();
    void withoutADeviceItSaysSo();
    void amongSeveralDevicesOneMustBeNamed();
    void optionsMayStandAnywhere();

private:
    [[nodiscard]] Result ctl(const QStringList& arguments) const
    {
        return Ctl(arguments, bench->socketPath()).finish();
    }
    [[nodiscard]] bool log(const QByteArray& text) const
    {
        return TestSupport::sendLog(bench->logPath(), "<12>Jan  1 00:00:00 VQK: " + text);
    }

    std::unique_ptr<ControlBench> bench;
};

void CtlTest::getPrintsTheValueAlone()
{
    const auto result = ctl({"get", "battery.voltage"});
    QCOMPARE(result.status, 0);
    QCOMPARE(result.output, "4100000\n");
    QCOMPARE(result.error, "");
}

void CtlTest::getPrintsEveryTypeAsOneWouldTypeIt()
{
    QCOMPARE(ctl({"get", "usb.hid"}).output, "true\n");
    QCOMPARE(ctl({"get", "rtc.fault"}).output, "none\n");
    QCOMPARE(ctl({"get", "led.written"}).output, "\n");
}

void CtlTest::setIsSilent()
{
    for (const auto& [name, word, value] :
         {std::tuple{"battery.voltage", "3600000", QJsonValue(3600000)},
          std::tuple{"usb.hid", "off", QJsonValue(false)}, std::tuple{"rtc.fault", "EIO", QJsonValue("EIO")}}) {
        const auto result = ctl({"set", name, word});
        QCOMPARE(result.error, "");
        QCOMPARE(result.output, "");
        QCOMPARE(result.status, 0);
        QCOMPARE(bench->registry.value(name), value);
    }
}

void CtlTest::negativeNumberIsAValueAndNoOption()
{
    QCOMPARE(ctl({"set", "battery.current", "-98765"}).status, 0);
    QCOMPARE(bench->registry.integer("battery.current"), -98765);
    QCOMPARE(ctl({"wait", "control", "battery.current", "-98765", "--within", "0"}).status, 0);
}

void CtlTest::refusalIsOneLineOnTheErrorOutput_data()
{
    QTest::addColumn<QStringList>("arguments");
    QTest::addColumn<QString>("error");
    QTest::addRow("unknown control") << QStringList{"get", "batery"}
                                     << "unknown control \"batery\"; controls: battery.";
    QTest::addRow("out of range") << QStringList{"set", "battery.voltage", "2147483648"}
                                  << "control \"battery.voltage\" takes -2147483648..2147483647 uV\n";
    QTest::addRow("no number") << QStringList{"set", "battery.voltage", "high"}
                               << "control \"battery.voltage\" takes -2147483648..2147483647 uV\n";
    QTest::addRow("no switch") << QStringList{"set", "usb.hid", "maybe"} << "control \"usb.hid\" takes true or false\n";
    QTest::addRow("read only") << QStringList{"set", "led.power_latch", "1"}
                               << "control \"led.power_latch\" is read only\n";
    QTest::addRow("unknown key") << QStringList{"press", "F99"} << "unknown key \"F99\"; keys: ";
    QTest::addRow("no window") << QStringList{"press", "F5"} << "the program shows no window\n";
    QTest::addRow("no picture") << QStringList{"screenshot", "x.png"} << "the program shows no window\n";
    QTest::addRow("no duration") << QStringList{"hold", "F5", "long"} << "\"milliseconds\" takes 1..600000\n";
    QTest::addRow("negative duration") << QStringList{"hold", "F5", "-1"} << "\"milliseconds\" takes 1..600000\n";
    QTest::addRow("unknown region") << QStringList{"wait", "region", "moon", "red"}
                                    << "unknown region \"moon\"; regions: ";
    QTest::addRow("unknown colour") << QStringList{"wait", "region", "rtc", "blue"}
                                    << "unknown colour \"blue\"; colours: none, green, red, white, other\n";
}

void CtlTest::refusalIsOneLineOnTheErrorOutput()
{
    QFETCH(const QStringList, arguments);
    QFETCH(const QString, error);
    const auto result = ctl(arguments);
    QCOMPARE(result.status, 2);
    QCOMPARE(result.output, "");
    QVERIFY2(result.error.startsWith("virtual-device ctl: " + error), qPrintable(result.error));
    QCOMPARE(result.error.count('\n'), 1);
    QVERIFY(!QFile::exists("x.png"));
}

void CtlTest::wrongUseIsFoundBeforeAnyDeviceIsAsked_data()
{
    QTest::addColumn<QStringList>("arguments");
    QTest::addColumn<QString>("problem");
    QTest::addRow("unknown command") << QStringList{"gett"}
                                     << "unknown command \"gett\"; commands: list, get, set, press, release, hold, "
                                        "screenshot, regions, log, events, wait";
    QTest::addRow("name missing") << QStringList{"get"} << "usage: get NAME";
    QTest::addRow("word too many") << QStringList{"get", "a", "b"} << "usage: get NAME";
    QTest::addRow("value missing") << QStringList{"set", "battery.voltage"} << "usage: set NAME VALUE";
    QTest::addRow("time missing") << QStringList{"hold", "F5"} << "usage: hold KEY MILLISECONDS";
    QTest::addRow("file missing") << QStringList{"screenshot"} << "usage: screenshot FILE.png";
    QTest::addRow("wait for nothing") << QStringList{"wait"}
                                      << "usage: wait region NAME COLOUR | control NAME VALUE | log TEXT";
    QTest::addRow("wait for the weather")
        << QStringList{"wait", "weather", "fine"} << "usage: wait region NAME COLOUR | control NAME VALUE | log TEXT";
    QTest::addRow("no seconds") << QStringList{"wait", "log", "x", "--within", "soon"}
                                << "--within takes a number of seconds";
    QTest::addRow("unknown option") << QStringList{"list", "--all"} << "Unknown option 'all'.";
}

void CtlTest::wrongUseIsFoundBeforeAnyDeviceIsAsked()
{
    QFETCH(const QStringList, arguments);
    QFETCH(const QString, problem);
    QCOMPARE(parseCtl(arguments).problem, problem);
    const auto result = Ctl(arguments, "/nowhere").finish();
    QCOMPARE(result.status, 2);
    QCOMPARE(result.error, "virtual-device ctl: " + problem + "\n");
}

void CtlTest::helpIsNoError()
{
    const auto result = Ctl({"--help"}, "/nowhere").finish();
    QCOMPARE(result.status, 0);
    QVERIFY(result.output.startsWith("usage: virtual-device ctl "));
    for (const auto& key : KeyTable::names())
        QVERIFY2(result.output.contains(key), qPrintable(key));
    for (const auto& region : RegionMap::names())
        QVERIFY2(result.output.contains("\n    " + region + ' '), qPrintable(region));
    for (const auto& spec : controlTable())
        QVERIFY2(result.output.contains("\n    " + fromView(spec.name) + ' '), spec.name.data());
    QCOMPARE(Ctl({}, "/nowhere").finish().status, 2);
}

void CtlTest::listShowsValueAndRange()
{
    const auto lines = ctl({"list"}).output.split('\n');
    QVERIFY2(lines.contains("battery.voltage              4100000              -2147483648..2147483647 uV"),
             qPrintable(lines.join('\n')));
    QVERIFY(lines.contains("led.power_latch              0                    read only"));
}

void CtlTest::regionsShowsNameAndColour()
{
    const auto result = ctl({"regions"});
    QCOMPARE(result.output.count('\n'), RegionMap::names().size());
    QVERIFY(result.output.startsWith("rtc                  none\n"));
}

void CtlTest::jsonIsTheWholeResult()
{
    QCOMPARE(ctl({"--json", "get", "battery.voltage"}).output, "4100000\n");
    QCOMPARE(ctl({"get", "rtc.fault", "--json"}).output, "\"none\"\n");
    QCOMPARE(ctl({"set", "usb.hid", "off", "--json"}).output, "false\n");
    const auto rows = QJsonDocument::fromJson(ctl({"list", "--json"}).output.toUtf8()).array();
    QCOMPARE(rows.first().toObject().value("name"), "battery.voltage");
    QCOMPARE(rows.first().toObject().value("value"), 4100000);
}

void CtlTest::waitEndsWithZeroWhenItComesTrue()
{
    Ctl waiting({"wait", "control", "battery.voltage", "5", "--within", "20"}, bench->socketPath());
    QTimer::singleShot(300, &bench->monitor, [this] { bench->registry.publish("battery.voltage", 5); });
    const auto result = waiting.finish();
    QCOMPARE(result.error, "");
    QCOMPARE(result.output, "");
    QCOMPARE(result.status, 0);
    QCOMPARE(ctl({"wait", "region", "rtc", "none"}).status, 0);
}

void CtlTest::waitEndsWithOneWhenItDoesNotInTime()
{
    const auto result = ctl({"wait", "region", "rtc", "red", "--within", "0.1"});
    QCOMPARE(result.status, 1);
    QCOMPARE(result.output, "");
    QCOMPARE(result.error, "virtual-device ctl: did not come true within 0.1 s\n");
}

void CtlTest::waitEndsWithOneWhenTheDeviceGoes()
{
    Ctl waiting({"wait", "log", "never", "--within", "60"}, bench->socketPath());
    QVERIFY(QTest::qWaitFor([this] { return !bench->server.children().isEmpty(); }, limit));
    QTimer::singleShot(300, &bench->monitor, [this] { bench->server.close(); });
    QCOMPARE(waiting.finish().status, 1);
}

/// It is there, but stopped.
void CtlTest::deviceThatDoesNotAnswerIsNotWaitedForWithoutEnd()
{
    QLocalServer silent;
    const QString socket = QDir::tempPath() + "/silent";
    QVERIFY(silent.listen(socket));
    Ctl get({"get", "usb.hid"}, socket);
    Ctl hold({"hold", "F5", "10"}, socket);
    Ctl wait({"wait", "log", "x", "--within", "0.1"}, socket);
    for (auto [ctl, status] : {std::pair{&get, 2}, std::pair{&hold, 2}, std::pair{&wait, 1}}) {
        const auto result = ctl->finish();
        QCOMPARE(result.status, status);
        QCOMPARE(result.error, "virtual-device ctl: the virtual device did not answer\n");
    }
}

void CtlTest::waitForALogText()
{
    Ctl waiting({"wait", "log", "power failed", "--within", "20"}, bench->socketPath());
    QVERIFY(log("the power failed"));
    QCOMPARE(waiting.finish().status, 0);
    QCOMPARE(ctl({"wait", "log", "nothing like it", "--within", "0"}).status, 1);
}

void CtlTest::logPrintsWhatIsThere()
{
    QVERIFY(log("a.cpp, 5, something"));
    QTRY_COMPARE_WITH_TIMEOUT(bench->log.lines().size(), 1, limit);
    const auto result = ctl({"log"});
    QVERIFY2(result.output.endsWith("Z warning VQK: a.cpp, 5, something\n"), qPrintable(result.output));
    QCOMPARE(result.output.count('\n'), 1);
}

void CtlTest::logFollowPrintsEachLineOnceAndEndsWithTheDevice()
{
    QVERIFY(log("line 1."));
    QTRY_COMPARE_WITH_TIMEOUT(bench->log.lines().size(), 1, limit);
    Ctl following({"log", "--follow"}, bench->socketPath());
    for (int number = 2; number <= 100; ++number) {
        QVERIFY(log("line " + QByteArray::number(number) + '.'));
        QCoreApplication::processEvents();
    }
    QVERIFY(following.waitForOutput("line 100."));
    bench->server.close();
    const auto result = following.finish();
    QCOMPARE(result.status, 0);
    QCOMPARE(result.output.count('\n'), 100);
    for (int number = 1; number <= 100; ++number)
        QCOMPARE(result.output.count(QString("line %1.").arg(number)), 1);
}

void CtlTest::logFollowEndsWhenNobodyReadsIt()
{
    QVERIFY(log("line 1."));
    auto environment = QProcessEnvironment::systemEnvironment();
    environment.insert("VIRTUAL_DEVICE_CONTROL", bench->socketPath());
    QProcess shell;
    shell.setProcessEnvironment(environment);
    // The shell waits for both.
    shell.start("sh", {"-c", "\"$0\" ctl log --follow | head -n 1", program()});
    QVERIFY(QTest::qWaitFor(
        [&] {
            static_cast<void>(log("more"));
            return shell.state() == QProcess::NotRunning;
        },
        limit));
    QVERIFY(shell.readAllStandardOutput().endsWith("VQK: line 1.\n"));
}

void CtlTest::eventsArePrintedAsTheyCome()
{
    Ctl watching({"events"}, bench->socketPath());
    int value = 0;
    // The subscription takes effect some time after the start.
    QVERIFY(QTest::qWaitFor(
        [&] {
            bench->registry.publish("battery.voltage", ++value);
            watching.written += watching.process.readAllStandardOutput();
            return watching.written.contains("control battery.voltage ");
        },
        limit));
    bench->monitor.raise("radio", "violation", {{"what", "noise"}});
    QVERIFY(watching.waitForOutput("monitor radio violation {\"what\":\"noise\"}\n"));
    QVERIFY(log("hello"));
    QVERIFY(watching.waitForOutput("warning VQK: hello\n"));
    bench->server.close();
    QCOMPARE(watching.finish().status, 0);
}

void CtlTest::onlyRunningDeviceIsFoundByItself()
{
    DeviceFolder folder;
    QVERIFY(!folder.claim("alone"));
    bench->server.close();
    QVERIFY(!bench->server.listen(DeviceFolder::controlSocket("alone")));
    QCOMPARE(Ctl({"get", "battery.voltage"}, {}).finish().output, "4100000\n");
    QCOMPARE(Ctl({"--device", "alone", "get", "battery.voltage"}, "/nowhere").finish().output, "4100000\n");
}

void CtlTest::withoutADeviceItSaysSo()
{
    const auto none = Ctl({"list"}, {}).finish();
    QCOMPARE(none.status, 2);
    QCOMPARE(none.error, "virtual-device ctl: no virtual device is running: start one with \"virtual-device run\"\n");
    const auto gone = Ctl({"list"}, "/nowhere").finish();
    QCOMPARE(gone.status, 2);
    QVERIFY2(gone.error.startsWith("virtual-device ctl: cannot reach the virtual device at /nowhere: "),
             qPrintable(gone.error));
}

void CtlTest::amongSeveralDevicesOneMustBeNamed()
{
    DeviceFolder first;
    DeviceFolder second;
    QVERIFY(!first.claim("one"));
    QVERIFY(!second.claim("two"));
    const auto unnamed = Ctl({"list"}, {}).finish();
    QCOMPARE(unnamed.status, 2);
    QCOMPARE(unnamed.error,
             "virtual-device ctl: several virtual devices are running: choose one with --device: one, two\n");
    const auto third = Ctl({"list", "--device", "three"}, {}).finish();
    QCOMPARE(third.status, 2);
    QCOMPARE(third.error, "virtual-device ctl: no virtual device \"three\" is running; running: one, two\n");
}

void CtlTest::optionsMayStandAnywhere()
{
    const auto request = parseCtl({"wait", "--within", "2.5", "control", "a.b", "-5", "--json", "--device", "x"});
    QCOMPARE(request.problem, "");
    QCOMPARE(request.command, "wait");
    QCOMPARE(request.words, (QStringList{"control", "a.b", "-5"}));
    QCOMPARE(request.within, 2.5);
    QCOMPARE(request.device, "x");
    QVERIFY(request.isJson);
    QVERIFY(!request.follows);
    QCOMPARE(parseCtl({"wait", "log", "--", "--follow"}).words, (QStringList{"log", "--follow"}));
}

QTEST_GUILESS_MAIN(CtlTest)
#include "CtlTest.moc"
