// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "tests/support/ScreenHealth.h"
#include "tests/support/ScreenText.h"

#include <QTest>

using TestSupport::DeviceUnderTest;
using TestSupport::ScreenHealth;
using TestSupport::ScreenText;

namespace
{

// The parts of the panel that hold one text each.
constexpr QRect frequencyTitle(2, 240, 86, 20);
constexpr QRect frequencyValue(88, 241, 64, 18);
constexpr QRect powerTitle(2, 282, 70, 18);
constexpr QRect powerValue(80, 282, 70, 18);
constexpr QRect transmission(154, 243, 84, 20);
constexpr QRect beaconLabel(156, 266, 80, 24);
constexpr QRect radiosLabel(156, 294, 80, 24);

} // namespace

/// What the radio panel shows, letter by letter, with a radio that answers and with a line that is dead.
class RadioPanelSystemTest : public QObject
{
    Q_OBJECT

public:
    static void initMain() { ScreenText::prepare(); }

private slots:
    void everyKeyChangesWhatThePanelShows_data();
    void everyKeyChangesWhatThePanelShows();
    void silentMicrocontrollerCostsATimeOutForEachCommand();

private:
    static bool shows(DeviceUnderTest& device, const QRect& area, const QString& text, const QFont& font);
    static bool shows(DeviceUnderTest& device, const QRect& area, const QString& text);
    static void checkTitles(DeviceUnderTest& device);
    static void walkChannels(DeviceUnderTest& device);
    static void walkLevels(DeviceUnderTest& device);
    static void switchAntenna(DeviceUnderTest& device);
    static void stopAndStart(DeviceUnderTest& device);
    static void checkKeysWithoutText(DeviceUnderTest& device);
};

bool RadioPanelSystemTest::shows(DeviceUnderTest& device, const QRect& area, const QString& text, const QFont& font)
{
    return QTest::qWaitFor([&] { return ScreenText::isAt(device.screenshot(), area, text, font); }, 20000);
}

bool RadioPanelSystemTest::shows(DeviceUnderTest& device, const QRect& area, const QString& text)
{
    return shows(device, area, text, ScreenText::usual());
}

void RadioPanelSystemTest::checkTitles(DeviceUnderTest& device)
{
    QVERIFY(shows(device, frequencyTitle, "Frequency", ScreenText::large()));
    QVERIFY(shows(device, powerTitle, "Power"));
    QVERIFY(shows(device, beaconLabel, "Beacon Micro"));
    QVERIFY(shows(device, radiosLabel, "Internal RF"));
    QVERIFY(shows(device, frequencyValue, "2402 MHz"));
    QVERIFY(shows(device, powerValue, "-18 dBm"));
}

void RadioPanelSystemTest::walkChannels(DeviceUnderTest& device)
{
    constexpr std::array steps{std::pair("Up", "2440 MHz"),   std::pair("Up", "2474 MHz"),
                               std::pair("Up", "2474 MHz"),   std::pair("Down", "2440 MHz"),
                               std::pair("Down", "2402 MHz"), std::pair("Down", "2402 MHz")};
    for (const auto& [key, text] : steps) {
        const QString label = QStringLiteral("key.%1").arg(QString::fromLatin1(key).toLower());
        REQUIRE(device.strike(key, label));
        QVERIFY2(shows(device, frequencyValue, text), text);
    }
}

void RadioPanelSystemTest::walkLevels(DeviceUnderTest& device)
{
    constexpr std::array steps{std::pair("Right", "-12 dBm"), std::pair("Right", "-6 dBm"),
                               std::pair("Right", "0 dBm"),   std::pair("Right", "0 dBm"),
                               std::pair("Left", "-6 dBm"),   std::pair("Left", "-12 dBm"),
                               std::pair("Left", "-18 dBm"),  std::pair("Left", "-18 dBm")};
    for (const auto& [key, text] : steps) {
        const QString label = QStringLiteral("key.%1").arg(QString::fromLatin1(key).toLower());
        REQUIRE(device.strike(key, label));
        QVERIFY2(shows(device, powerValue, text), text);
    }
}

void RadioPanelSystemTest::switchAntenna(DeviceUnderTest& device)
{
    for (const auto& [text, receiver] : {std::pair("External RF", 2), std::pair("Internal RF", 1)}) {
        REQUIRE(device.strike("Soft3", "key.soft3"));
        QVERIFY2(shows(device, radiosLabel, text), text);
        REQUIRE(device.waitControl("dsp.receiver", receiver));
    }
}

