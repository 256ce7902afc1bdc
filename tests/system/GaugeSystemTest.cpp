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

// Inside the fields' frames.
constexpr QRect voltageField(8, 142, 224, 18);
constexpr QRect currentField(8, 167, 224, 18);

} // namespace

/// The fuel gauge's numbers as the screen shows them, with a gauge that is well and with all the ways in which it is
/// not.
class GaugeSystemTest : public QObject
{
    Q_OBJECT

public:
    static void initMain() { ScreenText::prepare(); }

private slots:
    void initTestCase();

    void gaugeFollowsTheBattery_data();
    void gaugeFollowsTheBattery();
    void oddGaugeFilesLeaveTheWindowAlive_data();
    void oddGaugeFilesLeaveTheWindowAlive();
    void gaugeThatCannotBeOpenedKeepsItsValue_data();
    void gaugeThatCannotBeOpenedKeepsItsValue();

private:
    [[nodiscard]] bool comesToShow(const QString& voltage, const QString& current);

    DeviceUnderTest device;
};

bool GaugeSystemTest::comesToShow(const QString& voltage, const QString& current)
{
    const auto isShown = [&] {
        const QImage picture = device.screenshot();
        return ScreenText::isAt(picture, voltageField, "Voltage = " + voltage + " V", ScreenText::named()) &&
               ScreenText::isAt(picture, currentField, "Current = " + current + " mA", ScreenText::named());
    };
    return QTest::qWaitFor(isShown, 20000);
}

void GaugeSystemTest::initTestCase()
{
    REQUIRE(device.start());
    REQUIRE(ScreenHealth::isReached(device));
}

void GaugeSystemTest::gaugeFollowsTheBattery_data()
{
    QTest::addColumn<int>("microvolts");
    QTest::addColumn<int>("microamperes");
    QTest::addColumn<QString>("voltage");
    QTest::addColumn<QString>("current");
    QTest::addRow("charging") << 3333333 << 3333333 << "3.333333"
                              << "3333.3330";
    QTest::addRow("discharging") << 4100000 << -123456 << "4.100000"
                                 << "-123.4560";
    QTest::addRow("empty") << 0 << 0 << "0.000000"
                           << "0.0000";
    QTest::addRow("beyond the fields") << 123000000 << -20000000 << "99.990000"
                                       << "-9999.9900";
}

void GaugeSystemTest::gaugeFollowsTheBattery()
{
    QFETCH(const int, microvolts);
    QFETCH(const int, microamperes);
    QFETCH(const QString, voltage);
    QFETCH(const QString, current);
    REQUIRE(device.set("battery.voltage", microvolts));
    REQUIRE(device.set("battery.current", microamperes));
    QVERIFY(comesToShow(voltage, current));
}

void GaugeSystemTest::oddGaugeFilesLeaveTheWindowAlive_data()
{
    QTest::addColumn<QString>("control");
    QTest::addColumn<QString>("value");
    QTest::addColumn<QString>("voltage");
    QTest::addColumn<QString>("current");
    for (const auto* content : {"empty", "binary", "huge"})
        QTest::addRow("%s", content) << "content" << content << "0.000000"
                                     << "0.0000";
    QTest::addRow("no-newline") << "content"
                                << "no-newline"
                                << "4.100000"
                                << "-123.4560";
    for (const auto* fault : {"EIO", "ENODATA"})
        QTest::addRow("%s", fault) << "fault" << fault << "0.000000"
                                   << "0.0000";
}

/// What is no number shows as zero; nothing of it has a colour.
void GaugeSystemTest::oddGaugeFilesLeaveTheWindowAlive()
{
    QFETCH(const QString, control);
    QFETCH(const QString, value);
    QFETCH(const QString, voltage);
    QFETCH(const QString, current);
    REQUIRE(device.set("battery.voltage", 4100000));
    REQUIRE(device.set("battery.current", -123456));
    REQUIRE(device.follow());
    const QJsonValue whole = device.get("battery.voltage_" + control);
    for (const auto* const file : {"battery.voltage_", "battery.current_"})
        REQUIRE(device.set(file + control, value));
    QVERIFY(comesToShow(voltage, current));
    REQUIRE(device.press("Up"));
    REQUIRE(device.waitRegion("key.up", "green"));
    REQUIRE(device.release("Up"));
    REQUIRE(device.waitRegion("key.up", "white"));
    QCOMPARE(ScreenHealth::differences(device), QString());
    QCOMPARE(device.regionsThatTurned("red"), QStringList());
    for (const auto* const file : {"battery.voltage_", "battery.current_"})
        REQUIRE(device.set(file + control, whole));
    QVERIFY(comesToShow("4.100000", "-123.4560"));
}

void GaugeSystemTest::gaugeThatCannotBeOpenedKeepsItsValue_data()
{
    QTest::addColumn<QString>("fault");
    QTest::addRow("gone") << "ENOENT";
    QTest::addRow("closed") << "EACCES";
}

void GaugeSystemTest::gaugeThatCannotBeOpenedKeepsItsValue()
{
    QFETCH(const QString, fault);
    QVERIFY(comesToShow("4.100000", "-123.4560"));
    for (const auto* const file : {"voltage", "current"})
        REQUIRE(device.set(QStringLiteral("battery.%1_fault").arg(file), fault));
    // New values come with the fault: they must not show.
    REQUIRE(device.set("battery.voltage", 1000000));
    REQUIRE(device.set("battery.current", 1000000));
    for (const auto* const file : {"voltage", "current"}) {
        const QString printed = QStringLiteral("Error opening %1 file \n").arg(file);
        const auto count = device.programOutput().count(printed);
        QTRY_VERIFY_WITH_TIMEOUT(device.programOutput().count(printed) >= count + 2, 20000);
    }
    QVERIFY(comesToShow("4.100000", "-123.4560"));
    QCOMPARE(ScreenHealth::differences(device), QString());
    for (const auto* const file : {"voltage", "current"})
        REQUIRE(device.set(QStringLiteral("battery.%1_fault").arg(file), "none"));
    QVERIFY(comesToShow("1.000000", "1000.0000"));
    REQUIRE(device.set("battery.voltage", 4100000));
    REQUIRE(device.set("battery.current", -123456));
}

QTEST_MAIN(GaugeSystemTest)
#include "GaugeSystemTest.moc"
