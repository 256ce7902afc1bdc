// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"

#include <QDeadlineTimer>
#include <QRegularExpression>
#include <QTest>

#include <array>
#include <memory>
#include <vector>

using TestSupport::DeviceUnderTest;
using TestSupport::ScreenHealth;
using namespace std::chrono_literals;

namespace
{

/// Before the program can begin its ten seconds, the virtual device, the sandbox and the relay are started: where
/// sanitizers and compilers keep the machine busy that has taken ten, and may take twenty more.
constexpr auto startOfTheDevice = 20s;
constexpr auto usualStart = startOfTheDevice + 10s;
/// Where every command to a silent device ends by its time-out before the window stands.
constexpr auto slowStart = 60s;

// Texts behind "FILE, LINE, ".
const QStringList noLine{"Serial port open failed.  Error code = No such file or directory",
                         "Unable to open beacon serial port",
                         "Serial port write failed.  Error code = Bad file descriptor", "Unable to send serial packet"};
const QStringList noResetLine{"Beacon processor reset line device file does not exist at"
                              "/sys/class/misc/msp430/reset"};
const QStringList noSound{"Unable to open audio"};
const QStringList silentRadio{"Beacon processor timed out"};
const QStringList silentDsp{"Timed out waiting for DSP ACK"};
/// Every step of the DSP's opening fails, is reported, and is followed by the next; then the two
/// commands of the start.
const QStringList noDsp{
    "PROC_setup(NULL). Status = 0x",
    "PROC_attach(dspProcessorId, NULL). Status = 0x",
    "POOL_open(this->privateData->applicationPoolId, &poolAttributes). Status = 0x",
    "MSGQ_open(processorMessageQueueName, &this->privateData->processorMessageQueue, NULL). Status = 0x",
    "MSGQ_setErrorHandler(this->privateData->processorMessageQueue, this->privateData->applicationPoolId). Status = 0x",
    "PROC_load(dspProcessorId, this->privateData->dspExecutablePath.toAscii().data(), 0, NULL). Status = 0x",
    "PROC_start(dspProcessorId). Status = 0x",
    "MSGQ_transportOpen(dspProcessorId, &mqtAttrs). Status = 0x",
    "MSGQ_locate(dspMessageQueueName, &this->privateData->dspMessageQueue, &syncLocateAttrs). Status = 0x",
    "MSGQ_alloc() failed. Status = 0x",
    "sendCommand failed",
};
/// What every start on an empty card logs.
const QStringList always{"Starting ImmunityRig", "Unable to open configuration file",
                         "DspLink: DSP execution started successfully.", "DspPort: open complete."};

// What the tests print without logging it; the blank at the end is the debug output's.
const QStringList noClock{"Unable to open RTC ", "Unable to read from RTC "};
const QStringList unreadableClock{"Unable to read from RTC "};
const QStringList noVoltage{"Error opening voltage file "};
const QStringList noCurrent{"Error opening current file "};
const QStringList noGadget{"Cannot open file "};

/// Once in a while, the longer the line is dead: pings pile up.
const QString pingsPileUp = QStringLiteral("Beacon processor message queue over maximum");

/// Starts run side by side, a few at a time: they wait more than they work.
constexpr std::size_t startsAtOnce = 3;

struct Missing
{
    const char* name;
    const char* setting;
    QStringList redRegions;
    QStringList logged;
    QStringList printed;
};

const std::array missing{
    Missing{"clock", "rtc.fault=ENOENT", {"rtc"}, {}, noClock},
    Missing{"clock that does not answer", "rtc.fault=EIO", {"rtc"}, {}, unreadableClock},
    Missing{"voltage", "battery.voltage_fault=ENOENT", {}, {}, noVoltage},
    Missing{"current", "battery.current_fault=ENOENT", {}, {}, noCurrent},
    Missing{"HID device", "usb.hid=off", {"usb-device"}, {}, {}},
    Missing{"gadget controller", "usb.gadget_fault=ENOENT", {"usb-gadget"}, {}, noGadget},
    Missing{"card", "sd.present=off", {"sd-card"}, {}, {}},
    Missing{"card without room", "sd.full=on", {"sd-card"}, {}, {}},
    Missing{"triggers", "trigger.period=0", {"trigger"}, {}, {}},
    Missing{"radio's signal line", "radioline.period=0", {"rf.radios"}, {}, {}},
    Missing{"reset line", "reset_line.fault=ENOENT", {}, noResetLine, {}},
    Missing{"radio line", "radio.presence=missing", {"rf.beacon"}, noLine, {}},
    Missing{"DSP", "dsp.presence=missing", {}, noDsp, {}},
    Missing{"DSP that refuses", "dsp.presence=refusing", {}, noDsp, {}},
    Missing{"DSP that is silent", "dsp.ack=off", {}, silentDsp, {}},
    Missing{"sound card", "audio.presence=missing", {}, noSound, {}},
    Missing{"sound output", "audio.presence=no-output", {}, noSound, {}},
    Missing{"mixer", "audio.presence=no-mixer", {}, {}, {}},
};

/// A log line without its source and line number, and a status without its number.
QString messageOf(const QString& line)
{
    static const QRegularExpression place(QStringLiteral("\\A[A-Za-z/]+\\.cpp, \\d+, "));
    static const QRegularExpression status(QStringLiteral("(?<=Status = 0x)[0-9a-f]+\\z"));
    return QString(line).remove(place).remove(status);
}

} // namespace

