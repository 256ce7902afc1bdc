// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"
#include "tests/support/ScreenText.h"

#include <QRegularExpression>
#include <QTest>

using TestSupport::DeviceUnderTest;
using TestSupport::ScreenHealth;
using TestSupport::ScreenText;

namespace
{

// Inside the fields' frames.
constexpr QRect clockField(4, 4, 232, 22);
constexpr QRect unknownKeyLabel(61, 78, 168, 14);

} // namespace

/// The shipped program's screen tests on the virtual device: each fault turns its own region red and no other, and each
/// region comes back where it is meant to.
class ScreenSystemTest : public QObject
{
    Q_OBJECT

public:
    static void initMain() { ScreenText::prepare(); }

private slots:
    void initTestCase();
    void init();

    void everythingIsHealthyAtStart();
    void oneFaultTurnsOneRegionRedAndItComesBack_data();
    void oneFaultTurnsOneRegionRedAndItComesBack();
    void clockTicks();
    void garbageFromTheClockLeavesTheTimeAndTheWindowAsTheyAre();
    void readOnlyCardThatHoldsItsFileStaysGreen();
    void deadPowerLatchLeavesThePowerKeyAnswering();
    void unknownKeyShowsItsNumber();
    void percentSignsOfForeignTextAreLoggedAsTheyCame_data();
    void percentSignsOfForeignTextAreLoggedAsTheyCame();
    void stalledLogLeavesTheWindowAlive();
    void clockStaysRedAfterOneFailedRead();

private:
    [[nodiscard]] bool comesToShow(const QRect& field, const QString& text);

    DeviceUnderTest device;
};

bool ScreenSystemTest::comesToShow(const QRect& field, const QString& text)
{
    return QTest::qWaitFor([&] { return ScreenText::isAt(device.screenshot(), field, text, ScreenText::named()); },
                           20000);
}

void ScreenSystemTest::initTestCase()
{
    REQUIRE(device.start());
}

void ScreenSystemTest::init()
{
    REQUIRE(ScreenHealth::isReached(device));
}

void ScreenSystemTest::everythingIsHealthyAtStart()
{
    QCOMPARE(ScreenHealth::differences(device), QString());
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
    row("HID entry unreadable", "usb.hid_fault", "ENOENT", "none", "usb-device");
    row("card pulled", "sd.present", false, true, "sd-card");
    row("card's entry dangling", "sd.block_fault", "dangling", "none", "sd-card");
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
    REQUIRE(device.follow());
    REQUIRE(device.set(control, broken));
    REQUIRE(device.waitRegion(region, "red"));
    REQUIRE(ScreenHealth::passesARound(device));
    QCOMPARE(device.regionColour(region), "red");
    QCOMPARE(ScreenHealth::differences(device, {region}), QString());
    QCOMPARE(device.regionsThatTurned("red", region), QStringList(region));
    QCOMPARE(device.regionsThatTurned("green", region), QStringList());
    REQUIRE(device.set(control, whole));
    REQUIRE(device.waitRegion(region, "green"));
    QCOMPARE(ScreenHealth::differences(device), QString());
    QCOMPARE(device.regionsThatTurned("red", region), QStringList(region));
    QCOMPARE(device.regionsThatTurned("green", region), QStringList(region));
}

void ScreenSystemTest::clockTicks()
{
    constexpr qint64 afternoon = 1299510245;
    REQUIRE(device.set("rtc.running", false));
    REQUIRE(device.set("rtc.time", afternoon));
    QVERIFY(comesToShow(clockField, "3/7/11 3:04:05 PM"));
    REQUIRE(device.set("rtc.time", afternoon + 12 * 3600 + 1));
    QVERIFY(comesToShow(clockField, "3/8/11 3:04:06 AM"));
    REQUIRE(device.set("rtc.running", true));
    REQUIRE(ScreenHealth::passesARound(device));
    QVERIFY(!ScreenText::isAt(device.screenshot(), clockField, "3/8/11 3:04:06 AM", ScreenText::named()));
}

/// The HID device is looked at as often as the clock: when its region has changed four times, the clock has been read.
void ScreenSystemTest::garbageFromTheClockLeavesTheTimeAndTheWindowAsTheyAre()
{
    constexpr qint64 afternoon = 1299510245;
    const QString shown = QStringLiteral("3/7/11 3:04:05 PM");
    REQUIRE(device.set("rtc.running", false));
    REQUIRE(device.set("rtc.time", afternoon));
    QVERIFY(comesToShow(clockField, shown));
    REQUIRE(device.set("rtc.fault", "garbage"));
    for (const char* const colour : {"red", "green", "red", "green"}) {
        REQUIRE(device.set("usb.hid", qstrcmp(colour, "green") == 0));
        REQUIRE(device.waitRegion("usb-device", colour));
    }
    QVERIFY(ScreenText::isAt(device.screenshot(), clockField, shown, ScreenText::named()));
    QCOMPARE(ScreenHealth::differences(device), QString());
    REQUIRE(device.set("rtc.time", afternoon + 1));
    REQUIRE(device.set("rtc.fault", "none"));
    QVERIFY(comesToShow(clockField, "3/7/11 3:04:06 PM"));
    REQUIRE(device.set("rtc.running", true));
}

