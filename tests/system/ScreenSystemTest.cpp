// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"

#include <QTest>

#include <array>

using TestSupport::DeviceUnderTest;

#define REQUIRE(call) QVERIFY2(call, qPrintable(device.error()))

namespace
{

struct Expected
{
    const char* region;
    const char* colour;
};

/// What an engineer sees while nothing is broken.
constexpr std::array healthy{
    Expected{"rtc", "white"},        Expected{"key.soft1", "white"},  Expected{"key.soft2", "white"},
    Expected{"key.soft3", "white"},  Expected{"key.sel", "white"},    Expected{"key.up", "white"},
    Expected{"key.down", "white"},   Expected{"key.left", "white"},   Expected{"key.right", "white"},
    Expected{"key.power", "white"},  Expected{"usb-device", "green"}, Expected{"usb-gadget", "green"},
    Expected{"fuel-gauge", "white"}, Expected{"trigger", "green"},    Expected{"sd-card", "green"},
    Expected{"rf.beacon", "green"},  Expected{"rf.radios", "green"},
};

} // namespace

/// The shipped program's screen tests on the virtual device: each fault turns its own region red and no other, and each
/// region comes back where it is meant to.
class ScreenSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase();
    void init();

    void everythingIsHealthyAtStart();
    void oneFaultTurnsOneRegionRedAndItComesBack_data();
    void oneFaultTurnsOneRegionRedAndItComesBack();
    void gaugeFollowsTheBattery_data();
    void gaugeFollowsTheBattery();
    void oddGaugeFilesLeaveTheWindowAlive_data();
    void oddGaugeFilesLeaveTheWindowAlive();
    void clockTicks();
    void stalledLogLeavesTheWindowAlive();
    void clockStaysRedAfterOneFailedRead();

private:
    [[nodiscard]] bool becomesHealthy();
    [[nodiscard]] QString differencesFromHealthy(const QString& except = {});

    DeviceUnderTest device;
};

bool ScreenSystemTest::becomesHealthy()
{
    return std::all_of(healthy.begin(), healthy.end(),
                       [this](const Expected& row) { return device.waitRegion(row.region, row.colour); });
}

QString ScreenSystemTest::differencesFromHealthy(const QString& except)
{
    QStringList differences;
    for (const auto& row : healthy) {
        const QString colour = device.regionColour(row.region);
        if (row.region != except && colour != row.colour)
            differences.append(QStringLiteral("%1 is %2").arg(row.region, colour));
    }
    return differences.join(u", ");
}

void ScreenSystemTest::initTestCase()
{
    REQUIRE(device.start());
}

void ScreenSystemTest::init()
{
    REQUIRE(becomesHealthy());
}

void ScreenSystemTest::everythingIsHealthyAtStart()
{
    QCOMPARE(differencesFromHealthy(), QString());
}

void ScreenSystemTest::oneFaultTurnsOneRegionRedAndItComesBack_data()
{
    QTest::addColumn<QString>("control");
    QTest::addColumn<QJsonValue>("broken");
    QTest::addColumn<QJsonValue>("whole");
    QTest::addColumn<QString>("region");
    const auto row = [](const char* name, const char* control, const QJsonValue& broken, const QJsonValue& whole,
                        const char* region) { QTest::addRow("%s", name) << control << broken << whole << region; };
    row("HID device pulled", "usb.hid", false, true, "usb-device");
    row("HID entry dangling", "usb.hid_fault", "dangling", "none", "usb-device");
    row("no USB host", "usb.gadget", false, true, "usb-gadget");
    row("mode without line end", "usb.gadget_content", "no-newline", "normal", "usb-gadget");
    row("mode empty", "usb.gadget_content", "empty", "normal", "usb-gadget");
    row("mode binary", "usb.gadget_content", "binary", "normal", "usb-gadget");
    row("mode 1 MB", "usb.gadget_content", "huge", "normal", "usb-gadget");
    row("mode unreadable", "usb.gadget_fault", "EIO", "none", "usb-gadget");
    row("card pulled", "sd.present", false, true, "sd-card");
    row("data partition broken", "sd.fault", "EIO", "none", "sd-card");
    row("no triggers", "trigger.period", 0, 500, "trigger");
    row("no radio line", "radioline.period", 0, 1000, "rf.radios");
    row("silent microcontroller", "radio.ack", "off", "on", "rf.beacon");
}

