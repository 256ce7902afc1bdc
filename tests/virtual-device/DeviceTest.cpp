// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/Device.h"

#include "tests/virtual-device/FuseTest.h"
#include "virtual-device/tree/Mounts.h"

#include <QDir>
#include <QFileInfo>
#include <QJsonDocument>
#include <QJsonObject>
#include <QLocalSocket>
#include <QSignalSpy>
#include <QTcpServer>
#include <QTcpSocket>
#include <QTemporaryDir>
#include <QTest>

#include <csignal>
#include <memory>

using VirtualDevice::Device;
using VirtualDevice::DeviceFolder;
using VirtualDevice::DeviceOptions;

namespace
{

constexpr int limit = 30'000; // ms

DeviceOptions shell(const QString& script, const QStringList& settings = {})
{
    DeviceOptions options;
    options.command = QStringList{"sh", "-c", script};
    options.isOwnCommand = true;
    options.settings = settings;
    return options;
}

DeviceOptions window()
{
    DeviceOptions options;
    options.command = QStringList{WINDOW_PROGRAM};
    options.readOnlyFolders = QStringList{QFileInfo(WINDOW_PROGRAM).path()};
    return options;
}

/// The exit status of the device's command, -1 when it did not start or end.
int statusOf(Device& device)
{
    QSignalSpy ended(&device, &Device::ended);
    if (const auto problem = device.start()) {
        qWarning("%s", qPrintable(*problem));
        return -1;
    }
    return ended.isEmpty() && !ended.wait(limit) ? -1 : ended.at(0).at(0).toInt();
}

int statusOf(const DeviceOptions& options)
{
    Device device(options);
    return statusOf(device);
}

bool stands(Device& device)
{
    QSignalSpy ready(&device, &Device::ready);
    const auto problem = device.start();
    if (problem)
        qWarning("%s", qPrintable(*problem));
    return !problem && ready.wait(limit);
}

} // namespace

class DeviceTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();
    void surroundings_data();
    void surroundings();
    void clockAnswersThroughTheBind();
    void clockFailsThroughTheBind();
    void settingsHoldBeforeTheStart();
    void settingThatIsWrongStartsNothing_data();
    void settingThatIsWrongStartsNothing();
    void valuesAreLiveWhileTheCommandRuns();
    void dataPartitionTurnsReadOnlyWhileTheCommandRuns();
    void logLinesArriveWithPriorityAndIdentity();
    void stalledLogReadsNothing();
    void resetLineResetsTheRadio();
    void brokenRulesAreMonitorEvents_data();
    void brokenRulesAreMonitorEvents();
    void absentRadioHasNoSerialDevice();
    void stateFolderIsKept();
    void ownStateGoesWithTheDevice();
    void windowStandsAndItsScreenIsReachableOnThisMachineAlone();
    void outputOfTheProgramIsKept();
    void endlessOutputIsKeptUpToALimit();
    void programThatIsAskedEnds();
    void programThatRefusesToEndIsKilled();
    void programThatIsKilledTakesTheDeviceDown();
    void deviceThatGoesTakesItsProgramAlong();
    void deviceThatHasEndedLeavesTheNextOneOfItsNameAlone();
    void devicesStandSideBySide();
    void portThatIsTakenIsReportedAndNothingIsLeft();
    void stateThatCannotBeMadeIsReportedAndNothingIsLeft();

private:
    std::unique_ptr<QTemporaryDir> runtime;
};

void DeviceTest::init()
{
    REQUIRE_FUSE();
    runtime = std::make_unique<QTemporaryDir>();
    qputenv("XDG_RUNTIME_DIR", runtime->path().toLocal8Bit());
}

/// Whatever a test did: nothing of its devices is left.
void DeviceTest::cleanup()
{
    if (!runtime)
        return;
    QVERIFY(VirtualDevice::mountedBelow(runtime->path()).isEmpty());
    QVERIFY(QDir(DeviceFolder::root()).isEmpty());
    runtime.reset();
}

