// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"

#include <QTest>

using TestSupport::DeviceUnderTest;

/// Every key of the keypad, on the screen, on the power latch, and at the radio and the DSP that it drives.
class KeysSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase();
    void init();

    void keyLightsItsLabelWhileHeld_data();
    void keyLightsItsLabelWhileHeld();
    void keyLightsItsLabelBeforeTheProgramWaitsForItsCommands();
    void powerKeyRaisesTheLatchOnEveryPress();
    void upAndDownWalkTheThreeChannels();
    void rightAndLeftWalkTheFourLevels();
    void enterStopsAndStartsTheTransmission();
    void softKey3SwitchesTheAntenna();
    void softKeys1And2AndPowerChangeNothingElse();
    void unknownKeyChangesNothingElse();

private:
    struct RadioState
    {
        QJsonValue channel, level, amplifier, transmitting, receiver, hardwareTest;
        bool operator==(const RadioState&) const = default;
    };
    RadioState radioState();

    DeviceUnderTest device;
};

KeysSystemTest::RadioState KeysSystemTest::radioState()
{
    return {device.get("radio.channel"),      device.get("radio.power_level"), device.get("radio.amplifier"),
            device.get("radio.transmitting"), device.get("dsp.receiver"),      device.get("dsp.hardware_test")};
}

void KeysSystemTest::initTestCase()
{
    REQUIRE(device.start());
    REQUIRE(device.waitControl("radio.transmitting", true));
}

/// Every test begins with the radio transmitting on the internal antenna, whatever keys the one before has used.
void KeysSystemTest::init()
{
    if (device.get("dsp.receiver").toInteger() != 1)
        REQUIRE(device.tap("Soft3"));
    REQUIRE(device.waitControl("dsp.receiver", 1));
    if (!device.get("radio.amplifier").toBool())
        REQUIRE(device.tap("Return"));
    REQUIRE(device.waitControl("radio.amplifier", true));
    REQUIRE(device.waitControl("radio.transmitting", true));
    REQUIRE(device.waitControl("dsp.hardware_test", 1));
}

void KeysSystemTest::keyLightsItsLabelWhileHeld_data()
{
    QTest::addColumn<QString>("key");
    QTest::addColumn<QString>("region");
    QTest::addRow("Enter") << "Return"
                           << "key.sel";
    QTest::addRow("Left") << "Left"
                          << "key.left";
    QTest::addRow("Up") << "Up"
                        << "key.up";
    QTest::addRow("Right") << "Right"
                           << "key.right";
    QTest::addRow("Down") << "Down"
                          << "key.down";
    QTest::addRow("soft 1") << "F5"
                            << "key.soft1";
    QTest::addRow("soft 2") << "F6"
                            << "key.soft2";
    QTest::addRow("soft 3") << "F7"
                            << "key.soft3";
    QTest::addRow("Power") << "F12"
                           << "key.power";
    QTest::addRow("Escape is unknown") << "Escape"
                                       << "key.unknown";
    QTest::addRow("Tab is unknown") << "Tab"
                                    << "key.unknown";
}

void KeysSystemTest::keyLightsItsLabelWhileHeld()
{
    QFETCH(const QString, key);
    QFETCH(const QString, region);
    REQUIRE(device.strike(key, region));
}

/// With a silent radio and a silent DSP the antenna key holds the program for some fifteen seconds, which end with the
/// fourth command of the DSP. A picture that was under way when the key went down keeps the next one back until then,
/// which is why there is more than one try.
void KeysSystemTest::keyLightsItsLabelBeforeTheProgramWaitsForItsCommands()
{
    const QString timedOut = QStringLiteral("Timed out waiting for DSP ACK");
    bool litInTime = false;
    for (int attempt = 0; attempt < 5 && !litInTime; ++attempt) {
        REQUIRE(device.set("radio.ack", "off"));
        REQUIRE(device.set("dsp.ack", "off"));
        const qint64 mark = device.logMark();
        REQUIRE(device.press("Soft3"));
        REQUIRE(device.waitRegion("key.soft3", "green"));
        litInTime = device.logTexts(mark).filter(timedOut).size() < 4;
        REQUIRE(device.set("radio.ack", "on"));
        REQUIRE(device.set("dsp.ack", "on"));
        REQUIRE(device.release("Soft3"));
        REQUIRE(device.waitRegion("key.soft3", "white"));
    }
    QVERIFY(litInTime);
}

