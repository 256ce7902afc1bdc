// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"

#include <QElapsedTimer>
#include <QTest>

using TestSupport::DeviceUnderTest;

#define REQUIRE(call) QVERIFY2(call, qPrintable(device.error() + '\n' + device.output()))

/// Starts with devices missing or silent, and all the ways in which a run ends.
class StartAndEndSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void windowStandsWithADeviceMissing_data();
    void windowStandsWithADeviceMissing();
    void windowStandsWithEveryDeviceMissing();
    void deadRadioLineLeavesEveryKeyAnswering();
    void silentMicrocontrollerDelaysTheStartByItsTimeOuts();
    void startLineIsLogged();
    void lostDspEndsTheLoopByAFatalLineAndTheProgramReturnsZero();
    void terminationSignalEndsTheProgramInOrder_data();
    void terminationSignalEndsTheProgramInOrder();
};

void StartAndEndSystemTest::windowStandsWithADeviceMissing_data()
{
    QTest::addColumn<QString>("setting");
    QTest::addColumn<QString>("redRegion");
    QTest::addColumn<QString>("logged");
    QTest::addRow("clock") << "rtc.fault=ENOENT"
                           << "rtc"
                           << "";
    QTest::addRow("voltage") << "battery.voltage_fault=ENOENT"
                             << ""
                             << "";
    QTest::addRow("current") << "battery.current_fault=ENOENT"
                             << ""
                             << "";
    QTest::addRow("HID device") << "usb.hid=off"
                                << "usb-device"
                                << "";
    QTest::addRow("gadget controller") << "usb.gadget_fault=ENOENT"
                                       << "usb-gadget"
                                       << "";
    QTest::addRow("card") << "sd.present=off"
                          << "sd-card"
                          << "";
    QTest::addRow("reset line") << "reset_line.fault=ENOENT"
                                << ""
                                << "Beacon processor reset line device file does not exist at"
                                   "/sys/class/misc/msp430/reset";
    QTest::addRow("radio line") << "radio.presence=missing"
                                << "rf.beacon"
                                << "Serial port open failed.  Error code = No such file or directory";
    QTest::addRow("DSP") << "dsp.presence=missing"
                         << ""
                         << "PROC_attach(dspProcessorId, NULL). Status = 0x";
    QTest::addRow("DSP that refuses") << "dsp.presence=refusing"
                                      << ""
                                      << "PROC_attach(dspProcessorId, NULL). Status = 0x";
    QTest::addRow("sound") << "audio.presence=missing"
                           << ""
                           << "";
}

void StartAndEndSystemTest::windowStandsWithADeviceMissing()
{
    QFETCH(const QString, setting);
    QFETCH(const QString, redRegion);
    QFETCH(const QString, logged);
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", setting}));
    if (!redRegion.isEmpty())
        REQUIRE(device.waitRegion(redRegion, "red"));
    if (!logged.isEmpty())
        REQUIRE(device.waitLog(logged));
    for (const auto* region : {"usb-device", "usb-gadget", "sd-card", "trigger", "rf.radios", "rf.beacon"})
        if (region != redRegion)
            REQUIRE(device.waitRegion(region, "green"));
}

void StartAndEndSystemTest::windowStandsWithEveryDeviceMissing()
{
    DeviceUnderTest device;
    QStringList arguments;
    for (const auto* setting : {"rtc.fault=ENOENT", "battery.voltage_fault=ENOENT", "battery.current_fault=ENOENT",
                                "usb.hid=off", "usb.gadget_fault=ENOENT", "sd.present=off", "reset_line.fault=ENOENT",
                                "led.fault=ENOENT", "radio.presence=missing", "dsp.presence=missing",
                                "audio.presence=missing", "trigger.period=0", "radioline.period=0"})
        arguments << "--set" << setting;
    REQUIRE(device.start(arguments));
    for (const auto* region : {"rtc", "usb-device", "usb-gadget", "sd-card", "trigger", "rf.beacon", "rf.radios"})
        REQUIRE(device.waitRegion(region, "red"));
    REQUIRE(device.press("Power"));
    REQUIRE(device.waitRegion("key.power", "green"));
    REQUIRE(device.release("Power"));
    REQUIRE(device.waitRegion("key.power", "white"));
}