void DeviceTest::surroundings_data()
{
    QTest::addColumn<QString>("script");
    QTest::addRow("working directory") << "test \"$(pwd)\" = /";
    QTest::addRow("ordinary user") << "test \"$(id -u)\" = 1000";
    QTest::addRow("no capability") << "grep -q '^CapEff:.0*$' /proc/self/status";
    QTest::addRow("relative gauge path") << "grep -qx 4100000 sys/class/power_supply/ds2780-battery.0/voltage_now";
    QTest::addRow("relative HID path") << "test -d sys/bus/usb/devices/1-1.4";
    QTest::addRow("private folder for temporary files") << "test -z \"$(ls -A /tmp)\"";
    QTest::addRow("private system tree") << "test \"$(echo $(ls /sys))\" = 'block bus class devices'";
    QTest::addRow("network of its own") << "test \"$(grep -c : /proc/net/dev)\" = 1";
    QTest::addRow("processes of its own") << "test \"$(ls -d /proc/[0-9]* | wc -l)\" -lt 6";
    QTest::addRow("libraries cannot be written") << "! touch /usr/x 2>/dev/null";
    QTest::addRow("no FUSE device") << "! test -e /dev/fuse";
    QTest::addRow("null device") << "echo x >/dev/null";
    QTest::addRow("writable folders") << "touch /mnt/boot/x /mnt/data/x /mnt/sysdata/x /etc/sounds/x";
    QTest::addRow("firmware image") << "test -s /dsp.out";
    QTest::addRow("test sound") << "test -s /etc/sounds/TestSound.wav";
    QTest::addRow("serial line is a terminal") << "stty -F /dev/ttyS1 >/dev/null";
    QTest::addRow("locale and zone") << "test $LC_ALL = C.UTF-8 && test $TZ = UTC";
    QTest::addRow("runtime folder") << "test \"$(stat -c %a $XDG_RUNTIME_DIR)\" = 700";
    QTest::addRow("platform of an own command") << "test $QT_QPA_PLATFORM = offscreen";
    QTest::addRow("control socket is named") << "test -n \"$VIRTUAL_DEVICE_CONTROL\"";
    QTest::addRow("fonts") << "ls /etc/fonts/fonts.conf >/dev/null";
}

void DeviceTest::surroundings()
{
    QFETCH(const QString, script);
    QCOMPARE(statusOf(shell(script)), 0);
}

void DeviceTest::clockAnswersThroughTheBind()
{
    auto options = shell(QStringLiteral("test \"$(%1)\" = '2001-9-9 1:46'").arg(CLOCK_PROBE),
                         {"rtc.time=1000000000", "rtc.running=off"});
    options.readOnlyFolders = QStringList{QFileInfo(CLOCK_PROBE).path()};
    QCOMPARE(statusOf(options), 0);
}

void DeviceTest::clockFailsThroughTheBind()
{
    auto options = shell(CLOCK_PROBE, {"rtc.fault=EIO"});
    options.readOnlyFolders = QStringList{QFileInfo(CLOCK_PROBE).path()};
    QCOMPARE(statusOf(options), EIO);
    options.settings = QStringList{"rtc.fault=ENOENT"};
    QCOMPARE(statusOf(options), ENOENT);
}

void DeviceTest::settingsHoldBeforeTheStart()
{
    const QString script = QStringLiteral("grep -qx -- -5 sys/class/power_supply/ds2780-battery.0/current_now && "
                                          "! test -e /sys/block/mmcblk0 && ! ls /mnt/data");
    QCOMPARE(statusOf(shell(script, {"battery.current=-5", "sd.present=off", "sd.fault=EIO"})), 0);
}