/// Starts with devices missing or silent: the window stands in time, what is missing is red, and it is said.
class StartSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void startLineComesFirst();
    void windowStandsWithADeviceMissing_data();
    void windowStandsWithADeviceMissing();
    void windowStandsWithEveryDeviceMissing();
    void windowStandsWithEveryDeviceSilent();
    void readOnlyCardWithoutItsFileIsRedUntilItCanBeWritten();
    void deadPowerLatchIsNoticedByThePowerKeyAlone();

private:
    struct Started
    {
        std::unique_ptr<DeviceUnderTest> device = std::make_unique<DeviceUnderTest>();
        QDeadlineTimer limit;
        bool isInTime = false;
    };

    [[nodiscard]] Started& started(int index);
    void startFrom(int first);
    static void checkSaid(DeviceUnderTest& device, const QStringList& logged, const QStringList& printed);

    int firstStarted = -1;
    std::vector<Started> fleet;
};

/// Every expected text, and no other, is in the log; what is printed besides has each expected text.
void StartSystemTest::checkSaid(DeviceUnderTest& device, const QStringList& logged, const QStringList& printed)
{
    for (const auto& text : logged)
        REQUIRE(device.waitLog(text));
    QStringList unexpected;
    const bool isLineDead = logged.contains(noLine.front());
    const auto texts = device.logTexts();
    for (const auto& text : texts)
        if (!(always + logged).contains(messageOf(text)) && !(isLineDead && messageOf(text) == pingsPileUp))
            unexpected.append(text);
    QCOMPARE(unexpected.join(u'\n'), QString());
    for (const auto& text : printed)
        QVERIFY2(device.waitOutput(text + '\n'), qPrintable(text));
}

void StartSystemTest::startLineComesFirst()
{
    DeviceUnderTest device;
    REQUIRE(device.start({}, usualStart));
    const auto first = device.logLines().front();
    QCOMPARE(first.value("text").toString(), "Starting ImmunityRig");
    QCOMPARE(first.value("priority").toInt(), 6);
    QCOMPARE(first.value("identity").toString(), "VQK");
    REQUIRE(ScreenHealth::isReached(device));
    checkSaid(device, {}, {"Audio file exists = true", "Attempting to open audio file.  Success = true"});
}

void StartSystemTest::windowStandsWithADeviceMissing_data()
{
    QTest::addColumn<int>("index");
    for (std::size_t index = 0; index < missing.size(); ++index)
        QTest::addRow("%s", missing[index].name) << static_cast<int>(index);
}

/// The row's device, which has been started together with its neighbours.
StartSystemTest::Started& StartSystemTest::started(int index)
{
    const int first = index - index % static_cast<int>(startsAtOnce);
    if (first != firstStarted)
        startFrom(first);
    firstStarted = first;
    return fleet.at(static_cast<std::size_t>(index - first));
}

void StartSystemTest::startFrom(int first)
{
    fleet = std::vector<Started>(std::min<std::size_t>(startsAtOnce, missing.size() - static_cast<std::size_t>(first)));
    auto row = missing.begin() + first;
    for (auto& start : fleet) {
        start.limit = QDeadlineTimer(usualStart);
        start.isInTime = start.device->begin({"--set", (row++)->setting});
    }
    for (auto& start : fleet)
        start.isInTime =
            start.isInTime && start.device->waitReady(std::chrono::milliseconds(start.limit.remainingTime()));
}