void KeysSystemTest::powerKeyRaisesTheLatchOnEveryPress()
{
    const qint64 before = device.get("led.writes").toInteger();
    REQUIRE(device.tap("Power"));
    REQUIRE(device.waitControl("led.writes", before + 1));
    REQUIRE(device.tap("Power"));
    REQUIRE(device.waitControl("led.writes", before + 2));
    QCOMPARE(device.get("led.power_latch").toInteger(), 1);
}

void KeysSystemTest::upAndDownWalkTheThreeChannels()
{
    const auto walk = [this](const QString& key, std::initializer_list<int> channels) {
        for (const int channel : channels)
            if (!device.tap(key) || !device.waitControl("radio.channel", channel))
                return false;
        return true;
    };
    REQUIRE(walk("Down", {2}) || walk("Down", {2}) || walk("Down", {2}));
    REQUIRE(walk("Up", {40, 74, 74}));
    QCOMPARE(device.get("radio.frequency").toInteger(), 2474);
    REQUIRE(walk("Down", {40, 2, 2}));
    REQUIRE(walk("Up", {40}));
    QCOMPARE(device.get("radio.frequency").toInteger(), 2440);
    REQUIRE(walk("Down", {2}));
}

void KeysSystemTest::rightAndLeftWalkTheFourLevels()
{
    for (int tap = 0; tap < 3; ++tap)
        REQUIRE(device.tap("Left"));
    REQUIRE(device.waitControl("radio.power_level", 0));
    for (const int level : {1, 2, 3, 3}) {
        REQUIRE(device.tap("Right"));
        REQUIRE(device.waitControl("radio.power_level", level));
    }
    for (const int level : {2, 1, 0, 0}) {
        REQUIRE(device.tap("Left"));
        REQUIRE(device.waitControl("radio.power_level", level));
    }
}

void KeysSystemTest::enterStopsAndStartsTheTransmission()
{
    REQUIRE(device.tap("Return"));
    REQUIRE(device.waitControl("radio.transmitting", false));
    REQUIRE(device.waitControl("radio.amplifier", false));
    REQUIRE(device.tap("Return"));
    REQUIRE(device.waitControl("radio.transmitting", true));
    REQUIRE(device.waitControl("radio.amplifier", true));
}

void KeysSystemTest::softKey3SwitchesTheAntenna()
{
    REQUIRE(device.waitControl("dsp.receiver", 1));
    REQUIRE(device.tap("F7"));
    REQUIRE(device.waitControl("dsp.receiver", 2));
    REQUIRE(device.waitControl("dsp.hardware_test", 1));
    REQUIRE(device.waitControl("radio.transmitting", true));
    REQUIRE(device.waitControl("radio.amplifier", true));
    REQUIRE(device.tap("F7"));
    REQUIRE(device.waitControl("dsp.receiver", 1));
    REQUIRE(device.waitControl("dsp.hardware_test", 1));
    REQUIRE(device.waitControl("radio.amplifier", true));
}

void KeysSystemTest::softKeys1And2AndPowerChangeNothingElse()
{
    const RadioState before = radioState();
    const qint64 latch = device.get("led.writes").toInteger();
    for (const auto* key : {"F5", "F6", "F12"})
        REQUIRE(device.tap(key));
    // The latch is written after all three were handled.
    REQUIRE(device.waitControl("led.writes", latch + 1));
    QVERIFY(radioState() == before);
}

void KeysSystemTest::unknownKeyChangesNothingElse()
{
    const RadioState before = radioState();
    const qint64 latch = device.get("led.writes").toInteger();
    REQUIRE(device.tap("Escape"));
    REQUIRE(device.tap("Power"));
    REQUIRE(device.waitControl("led.writes", latch + 1));
    QVERIFY(radioState() == before);
}

QTEST_GUILESS_MAIN(KeysSystemTest)
#include "KeysSystemTest.moc"