void DeviceTest::settingThatIsWrongStartsNothing_data()
{
    QTest::addColumn<QString>("setting");
    QTest::addColumn<QString>("problem");
    QTest::addRow("unknown") << "nothing=1"
                             << "unknown control \"nothing\"";
    QTest::addRow("no value") << "usb.hid"
                              << "control \"usb.hid\" takes true or false";
    QTest::addRow("out of range") << "battery.voltage=3000000000"
                                  << "control \"battery.voltage\" takes -2147483648..2147483647 uV";
    QTest::addRow("reported") << "led.power_latch=1"
                              << "control \"led.power_latch\" is read only";
}

void DeviceTest::settingThatIsWrongStartsNothing()
{
    QFETCH(const QString, setting);
    QFETCH(const QString, problem);
    Device device(shell("true", {setting}));
    QCOMPARE(device.start(), problem);
}

void DeviceTest::valuesAreLiveWhileTheCommandRuns()
{
    Device device(shell("until grep -qx 7 sys/class/power_supply/ds2780-battery.0/voltage_now; do :; done"));
    QSignalSpy ended(&device, &Device::ended);
    QCOMPARE(device.start(), std::nullopt);
    QCOMPARE(device.registry().set("battery.voltage", 7), std::nullopt);
    QVERIFY(ended.wait(limit));
    QCOMPARE(ended.at(0).at(0).toInt(), 0);
}

void DeviceTest::dataPartitionTurnsReadOnlyWhileTheCommandRuns()
{
    Device device(shell("touch /mnt/data/a; while touch /mnt/data/b 2>/dev/null; do :; done; ! rm /mnt/data/a"));
    QSignalSpy ended(&device, &Device::ended);
    QCOMPARE(device.start(), std::nullopt);
    QVERIFY(QTest::qWaitFor([&] { return QFileInfo::exists(device.stateFolder() + "/mnt/data/b"); }, limit));
    QCOMPARE(device.registry().set("sd.readonly", true), std::nullopt);
    QVERIFY(ended.wait(limit));
    QCOMPARE(ended.at(0).at(0).toInt(), 0);
}

void DeviceTest::logLinesArriveWithPriorityAndIdentity()
{
    Device device(shell("logger -t VQK -p user.warning one; logger -t VQK -p user.emerg two"));
    QCOMPARE(statusOf(device), 0);
    const auto lines = device.log().lines();
    QCOMPARE(lines.size(), 2);
    QCOMPARE(lines[0].priority, 4);
    QCOMPARE(lines[0].facility, 1);
    QCOMPARE(lines[0].identity, "VQK");
    QCOMPARE(lines[0].text, "one");
    QCOMPARE(lines[1].priority, 0);
    QCOMPARE(lines[1].text, "two");
}

void DeviceTest::stalledLogReadsNothing()
{
    Device device(shell("logger one", {"log.stalled=on"}));
    QCOMPARE(statusOf(device), 0);
    QVERIFY(device.log().lines().isEmpty());
}

void DeviceTest::resetLineResetsTheRadio()
{
    Device device(shell("printf 1 >/sys/class/misc/msp430/reset; sleep 0.2"));
    QCOMPARE(statusOf(device), 0);
    QCOMPARE(device.registry().integer("reset_line.writes"), 1);
    QTRY_COMPARE_WITH_TIMEOUT(device.registry().integer("radio.resets"), 1, limit);
}

void DeviceTest::brokenRulesAreMonitorEvents_data()
{
    QTest::addColumn<QString>("act");
    QTest::addColumn<QString>("source");
    QTest::addColumn<QString>("what");
    QTest::addRow("a start of the DSP before everything else")
        << "printf '\\004\\0\\0\\0\\001\\0\\0\\0' | socat - UNIX-CONNECT:/dev/dsplink,type=5"
        << "dsp"
        << "start out of order";
    QTest::addRow("a command that the radio does not know")
        << "printf '|\\0\\001\\0\\231\\001\\026\\231\\n' >/dev/ttyS1"
        << "radio"
        << "unknown command 0x99";
}

