// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/FuelGuageTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/Poll.h"
#include "tests/presentation/WidgetProbe.h"

#include <QDoubleSpinBox>
#include <QGroupBox>
#include <QLocale>
#include <QTest>

#include <unistd.h>

using Presentation::FuelGuageTest;
using TestSupport::child;
using TestSupport::Poll;
using TestSupport::writeFile;

namespace
{

const QString voltageFile = QStringLiteral("/sys/class/power_supply/ds2780-battery.0/voltage_now");
const QString currentFile = QStringLiteral("/sys/class/power_supply/ds2780-battery.0/current_now");
const QString voltageFailed = QStringLiteral("Error opening voltage file ");
const QString currentFailed = QStringLiteral("Error opening current file ");

QString voltageText(FuelGuageTest& test)
{
    return child<QDoubleSpinBox>(test, "voltageSpinBox").text();
}

QString currentText(FuelGuageTest& test)
{
    return child<QDoubleSpinBox>(test, "currentSpinBox").text();
}

void compareBox(const QDoubleSpinBox& box, QRect rectangle, const QString& prefix, const QString& suffix, int decimals)
{
    QCOMPARE(box.geometry(), rectangle);
    QCOMPARE(box.font().family(), QStringLiteral("DejaVu Sans"));
    QVERIFY(box.isReadOnly());
    QCOMPARE(box.buttonSymbols(), QAbstractSpinBox::NoButtons);
    QCOMPARE(box.prefix(), prefix);
    QCOMPARE(box.suffix(), suffix);
    QCOMPARE(box.decimals(), decimals);
    QCOMPARE(box.styleSheet(), QString());
}

} // namespace

class FuelGuageTestTest : public QObject
{
    Q_OBJECT

private slots:
    void init()
    {
        writeFile(voltageFile, "4100000\n");
        writeFile(currentFile, "-123456\n");
    }

    void cleanup() { TestSupport::removePath(QStringLiteral("/sys/class")); }

    void theFormIsAGroupOfTwoNumbers()
    {
        FuelGuageTest test(nullptr);
        QCOMPARE(test.objectName(), QStringLiteral("FuelGuageTest"));
        QCOMPARE(test.windowTitle(), QStringLiteral("Form"));
        QCOMPARE(test.size(), QSize(240, 320));
        auto& group = child<QGroupBox>(test, "groupBox");
        QCOMPARE(group.title(), QStringLiteral("Fuel Gauge"));
        QCOMPARE(group.geometry(), QRect(0, 0, 240, 75));
        const auto& voltage = child<QDoubleSpinBox>(group, "voltageSpinBox");
        compareBox(voltage, {5, 20, 230, 25}, QStringLiteral("Voltage = "), QStringLiteral(" V"), 6);
        QCOMPARE(voltage.minimum(), 0.0);
        QCOMPARE(voltage.maximum(), 99.99);
        const auto& current = child<QDoubleSpinBox>(group, "currentSpinBox");
        compareBox(current, {5, 45, 230, 25}, QStringLiteral("Current = "), QStringLiteral(" mA"), 4);
        QCOMPARE(current.minimum(), -9999.99);
        QCOMPARE(current.maximum(), 9999.99);
    }

    void isIdleUntilStarted()
    {
        FuelGuageTest test(nullptr);
        QVERIFY(QMetaObject::invokeMethod(&test, "checkGauge"));
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 0.000000 V"));
        QCOMPARE(currentText(test), QStringLiteral("Current = 0.0000 mA"));
    }

    void readingsAreShownInVoltsAndMilliamperes_data()
    {
        QTest::addColumn<QByteArray>("voltage");
        QTest::addColumn<QByteArray>("current");
        QTest::addColumn<QString>("voltageShown");
        QTest::addColumn<QString>("currentShown");
        const auto row = [](const char* name, const QByteArray& voltage, const QByteArray& current, const char* volts,
                            const char* milliamperes) {
            QTest::newRow(name) << voltage << current << QStringLiteral("Voltage = %1 V").arg(QLatin1String(volts))
                                << QStringLiteral("Current = %1 mA").arg(QLatin1String(milliamperes));
        };
        row("a discharging battery", "4100000\n", "-123456\n", "4.100000", "-123.4560");
        row("a charging battery", "3700001\n", "1\n", "3.700001", "0.0010");
        row("no line end", "4100000", "-123456", "4.100000", "-123.4560");
        row("only the first line counts", "4100000\n5\n", "-5000\n7\n", "4.100000", "-5.0000");
        row("an empty first line", "\n4100000\n", "\n5\n", "0.000000", "0.0000");
        row("empty files", "", "", "0.000000", "0.0000");
        row("no numbers", "unknown\n", "4.1\n", "0.000000", "0.0000");
        row("a hexadecimal number", "0x10\n", "0x10\n", "0.000000", "0.0000");
        row("numbers beyond 32 bits", "9999999999\n", "-9999999999\n", "0.000000", "0.0000");
        row("numbers beyond the fields' ranges", "2000000000\n", "-2000000000\n", "99.990000", "-9999.9900");
        row("a negative voltage", "-1\n", "2000000000\n", "0.000000", "9999.9900");
        row("noise", QByteArray("\0\xff\x80\x01%n\n", 7), QByteArray(4096, '\xff'), "0.000000", "0.0000");
        row("numbers among many blanks", QByteArray(1 << 16, ' ') + "4100000\n", "-5000" + QByteArray(1 << 16, ' '),
            "4.100000", "-5.0000");
        row("numbers with many zeros", QByteArray(1 << 16, '0') + "4100000\n", "-" + QByteArray(1 << 16, '0') + "5000",
            "4.100000", "-5.0000");
        row("a number before a megabyte of blanks and noise", "4100000" + QByteArray(1 << 20, ' ') + 'x', "5000\n",
            "0.000000", "5.0000");
        row("a megabyte of digits", QByteArray(1 << 20, '7'), QByteArray(1 << 20, '\0'), "0.000000", "0.0000");
    }

