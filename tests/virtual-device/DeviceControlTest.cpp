// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "virtual-device/control/ControlClient.h"

#include <QJsonObject>
#include <QProcess>
#include <QTest>

#include <memory>

using TestSupport::DeviceUnderTest;

#define VERIFY_ON(device, condition) QVERIFY2(condition, qPrintable((device).error()))

/// The whole chain: the program as it ships, the device's files and screen, the control socket and a client of it.
class DeviceControlTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase();
    void cleanupTestCase() { bench.reset(); }

    void controlChangesWhatTheProgramShows();
    void heldKeyLightsItsLabel_data();
    void heldKeyLightsItsLabel();
    void powerKeyRaisesTheLatch();
    void triggerLineKeepsItsRegionGreen();
    void whatTheProgramLogsCanBeWaitedFor();
    void screenshotShowsTheWindow();
    void refusalLeavesAnError();
    void waitThatFailsSaysWhatThereIs();
    void secondDeviceRunsBesideTheFirst();
    void ownCommandReachesTheControlSocket();
    void stoppedDeviceAnswersNobody();

private:
    std::unique_ptr<DeviceUnderTest> bench;
};

void DeviceControlTest::initTestCase()
{
    bench = std::make_unique<DeviceUnderTest>();
    VERIFY_ON(*bench, bench->start());
    QVERIFY(bench->readyLine().startsWith("ready: VNC 127.0.0.1:"));
}

void DeviceControlTest::controlChangesWhatTheProgramShows()
{
    VERIFY_ON(*bench, bench->waitRegion("usb-device", "green"));
    VERIFY_ON(*bench, bench->set("usb.hid", false));
    VERIFY_ON(*bench, bench->waitRegion("usb-device", "red"));
    QCOMPARE(bench->get("usb.hid"), false);
    QCOMPARE(bench->regionColour("usb-device"), "red");
    VERIFY_ON(*bench, bench->set("usb.hid", true));
    VERIFY_ON(*bench, bench->waitRegion("usb-device", "green"));
}

void DeviceControlTest::heldKeyLightsItsLabel_data()
{
    QTest::addColumn<QString>("region");
    for (const auto& [key, region] :
         {std::pair{"Soft1", "key.soft1"}, std::pair{"Soft2", "key.soft2"}, std::pair{"Soft3", "key.soft3"},
          std::pair{"Return", "key.sel"}, std::pair{"Up", "key.up"}, std::pair{"Down", "key.down"},
          std::pair{"Left", "key.left"}, std::pair{"Right", "key.right"}, std::pair{"Power", "key.power"},
          std::pair{"Escape", "key.unknown"}, std::pair{"Tab", "key.unknown"}})
        QTest::addRow("%s", key) << region;
}

void DeviceControlTest::heldKeyLightsItsLabel()
{
    QFETCH(const QString, region);
    const QString key = QTest::currentDataTag();
    VERIFY_ON(*bench, bench->press(key));
    VERIFY_ON(*bench, bench->waitRegion(region, "green"));
    VERIFY_ON(*bench, bench->release(key));
    VERIFY_ON(*bench, bench->waitRegion(region, "white"));
    VERIFY_ON(*bench, bench->hold(key, std::chrono::milliseconds(50)));
    VERIFY_ON(*bench, bench->waitRegion(region, "white"));
}

void DeviceControlTest::powerKeyRaisesTheLatch()
{
    VERIFY_ON(*bench, bench->tap("Power"));
    VERIFY_ON(*bench, bench->waitControl("led.power_latch", 1));
}

void DeviceControlTest::triggerLineKeepsItsRegionGreen()
{
    VERIFY_ON(*bench, bench->set("trigger.period", 300));
    VERIFY_ON(*bench, bench->waitRegion("trigger", "green"));
    // A line that falls silent is red within the second and stays so; a machine that stood still is green again.
    const auto staysGreen = [this] { return !bench->waitRegion("trigger", "red", std::chrono::milliseconds(1500)); };
    QVERIFY(QTest::qWaitFor(staysGreen, 60'000));
    VERIFY_ON(*bench, bench->set("trigger.period", 0));
    VERIFY_ON(*bench, bench->waitRegion("trigger", "red"));
}

void DeviceControlTest::whatTheProgramLogsCanBeWaitedFor()
{
    VERIFY_ON(*bench, bench->waitLog("Starting ImmunityRig"));
    QCOMPARE(bench->logTexts().first(), "Starting ImmunityRig");
    const qint64 mark = bench->logMark();
    QVERIFY(mark > 0);
    QVERIFY(!bench->waitLog("Starting ImmunityRig", std::chrono::milliseconds(1), mark));
}

void DeviceControlTest::screenshotShowsTheWindow()
{
    VERIFY_ON(*bench, bench->waitRegion("usb-gadget", "green"));
    const QImage picture = bench->screenshot();
    QCOMPARE(picture.size(), QSize(240, 320));
    QCOMPARE(picture.pixelColor(122, 96), QColor(0, 128, 0));
}

void DeviceControlTest::refusalLeavesAnError()
{
    QVERIFY(!bench->set("battery.voltage", "much"));
    QCOMPARE(bench->error(), "set: control \"battery.voltage\" takes -2147483648..2147483647 uV");
    QVERIFY(bench->get("batery").isUndefined());
    QVERIFY(bench->error().startsWith("get: unknown control \"batery\"; controls: "));
}

void DeviceControlTest::waitThatFailsSaysWhatThereIs()
{
    QVERIFY(!bench->waitRegion("sd-card", "white", std::chrono::milliseconds(10)));
    QCOMPARE(bench->error(), "wait {\"colour\":\"white\",\"region\":\"sd-card\",\"within\":0.01}: did not come true "
                             "within 0.01 s, now {\"present\":\"green\"}");
}

void DeviceControlTest::secondDeviceRunsBesideTheFirst()
{
    DeviceUnderTest second;
    VERIFY_ON(second, second.start());
    VERIFY_ON(second, second.set("sd.present", false));
    VERIFY_ON(second, second.waitRegion("sd-card", "red"));
    VERIFY_ON(*bench, bench->waitRegion("sd-card", "green"));
    QCOMPARE(bench->get("sd.present"), true);
}

void DeviceControlTest::ownCommandReachesTheControlSocket()
{
    const QString program = qEnvironmentVariable("IMMUNITYRIG_BUILD") + "/virtual-device/virtual-device";
    QProcess exec;
    exec.start(program, {"exec", "--", program, "ctl", "get", "battery.voltage"});
    QVERIFY(exec.waitForFinished(60000));
    QCOMPARE(QString::fromUtf8(exec.readAllStandardError()), "");
    QCOMPARE(QString::fromUtf8(exec.readAllStandardOutput()), "4100000\n");
    QCOMPARE(exec.exitCode(), 0);
}

void DeviceControlTest::stoppedDeviceAnswersNobody()
{
    DeviceUnderTest brief;
    VERIFY_ON(brief, brief.start());
    brief.stop();
    QVERIFY(!brief.set("usb.hid", false));
    QCOMPARE(brief.error(), "set: the virtual device did not answer");
    QVERIFY(!QFile::exists(brief.controlSocket()));
}

QTEST_GUILESS_MAIN(DeviceControlTest)
#include "DeviceControlTest.moc"
