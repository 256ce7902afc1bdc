// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RtcTest.h"
#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/WidgetProbe.h"
#include "tests/support/DeviceUnderTest.h"

#include <QApplication>
#include <QDateTimeEdit>
#include <QTest>

#include <unistd.h>

#include <ctime>

using Presentation::RtcTest;
using TestSupport::child;

namespace
{

const QString red = QStringLiteral("background-color: red");
const QString openFailed = QStringLiteral("Unable to open RTC ");
const QString readFailed = QStringLiteral("Unable to read from RTC ");
constexpr qint64 aMondayAfternoon = 1'299'510'245; ///< 2011-03-07 15:04:05 UTC
constexpr qint64 inTheGap = 1'299'983'400;         ///< 2011-03-13 02:30:00, an hour that New York's clocks skip

} // namespace

/// The clock region on a clock that answers.
class RtcOnDeviceTest : public QObject
{
    Q_OBJECT

private slots:
    void initTestCase() { QVERIFY2(device.attach(), qPrintable(device.error())); }

    void init()
    {
        QVERIFY2(device.set("rtc.fault", "none"), qPrintable(device.error()));
        QVERIFY2(device.set("rtc.running", false), qPrintable(device.error()));
        QVERIFY2(device.set("rtc.time", aMondayAfternoon), qPrintable(device.error()));
    }

    void showsWhatTheClockHolds()
    {
        const TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        test.start();
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        QCOMPARE(edit.text(), QStringLiteral("3/7/11 3:04:05 PM"));
        QCOMPARE(edit.styleSheet(), QString());
        QVERIFY2(device.set("rtc.time", aMondayAfternoon - 3 * 3600), qPrintable(device.error()));
        QTRY_COMPARE_WITH_TIMEOUT(edit.text(), QStringLiteral("3/7/11 12:04:05 PM"), 20'000);
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

    void ticks()
    {
        QVERIFY2(device.set("rtc.running", true), qPrintable(device.error()));
        RtcTest test(nullptr);
        test.start();
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        for (int tick = 0; tick < 2; ++tick) {
            const auto before = edit.dateTime();
            QTRY_VERIFY_WITH_TIMEOUT(edit.dateTime() > before, 20'000);
        }
    }

    void oneFailedReadLeavesTheFieldRedForGood()
    {
        TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        test.start();
        QCOMPARE(edit.styleSheet(), QString());
        QVERIFY2(device.set("rtc.fault", "EIO"), qPrintable(device.error()));
        QTRY_COMPARE_WITH_TIMEOUT(edit.styleSheet(), red, 20'000);
        QCOMPARE(output.take().value(0), readFailed);
        QVERIFY2(device.set("rtc.fault", "none"), qPrintable(device.error()));
        QVERIFY2(device.set("rtc.time", aMondayAfternoon + 3600), qPrintable(device.error()));
        QTRY_COMPARE_WITH_TIMEOUT(edit.text(), QStringLiteral("3/7/11 4:04:05 PM"), 20'000);
        QCOMPARE(edit.styleSheet(), red);
    }

    void aClockThatVanishesIsNotOpenedAndComesBack()
    {
        TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        test.start();
        QVERIFY2(device.set("rtc.fault", "ENOENT"), qPrintable(device.error()));
        QTRY_VERIFY_WITH_TIMEOUT(output.texts().size() >= 2, 20'000);
        QCOMPARE(output.take().mid(0, 2), QStringList({openFailed, readFailed}));
        QVERIFY2(device.set("rtc.fault", "none"), qPrintable(device.error()));
        QVERIFY2(device.set("rtc.time", aMondayAfternoon + 60), qPrintable(device.error()));
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        QTRY_COMPARE_WITH_TIMEOUT(edit.text(), QStringLiteral("3/7/11 3:05:05 PM"), 20'000);
    }

    void garbageFromTheClockHarmsNothing()
    {
        QVERIFY2(device.set("rtc.fault", "garbage"), qPrintable(device.error()));
        RtcTest test(nullptr);
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        const QDateTime before = edit.dateTime();
        test.start();
        QCOMPARE(edit.dateTime(), before);
        QCOMPARE(edit.styleSheet(), QString());
        QVERIFY2(device.set("rtc.fault", "none"), qPrintable(device.error()));
        QTRY_COMPARE_WITH_TIMEOUT(edit.text(), QStringLiteral("3/7/11 3:04:05 PM"), 20'000);
    }

    void theTimeZonePlaysNoPart()
    {
        qputenv("TZ", "America/New_York");
        tzset();
        QVERIFY2(device.set("rtc.time", inTheGap), qPrintable(device.error()));
        RtcTest test(nullptr);
        test.start();
        const QString shown = child<QDateTimeEdit>(test, "dateTimeEdit").text();
        qputenv("TZ", "UTC");
        tzset();
        QCOMPARE(shown, QStringLiteral("3/13/11 2:30:00 AM"));
    }

private:
    TestSupport::DeviceUnderTest device;
};

/// Runs itself again in the sandbox of a virtual device.
int main(int argc, char** argv)
{
    if (!qEnvironmentVariableIsSet("VIRTUAL_DEVICE_CONTROL")) {
        const QByteArray program = qgetenv("IMMUNITYRIG_BUILD") + "/virtual-device/virtual-device";
        QList<char*> arguments{const_cast<char*>(program.constData()), const_cast<char*>("exec"),
                               const_cast<char*>("--")};
        arguments.append(QList<char*>(argv, argv + argc));
        arguments.append(nullptr);
        ::execv(program.constData(), arguments.data());
        qFatal("no %s", program.constData());
    }
    QApplication application(argc, argv);
    RtcOnDeviceTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "RtcOnDeviceTest.moc"