    void readingsAreShownInVoltsAndMilliamperes()
    {
        QFETCH(QByteArray, voltage);
        QFETCH(QByteArray, current);
        writeFile(voltageFile, voltage);
        writeFile(currentFile, current);
        const TestSupport::DebugOutput output;
        FuelGuageTest test(nullptr);
        child<QDoubleSpinBox>(test, "voltageSpinBox").setValue(1);
        child<QDoubleSpinBox>(test, "currentSpinBox").setValue(1);
        test.start();
        QTEST(voltageText(test), "voltageShown");
        QTEST(currentText(test), "currentShown");
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
        for (const auto* const box : test.findChildren<QDoubleSpinBox*>())
            QCOMPARE(box->styleSheet(), QString());
    }

    void noLineIsReadWithoutEnd()
    {
        TestSupport::writeEndlessLine(voltageFile, "4100000");
        TestSupport::writeEndlessLine(currentFile, "-123456");
        FuelGuageTest test(nullptr);
        const qint64 before = TestSupport::bytesRead();
        test.start();
        QVERIFY(TestSupport::bytesRead() - before < TestSupport::mostRead);
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 0.000000 V"));
        QCOMPARE(currentText(test), QStringLiteral("Current = 0.0000 mA"));
    }

    void numbersLookTheSameInEveryCountry()
    {
        const QLocale before;
        QLocale::setDefault(QLocale(QLocale::German, QLocale::Germany));
        FuelGuageTest test(nullptr);
        test.start();
        QLocale::setDefault(before);
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 4.100000 V"));
        QCOMPARE(currentText(test), QStringLiteral("Current = -123.4560 mA"));
    }

    void everySecondTheFilesAreReadAgain()
    {
        const Poll poll("checkGauge");
        FuelGuageTest test(nullptr);
        test.start();
        writeFile(voltageFile, "3600000\n");
        writeFile(currentFile, "250000\n");
        QTRY_COMPARE_WITH_TIMEOUT(voltageText(test), QStringLiteral("Voltage = 3.600000 V"), 20'000);
        QCOMPARE(currentText(test), QStringLiteral("Current = 250.0000 mA"));
        poll.compareTimer();
    }

    void aFileThatDoesNotOpenIsToldAndLeavesItsNumber()
    {
        TestSupport::DebugOutput output;
        const TestSupport::TimerProbe probe;
        FuelGuageTest test(nullptr);
        test.start();
        TestSupport::removePath(voltageFile);
        QTRY_VERIFY_WITH_TIMEOUT(output.count(voltageFailed) >= 1, 20'000);
        TestSupport::removePath(currentFile);
        output.take();
        QTRY_COMPARE_WITH_TIMEOUT(output.texts().mid(0, 2), QStringList({voltageFailed, currentFailed}), 20'000);
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 4.100000 V"));
        QCOMPARE(currentText(test), QStringLiteral("Current = -123.4560 mA"));
        QVERIFY(probe.waitForTimer()->isActive());
        QCOMPARE(output.complaints(), QStringList());
    }

    void afterAFailureTheNextGoodReadingIsShown()
    {
        TestSupport::removePath(voltageFile);
        const TestSupport::DebugOutput output;
        FuelGuageTest test(nullptr);
        test.start();
        QCOMPARE(output.texts(), QStringList({voltageFailed}));
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 0.000000 V"));
        writeFile(voltageFile, "4100000\n");
        QTRY_COMPARE_WITH_TIMEOUT(voltageText(test), QStringLiteral("Voltage = 4.100000 V"), 20'000);
    }

    void aFolderInTheFilesPlaceDoesNotOpen()
    {
        TestSupport::removePath(voltageFile);
        QDir().mkpath(voltageFile);
        const TestSupport::DebugOutput output;
        FuelGuageTest test(nullptr);
        test.start();
        QCOMPARE(output.texts(), QStringList({voltageFailed}));
    }

    void thePathsAreRelativeToTheWorkingDirectory()
    {
        QCOMPARE(::chdir("/tmp"), 0);
        const TestSupport::DebugOutput output;
        FuelGuageTest test(nullptr);
        test.start();
        QCOMPARE(::chdir("/"), 0);
        QCOMPARE(output.texts(), QStringList({voltageFailed, currentFailed}));
    }

    void stopsAndStartsAgain()
    {
        const Poll poll("checkGauge");
        FuelGuageTest test(nullptr);
        poll.compareStopAndStart(
            test, [] { writeFile(voltageFile, "3600000\n"); }, [&] { return voltageText(test); });
        QCOMPARE(voltageText(test), QStringLiteral("Voltage = 3.600000 V"));
    }

    void aNumberThatStaysIsNotPaintedAgain()
    {
        const Poll poll("checkGauge");
        FuelGuageTest test(nullptr);
        test.setAttribute(Qt::WA_ShowWithoutActivating);
        poll.comparePaints(test, [] { writeFile(voltageFile, "3600000\n"); });
    }
};

QTEST_MAIN(FuelGuageTestTest)
#include "FuelGuageTestTest.moc"
