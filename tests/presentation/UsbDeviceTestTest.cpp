// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/UsbDeviceTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/Poll.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QTest>

#include <unistd.h>

using Presentation::UsbDeviceTest;
using TestSupport::child;
using TestSupport::green;
using TestSupport::Poll;
using TestSupport::red;

namespace
{

const QString devices = QStringLiteral("/sys/bus/usb/devices");
const QString device = QStringLiteral("/sys/bus/usb/devices/1-1.4");
const QString target = QStringLiteral("/sys/devices/usb1/1-1/1-1.4");

/// The kernel's entry is a link into the device tree.
void plugIn()
{
    QDir().mkpath(devices);
    QDir().mkpath(target);
    QFile::link(QStringLiteral("../../../devices/usb1/1-1/1-1.4"), device);
}

} // namespace

class UsbDeviceTestTest : public QObject
{
    Q_OBJECT

private slots:
    void cleanup()
    {
        TestSupport::removePath(QStringLiteral("/sys/bus"));
        TestSupport::removePath(QStringLiteral("/sys/devices"));
    }

    void theFormIsOneLabelThatIsRedAtFirst()
    {
        UsbDeviceTest test(nullptr);
        auto& label = child<QLabel>(test, "connectLabel");
        TestSupport::compareLabelForm(test, QStringLiteral("UsbDeviceTest"), label, QRect(0, 0, 120, 25),
                                      QStringLiteral("HID Device"), QStringLiteral("DejaVu Sans"));
        QCOMPARE(label.styleSheet(), red);
        QCOMPARE(TestSupport::paintedColour(label), QColor(255, 0, 0));
    }

    void isIdleUntilStarted()
    {
        plugIn();
        UsbDeviceTest test(nullptr);
        QVERIFY(QMetaObject::invokeMethod(&test, "checkConnect"));
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
    }

    void isGreenAtOnceWithADevice()
    {
        plugIn();
        UsbDeviceTest test(nullptr);
        test.start();
        auto& label = child<QLabel>(test, "connectLabel");
        QCOMPARE(label.styleSheet(), green);
        QCOMPARE(TestSupport::paintedColour(label), QColor(0, 128, 0));
    }

    void followsTheDeviceInBothDirections()
    {
        const TestSupport::DebugOutput output;
        const Poll poll("checkConnect");
        UsbDeviceTest test(nullptr);
        auto& label = child<QLabel>(test, "connectLabel");
        test.start();
        QCOMPARE(label.styleSheet(), red);
        plugIn();
        QTRY_COMPARE_WITH_TIMEOUT(label.styleSheet(), green, 20'000);
        TestSupport::removePath(device);
        QTRY_COMPARE_WITH_TIMEOUT(label.styleSheet(), red, 20'000);
        plugIn();
        QTRY_COMPARE_WITH_TIMEOUT(label.styleSheet(), green, 20'000);
        poll.compareTimer();
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

    void anEntryWhoseDeviceIsGoneIsRed()
    {
        plugIn();
        UsbDeviceTest test(nullptr);
        test.start();
        TestSupport::removePath(QStringLiteral("/sys/devices"));
        QVERIFY(QFileInfo(device).isSymLink());
        QTRY_COMPARE_WITH_TIMEOUT(child<QLabel>(test, "connectLabel").styleSheet(), red, 20'000);
    }

    void anotherPositionIsRed()
    {
        QDir().mkpath(devices + QStringLiteral("/1-1.3"));
        UsbDeviceTest test(nullptr);
        test.start();
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
    }

    void thePathIsRelativeToTheWorkingDirectory()
    {
        plugIn();
        QCOMPARE(::chdir("/tmp"), 0);
        UsbDeviceTest test(nullptr);
        test.start();
        QCOMPARE(::chdir("/"), 0);
        QCOMPARE(child<QLabel>(test, "connectLabel").styleSheet(), red);
    }

    void stopsAndStartsAgain()
    {
        const Poll poll("checkConnect");
        UsbDeviceTest test(nullptr);
        const auto& label = child<QLabel>(test, "connectLabel");
        poll.compareStopAndStart(test, plugIn, [&] { return label.styleSheet(); });
        QCOMPARE(label.styleSheet(), green);
    }

    void aColourThatStaysIsNotPaintedAgain()
    {
        const Poll poll("checkConnect");
        UsbDeviceTest test(nullptr);
        poll.comparePaints(test, plugIn);
    }
};

QTEST_MAIN(UsbDeviceTestTest)
#include "UsbDeviceTestTest.moc"