void DeviceTest::brokenRulesAreMonitorEvents()
{
    QFETCH(const QString, act);
    QFETCH(const QString, source);
    QFETCH(const QString, what);
    // Once the listener is there.
    Device device(shell(QStringLiteral("until test -e /mnt/boot/go; do sleep 0.05; done; %1; sleep 60").arg(act)));
    QCOMPARE(device.start(), std::nullopt);
    QLocalSocket listener;
    listener.connectToServer(device.controlSocket());
    QTRY_COMPARE_WITH_TIMEOUT(listener.state(), QLocalSocket::ConnectedState, limit);
    listener.write(R"({"jsonrpc":"2.0","id":1,"method":"events","params":{"kinds":["monitor"]}})"
                   "\n");
    QTRY_VERIFY_WITH_TIMEOUT(listener.canReadLine(), limit);
    (void)listener.readLine();
    QFile go(device.stateFolder() + "/mnt/boot/go");
    QVERIFY(go.open(QIODevice::WriteOnly));
    QTRY_VERIFY_WITH_TIMEOUT(listener.canReadLine(), limit);
    const auto event = QJsonDocument::fromJson(listener.readLine()).object()["params"].toObject();
    QCOMPARE(event, (QJsonObject{{"kind", "monitor"},
                                 {"source", source},
                                 {"event", "violation"},
                                 {"details", QJsonObject{{"what", what}}}}));
}

void DeviceTest::absentRadioHasNoSerialDevice()
{
    QCOMPARE(statusOf(shell("! test -e /dev/ttyS1", {"radio.presence=missing"})), 0);
}

void DeviceTest::stateFolderIsKept()
{
    const QTemporaryDir state;
    auto options = shell("echo kept >/mnt/data/file; echo kept >/mnt/sysdata/file");
    options.stateFolder = state.path();
    QCOMPARE(statusOf(options), 0);
    QVERIFY(QFileInfo::exists(state.filePath("mnt/data/file")));
    QVERIFY(QFileInfo::exists(state.filePath("mnt/sysdata/file")));
    options.command.last() = "grep -q kept /mnt/data/file";
    QCOMPARE(statusOf(options), 0);
}

void DeviceTest::ownStateGoesWithTheDevice()
{
    Device device(shell("mkdir -p /mnt/boot/x/y; touch /mnt/boot/x/y/z; chmod 0500 /mnt/boot/x/y"));
    QCOMPARE(statusOf(device), 0);
    QVERIFY(!QFileInfo::exists(device.stateFolder()));
}

void DeviceTest::windowStandsAndItsScreenIsReachableOnThisMachineAlone()
{
    Device device(window());
    QVERIFY(stands(device));
    const QStringList address = device.vncAddress().split(':');
    QCOMPARE(address.at(0), "127.0.0.1");
    for (int viewer = 0; viewer < 3; ++viewer) {
        QTcpSocket socket;
        socket.connectToHost(address.at(0), address.at(1).toUShort());
        QVERIFY(QTest::qWaitFor([&] { return socket.bytesAvailable() >= 12; }, limit));
        QCOMPARE(socket.read(12), "RFB 003.003\n");
    }
}

void DeviceTest::outputOfTheProgramIsKept()
{
    Device device(window());
    QVERIFY(stands(device));
    QTRY_VERIFY_WITH_TIMEOUT(device.program().output().contains("window program in vnc"), limit);
}

void DeviceTest::endlessOutputIsKeptUpToALimit()
{
    using VirtualDevice::Sandbox;
    DeviceOptions options = shell("head -c 50000000 /dev/zero | tr '\\0' x");
    options.isOwnCommand = false;
    Device device(options);
    QCOMPARE(statusOf(device), 0);
    qsizetype kept = 0;
    for (const auto& line : device.program().output())
        kept += line.size();
    QVERIFY2(kept <= Sandbox::largestOutput, qPrintable(QString::number(kept)));
    QVERIFY2(kept > Sandbox::largestOutput / 2, qPrintable(QString::number(kept)));
}

