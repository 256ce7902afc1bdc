// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DeviceUnderTest.h"
#include "virtual-device/control/ControlClient.h"

#include <QJsonArray>
#include <QJsonObject>
#include <QTest>

#include <array>
#include <utility>

using TestSupport::DeviceUnderTest;
using VirtualDevice::ControlClient;

namespace
{

constexpr int limitMs = 20000;

// Commands as they reach the microcontroller: code and data, in hexadecimal.
const QString amplifierOn = QStringLiteral("6401");
const QString amplifierOff = QStringLiteral("6400");
const QString stopPacket = QStringLiteral("61");
const QString startPacket = QStringLiteral("600200"); // channel 2, lowest level
const QString ping = QStringLiteral("7e");

constexpr std::array keys{
    std::pair("Return", "key.sel"), std::pair("Up", "key.up"),       std::pair("Down", "key.down"),
    std::pair("Left", "key.left"),  std::pair("Right", "key.right"), std::pair("F5", "key.soft1"),
    std::pair("F6", "key.soft2"),   std::pair("F7", "key.soft3"),    std::pair("F12", "key.power")};

} // namespace

/// What the radio microcontroller is told, command by command and in which order, and what the window shows when its
/// line dies under the running program. One device serves all: every test leaves the radio as it found it, except for
/// the last, whose line is dead for good.
class RadioSystemTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase();
    void init();

    void startResetsTheRadioOnce();
    void startSwitchesTheAmplifierOnBeforeThePacket();
    void changesRestartThePacket();
    void enterEndsThePacketFirstAndStartsItFirst();
    void antennaChangesAreMadeDuringAPauseOfTheTransmission();
    void unpluggedLineTurnsTheBeaconRedUntilItIsBack();
    void lineThatHangsUpTurnsTheBeaconRedAndEveryKeyAnswers();

private:
    bool listen();
    void note(const QString& control, const QJsonValue& value);
    bool becomes(const QStringList& expected);

    DeviceUnderTest device;
    ControlClient listener;
    QStringList told;        ///< commands of the radio and the DSP in their order, without pings
    QStringList toldAtStart; ///< the radio alone: the DSP's part may come before the listener
};

bool RadioSystemTest::listen()
{
    if (listener.open(device.controlSocket()))
        return false;
    connect(&listener, &ControlClient::notified, this, [this](const QString&, const QJsonObject& event) {
        note(event.value("name").toString(), event.value("value"));
    });
    const bool hears = listener.call("events", {{"kinds", QJsonArray{"control"}}}).isOk();
    // The first command may have come before the first event.
    const QJsonValue last = listener.call("get", {{"name", "radio.last_command"}}).result;
    if (!told.contains(last.toString()))
        note("radio.last_command", last);
    return hears;
}

void RadioSystemTest::note(const QString& control, const QJsonValue& value)
{
    if (control == "radio.last_command" && value != ping && !value.toString().isEmpty())
        told.append(value.toString());
    else if (control == "dsp.receiver" || control == "dsp.hardware_test")
        told.append(QStringLiteral("%1 %2").arg(control).arg(value.toInteger()));
}

bool RadioSystemTest::becomes(const QStringList& expected)
{
    return QTest::qWaitFor([&] { return told == expected; }, limitMs);
}

/// Acknowledged late, the first command is still the last one when the listener comes.
void RadioSystemTest::initTestCase()
{
    REQUIRE(device.begin({"--set", "radio.ack=late", "--set", "radio.ack_delay=1500"}));
    QVERIFY(listen());
    REQUIRE(device.waitReady());
    (void)QTest::qWaitFor([&] { return told.contains(startPacket); }, limitMs);
    for (const auto& command : std::as_const(told))
        if (!command.startsWith("dsp."))
            toldAtStart.append(command);
    REQUIRE(device.set("radio.ack", "on"));
}

void RadioSystemTest::init()
{
    REQUIRE(device.waitRegion("rf.beacon", "green"));
    told.clear();
}

void RadioSystemTest::startResetsTheRadioOnce()
{
    QCOMPARE(device.get("reset_line.writes").toInteger(), 1);
    QCOMPARE(device.get("radio.resets").toInteger(), 1);
}

void RadioSystemTest::startSwitchesTheAmplifierOnBeforeThePacket()
{
    QCOMPARE(toldAtStart.join(u' '), QString(amplifierOn + u' ' + startPacket));
}

/// Also where the value stays: at both ends of either range. The amplifier is left alone.
void RadioSystemTest::changesRestartThePacket()
{
    QStringList expected;
    for (const auto& [key, packet] :
         {std::pair("Down", "600200"), std::pair("Up", "602800"), std::pair("Up", "604a00"), std::pair("Up", "604a00"),
          std::pair("Down", "602800"), std::pair("Down", "600200"), std::pair("Left", "600200"),
          std::pair("Right", "600201"), std::pair("Right", "600202"), std::pair("Right", "600203"),
          std::pair("Right", "600203"), std::pair("Left", "600202"), std::pair("Left", "600201"),
          std::pair("Left", "600200")}) {
        expected << stopPacket << QString::fromLatin1(packet);
        REQUIRE(device.tap(key));
        QVERIFY2(becomes(expected), qPrintable(told.join(u' ')));
    }
}

void RadioSystemTest::enterEndsThePacketFirstAndStartsItFirst()
{
    REQUIRE(device.tap("Return"));
    QVERIFY2(becomes({stopPacket, amplifierOff}), qPrintable(told.join(u' ')));
    REQUIRE(device.tap("Return"));
    QVERIFY2(becomes({stopPacket, amplifierOff, startPacket, amplifierOn}), qPrintable(told.join(u' ')));
}

void RadioSystemTest::antennaChangesAreMadeDuringAPauseOfTheTransmission()
{
    QStringList expected;
    for (const char* receiver : {"dsp.receiver 2", "dsp.receiver 1"}) {
        expected << "dsp.hardware_test 0" << stopPacket << amplifierOff << "dsp.receiver 0" << receiver << startPacket
                 << amplifierOn << "dsp.hardware_test 1";
        REQUIRE(device.tap("F7"));
        QVERIFY2(becomes(expected), qPrintable(told.join(u' ')));
    }
}

void RadioSystemTest::unpluggedLineTurnsTheBeaconRedUntilItIsBack()
{
    REQUIRE(device.set("radio.line", "unplugged"));
    REQUIRE(device.waitRegion("rf.beacon", "red"));
    REQUIRE(device.strike("F12", "key.power"));
    REQUIRE(device.set("radio.line", "connected"));
    REQUIRE(device.waitRegion("rf.beacon", "green"));
}

/// The last of all.
void RadioSystemTest::lineThatHangsUpTurnsTheBeaconRedAndEveryKeyAnswers()
{
    REQUIRE(device.set("radio.line", "hung-up"));
    REQUIRE(device.waitRegion("rf.beacon", "red"));
    for (const auto& [key, region] : keys)
        REQUIRE(device.strike(key, region));
    QCOMPARE(device.regionColour("rf.beacon"), QStringLiteral("red"));
}

QTEST_GUILESS_MAIN(RadioSystemTest)
#include "RadioSystemTest.moc"