void StartAndEndSystemTest::deadRadioLineLeavesEveryKeyAnswering()
{
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "radio.presence=missing"}));
    for (const auto& [key, region] : std::initializer_list<std::pair<const char*, const char*>>{{"Return", "key.sel"},
                                                                                                {"Up", "key.up"},
                                                                                                {"Down", "key.down"},
                                                                                                {"Left", "key.left"},
                                                                                                {"Right", "key.right"},
                                                                                                {"F5", "key.soft1"},
                                                                                                {"F6", "key.soft2"},
                                                                                                {"F7", "key.soft3"},
                                                                                                {"F12", "key.power"}}) {
        REQUIRE(device.press(key));
        REQUIRE(device.waitRegion(region, "green"));
        REQUIRE(device.release(key));
        REQUIRE(device.waitRegion(region, "white"));
    }
    REQUIRE(device.waitRegion("rf.beacon", "red"));
}

void StartAndEndSystemTest::silentMicrocontrollerDelaysTheStartByItsTimeOuts()
{
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "radio.ack=off"}));
    REQUIRE(device.waitLog("Beacon processor timed out"));
    REQUIRE(device.waitRegion("rf.beacon", "red"));
    REQUIRE(device.set("radio.ack", "on"));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
}

void StartAndEndSystemTest::startLineIsLogged()
{
    DeviceUnderTest device;
    REQUIRE(device.start());
    QCOMPARE(device.logTexts().front(), "Starting ImmunityRig");
}

void StartAndEndSystemTest::lostDspEndsTheLoopByAFatalLineAndTheProgramReturnsZero()
{
    DeviceUnderTest device;
    REQUIRE(device.start());
    REQUIRE(device.waitControl("dsp.state", "connected"));
    REQUIRE(device.set("dsp.presence", "missing"));
    // The next command to the DSP finds nobody. While the window is still starting its tests, it stands but there is
    // no loop yet that could end: the key is pressed until there is.
    const auto hasEnded = [&device] {
        return !device.tap("Soft3") || device.process().state() == QProcess::NotRunning;
    };
    QVERIFY(QTest::qWaitFor(hasEnded, 30000));
    QTRY_COMPARE_WITH_TIMEOUT(device.process().state(), QProcess::NotRunning, 30000);
    QCOMPARE(device.process().exitStatus(), QProcess::NormalExit);
    QCOMPARE(device.process().exitCode(), 0);
}

void StartAndEndSystemTest::terminationSignalEndsTheProgramInOrder_data()
{
    QTest::addColumn<QStringList>("settings");
    QTest::addRow("healthy") << QStringList{};
    QTest::addRow("silent radio") << QStringList{"--set", "radio.ack=off"};
    QTest::addRow("no radio line") << QStringList{"--set", "radio.presence=missing"};
    QTest::addRow("no DSP") << QStringList{"--set", "dsp.presence=missing"};
    QTest::addRow("silent DSP") << QStringList{"--set", "dsp.ack=off"};
}

/// Ctrl-C at the virtual device ends the program by SIGTERM; it is killed, and the exit status tells, when it does not
/// end by itself.
void StartAndEndSystemTest::terminationSignalEndsTheProgramInOrder()
{
    QFETCH(const QStringList, settings);
    DeviceUnderTest device;
    REQUIRE(device.start(settings));
    device.process().terminate();
    QTRY_COMPARE_WITH_TIMEOUT(device.process().state(), QProcess::NotRunning, 30000);
    QCOMPARE(device.process().exitStatus(), QProcess::NormalExit);
    QCOMPARE(device.process().exitCode(), 0);
}

QTEST_GUILESS_MAIN(StartAndEndSystemTest)
#include "StartAndEndSystemTest.moc"