void DeviceTest::programThatIsAskedEnds()
{
    Device device(window());
    QSignalSpy ended(&device, &Device::ended);
    QVERIFY(stands(device));
    QVERIFY(device.program().programPid() > 0);
    device.terminate();
    QVERIFY(ended.wait(limit));
    QCOMPARE(ended.at(0).at(0).toInt(), 128 + SIGTERM);
    QVERIFY(!QFileInfo::exists(device.folder().path()));
    QVERIFY(device.program().programPid() == 0);
}

void DeviceTest::programThatRefusesToEndIsKilled()
{
    Device device(shell("trap '' TERM; touch /mnt/boot/deaf; while :; do sleep 0.1; done"));
    QSignalSpy ended(&device, &Device::ended);
    QCOMPARE(device.start(), std::nullopt);
    QVERIFY(QTest::qWaitFor([&] { return QFileInfo::exists(device.stateFolder() + "/mnt/boot/deaf"); }, limit));
    device.terminate();
    QVERIFY(ended.wait(limit));
    QCOMPARE(ended.at(0).at(0).toInt(), 128 + SIGKILL);
}

void DeviceTest::programThatIsKilledTakesTheDeviceDown()
{
    Device device(window());
    QSignalSpy ended(&device, &Device::ended);
    QVERIFY(stands(device));
    QCOMPARE(::kill(static_cast<pid_t>(device.program().programPid()), SIGKILL), 0);
    QVERIFY(ended.wait(limit));
    QCOMPARE(ended.at(0).at(0).toInt(), 128 + SIGKILL);
    QVERIFY(!QFileInfo::exists(device.folder().path()));
}

void DeviceTest::deviceThatGoesTakesItsProgramAlong()
{
    qint64 program = 0;
    {
        Device device(window());
        QVERIFY(stands(device));
        program = device.program().programPid();
        QVERIFY(program > 0);
    }
    QVERIFY(!QFileInfo::exists(QStringLiteral("/proc/%1").arg(program)));
}

void DeviceTest::deviceThatHasEndedLeavesTheNextOneOfItsNameAlone()
{
    auto first = std::make_unique<Device>(shell(QStringLiteral("exit 0")));
    QCOMPARE(statusOf(*first), 0);
    const QString name = first->folder().name();
    Device second(window());
    QVERIFY(stands(second));
    QCOMPARE(second.folder().name(), name);
    first.reset();
    QVERIFY(QFileInfo::exists(second.controlSocket()));
}

void DeviceTest::devicesStandSideBySide()
{
    auto options = window();
    options.settings = QStringList{"battery.voltage=1"};
    Device first(options);
    options.settings = QStringList{"battery.voltage=2"};
    Device second(options);
    QVERIFY(stands(first));
    QVERIFY(stands(second));
    QCOMPARE(DeviceFolder::running(), (QStringList{first.folder().name(), second.folder().name()}));
    QVERIFY(first.vncAddress() != second.vncAddress());
    const auto voltageOf = [](const Device& device) {
        QFile file(device.folder().path("tree/sys/class/power_supply/ds2780-battery.0/voltage_now"));
        return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
    };
    QCOMPARE(voltageOf(first), "1\n");
    QCOMPARE(voltageOf(second), "2\n");
}

void DeviceTest::portThatIsTakenIsReportedAndNothingIsLeft()
{
    QTcpServer occupant;
    QVERIFY(occupant.listen(QHostAddress(QHostAddress::LocalHost)));
    auto options = window();
    options.vncPort = occupant.serverPort();
    Device device(options);
    QCOMPARE(device.start(), QStringLiteral("VNC port %1: The bound address is already in use").arg(options.vncPort));
}

void DeviceTest::stateThatCannotBeMadeIsReportedAndNothingIsLeft()
{
    auto options = shell("true");
    options.stateFolder = QStringLiteral("/proc/nothing");
    Device device(options);
    QCOMPARE(device.start(), QString("/proc/nothing/mnt/boot: cannot be made"));
}

QTEST_GUILESS_MAIN(DeviceTest)
#include "DeviceTest.moc"