/// The probe file is written once, when it is missing, and only read from then on.
void ScreenSystemTest::readOnlyCardThatHoldsItsFileStaysGreen()
{
    REQUIRE(device.follow());
    for (const auto* const refusal : {"sd.readonly", "sd.full"}) {
        REQUIRE(device.set(refusal, true));
        REQUIRE(ScreenHealth::passesARound(device));
        REQUIRE(device.set(refusal, false));
    }
    QCOMPARE(device.regionsThatTurned("red"), QStringList());
    QCOMPARE(ScreenHealth::differences(device), QString());
    QFile probe(device.stateFile("mnt/data/testfile"));
    QVERIFY(probe.open(QIODevice::ReadOnly));
    QCOMPARE(probe.readAll(), "Vantor Tamberly");
}

void ScreenSystemTest::deadPowerLatchLeavesThePowerKeyAnswering()
{
    REQUIRE(device.set("led.fault", "EACCES"));
    const qint64 writes = device.get("led.writes").toInteger();
    REQUIRE(device.press("Power"));
    REQUIRE(device.waitRegion("key.power", "green"));
    QVERIFY(device.waitOutput("Cannot open power latch file"));
    REQUIRE(device.release("Power"));
    REQUIRE(device.waitRegion("key.power", "white"));
    QCOMPARE(ScreenHealth::differences(device), QString());
    QCOMPARE(device.get("led.writes").toInteger(), writes);
    REQUIRE(device.set("led.fault", "none"));
    REQUIRE(device.tap("Power"));
    REQUIRE(device.waitControl("led.writes", writes + 1));
}

void ScreenSystemTest::unknownKeyShowsItsNumber()
{
    REQUIRE(device.press("Escape"));
    REQUIRE(device.waitRegion("key.unknown", "green"));
    QVERIFY(comesToShow(unknownKeyLabel, "Unknown key: 16777216"));
    REQUIRE(device.release("Escape"));
    REQUIRE(device.waitRegion("key.unknown", "white"));
    QVERIFY(comesToShow(unknownKeyLabel, "Unknown key: 16777216"));
}

void ScreenSystemTest::percentSignsOfForeignTextAreLoggedAsTheyCame_data()
{
    QTest::addColumn<QString>("control");
    QTest::addColumn<QString>("sent");
    QTest::addColumn<QString>("source");
    QTest::addRow("burst on the radio line") << "radio.text"
                                             << "%n%s"
                                             << "BeaconProcessor\\.cpp, \\d+, ";
    QTest::addRow("placeholders on the radio line") << "radio.text"
                                                    << "%1 %m %%"
                                                    << "BeaconProcessor\\.cpp, \\d+, ";
    QTest::addRow("log string of the DSP") << "dsp.log"
                                           << "%n%s"
                                           << "Dsp\\.cpp, \\d+, DSP Log: ";
}

void ScreenSystemTest::percentSignsOfForeignTextAreLoggedAsTheyCame()
{
    QFETCH(const QString, control);
    QFETCH(const QString, sent);
    QFETCH(const QString, source);
    const qint64 mark = device.logMark();
    REQUIRE(device.set(control, sent));
    REQUIRE(device.waitLog(sent, DeviceUnderTest::usual, mark));
    const QString whole = "Domain/src/DomainLayer/" + source + QRegularExpression::escape(sent);
    const auto lines = device.logLines(mark);
    QCOMPARE(lines.size(), 1);
    const QString text = lines.front().value("text").toString();
    QVERIFY2(QRegularExpression(QRegularExpression::anchoredPattern(whole)).match(text).hasMatch(), qPrintable(text));
    QCOMPARE(lines.front().value("priority").toInt(), 4);
    QCOMPARE(ScreenHealth::differences(device), QString());
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
    QCOMPARE(ScreenHealth::differences(device, {"rtc"}), QString());
    REQUIRE(device.set("rtc.fault", "none"));
    const QRect area(0, 0, 240, 30);
    const QImage first = device.screenshot().copy(area);
    QTRY_VERIFY_WITH_TIMEOUT(device.screenshot().copy(area) != first, 20000);
    QCOMPARE(device.regionColour("rtc"), "red");
}

QTEST_MAIN(ScreenSystemTest)
#include "ScreenSystemTest.moc"