void ScreenSystemTest::oneFaultTurnsOneRegionRedAndItComesBack()
{
    QFETCH(const QString, control);
    QFETCH(const QJsonValue, broken);
    QFETCH(const QJsonValue, whole);
    QFETCH(const QString, region);
    REQUIRE(device.set(control, broken));
    REQUIRE(device.waitRegion(region, "red"));
    QCOMPARE(differencesFromHealthy(region), QString());
    REQUIRE(device.set(control, whole));
    REQUIRE(device.waitRegion(region, "green"));
}

void ScreenSystemTest::gaugeFollowsTheBattery_data()
{
    QTest::addColumn<QString>("control");
    QTest::addColumn<QRect>("area");
    QTest::addRow("voltage") << "battery.voltage" << QRect(5, 139, 230, 25);
    QTest::addRow("current") << "battery.current" << QRect(5, 164, 230, 25);
}

/// What the numbers read is checked where the widgets can be asked; here the picture follows the gauge there and back.
void ScreenSystemTest::gaugeFollowsTheBattery()
{
    QFETCH(const QString, control);
    QFETCH(const QRect, area);
    const QJsonValue before = device.get(control);
    const QImage first = device.screenshot().copy(area);
    REQUIRE(device.set(control, 3333333));
    QTRY_VERIFY_WITH_TIMEOUT(device.screenshot().copy(area) != first, 20000);
    REQUIRE(device.set(control, before));
    QTRY_VERIFY_WITH_TIMEOUT(device.screenshot().copy(area) == first, 20000);
}

void ScreenSystemTest::oddGaugeFilesLeaveTheWindowAlive_data()
{
    QTest::addColumn<QString>("control");
    QTest::addColumn<QString>("value");
    for (const auto* file : {"voltage", "current"}) {
        for (const auto* content : {"empty", "binary", "huge", "no-newline"})
            QTest::addRow("%s %s", file, content) << QStringLiteral("battery.%1_content").arg(file) << content;
        for (const auto* fault : {"EIO", "ENODATA", "ENOENT", "EACCES"})
            QTest::addRow("%s %s", file, fault) << QStringLiteral("battery.%1_fault").arg(file) << fault;
    }
}

void ScreenSystemTest::oddGaugeFilesLeaveTheWindowAlive()
{
    QFETCH(const QString, control);
    QFETCH(const QString, value);
    const QJsonValue whole = device.get(control);
    REQUIRE(device.set(control, value));
    REQUIRE(device.press("Up"));
    REQUIRE(device.waitRegion("key.up", "green"));
    REQUIRE(device.release("Up"));
    REQUIRE(device.waitRegion("key.up", "white"));
    QCOMPARE(differencesFromHealthy(), QString());
    REQUIRE(device.set(control, whole));
}

void ScreenSystemTest::clockTicks()
{
    const QRect area(0, 0, 240, 30);
    const QImage first = device.screenshot().copy(area);
    QTRY_VERIFY_WITH_TIMEOUT(device.screenshot().copy(area) != first, 20000);
}

void ScreenSystemTest::stalledLogLeavesTheWindowAlive()
{
    REQUIRE(device.set("log.stalled", true));
    // Each unknown message is a line for the log: many more than a socket's queue holds.
    for (int message = 0; message < 60; ++message)
        REQUIRE(device.set("radio.message", "aa55"));
    REQUIRE(device.tap("Left"));
    REQUIRE(device.press("Down"));
    REQUIRE(device.waitRegion("key.down", "green"));
    REQUIRE(device.release("Down"));
    REQUIRE(device.waitRegion("key.down", "white"));
    REQUIRE(device.set("log.stalled", false));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
}

/// The last test of the run: the field never goes back.
void ScreenSystemTest::clockStaysRedAfterOneFailedRead()
{
    REQUIRE(device.set("rtc.fault", "EIO"));
    REQUIRE(device.waitRegion("rtc", "red"));
    QCOMPARE(differencesFromHealthy("rtc"), QString());
    REQUIRE(device.set("rtc.fault", "none"));
    const QRect area(0, 0, 240, 30);
    const QImage first = device.screenshot().copy(area);
    QTRY_VERIFY_WITH_TIMEOUT(device.screenshot().copy(area) != first, 20000);
    QCOMPARE(device.regionColour("rtc"), "red");
}

QTEST_GUILESS_MAIN(ScreenSystemTest)
#include "ScreenSystemTest.moc"