void StartSystemTest::windowStandsWithADeviceMissing()
{
    QFETCH(const int, index);
    const auto& row = missing.at(static_cast<std::size_t>(index));
    auto& start = started(index);
    auto& device = *start.device;
    REQUIRE(start.isInTime);
    for (const auto& region : row.redRegions)
        REQUIRE(device.waitRegion(region, "red"));
    for (const auto* region : {"usb-device", "usb-gadget", "sd-card", "trigger", "rf.radios", "rf.beacon"})
        if (!row.redRegions.contains(QLatin1String(region)))
            REQUIRE(device.waitRegion(region, "green"));
    QCOMPARE(ScreenHealth::differences(device, row.redRegions), QString());
    checkSaid(device, row.logged, row.printed);
}

void StartSystemTest::windowStandsWithEveryDeviceMissing()
{
    DeviceUnderTest device;
    QStringList arguments;
    for (const auto* setting : {"rtc.fault=ENOENT", "battery.voltage_fault=ENOENT", "battery.current_fault=ENOENT",
                                "usb.hid=off", "usb.gadget_fault=ENOENT", "sd.present=off", "reset_line.fault=ENOENT",
                                "led.fault=ENOENT", "radio.presence=missing", "dsp.presence=missing",
                                "audio.presence=missing", "trigger.period=0", "radioline.period=0"})
        arguments << "--set" << setting;
    REQUIRE(device.start(arguments, usualStart));
    for (const auto* region : {"rtc", "usb-device", "usb-gadget", "sd-card", "trigger", "rf.beacon", "rf.radios"})
        REQUIRE(device.waitRegion(region, "red"));
    REQUIRE(device.press("Power"));
    REQUIRE(device.waitRegion("key.power", "green"));
    REQUIRE(device.release("Power"));
    REQUIRE(device.waitRegion("key.power", "white"));
    checkSaid(device, noResetLine + noLine + noDsp + noSound,
              noClock + noVoltage + noCurrent + noGadget + QStringList("Cannot open power latch file"));
}

/// Two commands to the DSP and two to the radio end by their time-outs before the window stands.
void StartSystemTest::windowStandsWithEveryDeviceSilent()
{
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "radio.ack=off", "--set", "dsp.ack=off"}, slowStart));
    QCOMPARE(device.logTexts().filter(silentDsp.front()).size(), 2);
    QVERIFY(device.logTexts().filter(silentRadio.front()).size() >= 2);
    REQUIRE(device.waitRegion("rf.beacon", "red"));
    REQUIRE(device.waitRegion("rf.radios", "green"));
    QCOMPARE(ScreenHealth::differences(device, {"rf.beacon"}), QString());
    checkSaid(device, silentRadio + silentDsp, {});
    REQUIRE(device.set("radio.ack", "on"));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
}

void StartSystemTest::readOnlyCardWithoutItsFileIsRedUntilItCanBeWritten()
{
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "sd.readonly=on"}, usualStart));
    REQUIRE(device.waitRegion("sd-card", "red"));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
    REQUIRE(ScreenHealth::passesARound(device));
    QCOMPARE(device.regionColour("sd-card"), "red");
    QCOMPARE(ScreenHealth::differences(device, {"sd-card"}), QString());
    QVERIFY(!QFile::exists(device.stateFile("mnt/data/testfile")));
    REQUIRE(device.set("sd.readonly", false));
    REQUIRE(device.waitRegion("sd-card", "green"));
}

void StartSystemTest::deadPowerLatchIsNoticedByThePowerKeyAlone()
{
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "led.fault=ENOENT"}, usualStart));
    REQUIRE(ScreenHealth::isReached(device));
    QVERIFY(!device.programOutput().contains("Cannot open power latch file"));
    REQUIRE(device.press("Power"));
    REQUIRE(device.waitRegion("key.power", "green"));
    QVERIFY(device.waitOutput("Power pressed\nCannot open power latch file\n"));
    REQUIRE(device.release("Power"));
    REQUIRE(device.waitRegion("key.power", "white"));
    QCOMPARE(device.get("led.writes").toInteger(), 0);
    checkSaid(device, {}, {});
}

QTEST_GUILESS_MAIN(StartSystemTest)
#include "StartSystemTest.moc"