void RadioPanelSystemTest::stopAndStart(DeviceUnderTest& device)
{
    REQUIRE(device.press("Return"));
    REQUIRE(device.waitRegion("key.sel", "green"));
    QVERIFY(shows(device, transmission, "| X", ScreenText::large(true)));
    REQUIRE(device.release("Return"));
    REQUIRE(device.waitRegion("key.sel", "white"));
    // Two seconds are more than the animation's four steps.
    REQUIRE(ScreenHealth::passesARound(device));
    QVERIFY(ScreenText::isAt(device.screenshot(), transmission, "| X", ScreenText::large(true)));
    REQUIRE(device.tap("Return"));
    for (const auto* const text : {"| )", "| ) )", "| ) ) )", "|"})
        QVERIFY2(shows(device, transmission, text, ScreenText::large(true)), text);
}

void RadioPanelSystemTest::checkKeysWithoutText(DeviceUnderTest& device)
{
    for (const auto& [key, region] : {std::pair("F5", "key.soft1"), std::pair("F6", "key.soft2"),
                                      std::pair("F12", "key.power"), std::pair("Escape", "key.unknown")})
        REQUIRE(device.strike(key, region));
}

void RadioPanelSystemTest::everyKeyChangesWhatThePanelShows_data()
{
    QTest::addColumn<QString>("setting");
    QTest::addColumn<QString>("lineOnceItRuns");
    QTest::addColumn<QString>("beacon");
    QTest::addRow("radio that answers") << "radio.presence=present"
                                        << "connected"
                                        << "green";
    QTest::addRow("no line from the start") << "radio.presence=missing"
                                            << "connected"
                                            << "red";
    QTest::addRow("line that hangs up") << "radio.presence=present"
                                        << "hung-up"
                                        << "red";
}

/// With a dead line nothing is sent, and everything else is as it is with a radio.
void RadioPanelSystemTest::everyKeyChangesWhatThePanelShows()
{
    QFETCH(const QString, setting);
    QFETCH(const QString, lineOnceItRuns);
    QFETCH(const QString, beacon);
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", setting}));
    REQUIRE(device.set("radio.line", lineOnceItRuns));
    REQUIRE(device.waitRegion("rf.beacon", beacon));
    REQUIRE(device.waitRegion("rf.radios", "green"));
    for (const auto part : {checkTitles, walkChannels, walkLevels, switchAntenna, stopAndStart, checkKeysWithoutText}) {
        part(device);
        if (QTest::currentTestFailed())
            return;
    }
    REQUIRE(device.waitRegion("rf.beacon", beacon));
    QCOMPARE(ScreenHealth::differences(device, {"rf.beacon"}), QString());
}

/// Each command ends by the link's own time-out, which is logged: nothing is given up earlier, and nothing hangs.
void RadioPanelSystemTest::silentMicrocontrollerCostsATimeOutForEachCommand()
{
    const QString timedOut = QStringLiteral("Beacon processor timed out");
    DeviceUnderTest device;
    REQUIRE(device.start({"--set", "radio.ack=off"}));
    const auto timeOuts = [&] { return device.logTexts().filter(timedOut).size(); };
    // The amplifier and the packet, before the window stands; pings come later.
    QVERIFY(timeOuts() >= 2);
    REQUIRE(device.waitRegion("rf.beacon", "red"));
    REQUIRE(device.press("Up"));
    REQUIRE(device.waitRegion("key.up", "green"));
    REQUIRE(device.release("Up"));
    QVERIFY(shows(device, frequencyValue, "2440 MHz"));
    REQUIRE(device.waitRegion("key.up", "white"));
    // Stop and start of the packet waited too; at most one command is still under way.
    const auto ended = timeOuts();
    QVERIFY(ended >= 4);
    const qint64 sent = device.get("radio.commands").toInteger();
    QVERIFY2(sent >= ended && sent <= timeOuts() + 1,
             qPrintable(QStringLiteral("%1 sent, %2 ended").arg(sent).arg(ended)));
    QCOMPARE(device.get("radio.channel").toInteger(), 0);
    QCOMPARE(device.regionColour("rf.beacon"), "red");
    REQUIRE(device.set("radio.ack", "on"));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
    REQUIRE(device.tap("Up"));
    REQUIRE(device.waitControl("radio.channel", 74));
    QVERIFY(shows(device, frequencyValue, "2474 MHz"));
}

QTEST_MAIN(RadioPanelSystemTest)
#include "RadioPanelSystemTest.moc"
