// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RtcTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/Poll.h"
#include "tests/presentation/WidgetProbe.h"

#include <QDateTimeEdit>
#include <QTest>

using Presentation::RtcTest;
using TestSupport::child;
using TestSupport::Poll;

namespace
{

const QString clockFile = QStringLiteral("/dev/rtc");
const QString openFailed = QStringLiteral("Unable to open RTC ");
const QString readFailed = QStringLiteral("Unable to read from RTC ");

} // namespace

/// What the region shows without a clock or with one that fails; a clock that answers needs the virtual device.
class RtcTestTest : public QObject
{
    Q_OBJECT

private slots:
    void cleanup() { TestSupport::removePath(clockFile); }

    void theFormIsOneReadOnlyCentredField()
    {
        RtcTest test(nullptr);
        QCOMPARE(test.objectName(), QStringLiteral("RtcTest"));
        QCOMPARE(test.windowTitle(), QStringLiteral("Form"));
        QCOMPARE(test.size(), QSize(240, 320));
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        QCOMPARE(edit.parentWidget(), &test);
        QCOMPARE(edit.geometry(), QRect(0, 0, 240, 30));
        QCOMPARE(edit.font().family(), QStringLiteral("DejaVu Sans"));
        QCOMPARE(edit.font().pointSizeF(), QApplication::font().pointSizeF());
        QCOMPARE(edit.focusPolicy(), Qt::NoFocus);
        QCOMPARE(edit.alignment(), Qt::AlignHCenter | Qt::AlignVCenter);
        QVERIFY(edit.isReadOnly());
        QCOMPARE(edit.buttonSymbols(), QAbstractSpinBox::NoButtons);
        QCOMPARE(edit.displayFormat(), QStringLiteral("M/d/yy h:mm:ss AP"));
        QCOMPARE(edit.styleSheet(), QString());
    }

    void timesAreShownInTwelveHoursWithoutLeadingZeros()
    {
        RtcTest test(nullptr);
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        edit.setDateTime(QDateTime(QDate(2011, 3, 7), QTime(15, 4, 5), Qt::UTC));
        QCOMPARE(edit.text(), QStringLiteral("3/7/11 3:04:05 PM"));
        edit.setDateTime(QDateTime(QDate(2099, 12, 31), QTime(23, 59, 59), Qt::UTC));
        QCOMPARE(edit.text(), QStringLiteral("12/31/99 11:59:59 PM"));
    }

    void isIdleUntilStarted()
    {
        const TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        QVERIFY(QMetaObject::invokeMethod(&test, "updateTime"));
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(child<QDateTimeEdit>(test, "dateTimeEdit").styleSheet(), QString());
    }

    void aMissingClockIsToldEverySecondAndTurnsTheFieldRed()
    {
        TestSupport::DebugOutput output;
        const TestSupport::TimerProbe probe;
        RtcTest test(nullptr);
        test.start();
        QCOMPARE(output.take(), QStringList({openFailed, readFailed}));
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        QCOMPARE(edit.styleSheet(), QStringLiteral("background-color: red"));

        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_COMPARE_WITH_TIMEOUT(output.texts(), QStringList({openFailed, readFailed}), 20'000);
        QCOMPARE(timer->interval(), 1000);
        QVERIFY(timer->isSingleShot());
        QVERIFY(timer->isActive());
        QCOMPARE(output.complaints(), QStringList());
    }

    void aMissingClockIsNotCreated()
    {
        RtcTest test(nullptr);
        test.start();
        QVERIFY(!QFile::exists(clockFile));
    }

    void aClockThatCannotTellTheTimeFailsTheReadAlone()
    {
        TestSupport::writeFile(clockFile, "no clock");
        const TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        test.start();
        QCOMPARE(output.texts(), QStringList({readFailed}));
        QCOMPARE(child<QDateTimeEdit>(test, "dateTimeEdit").styleSheet(), QStringLiteral("background-color: red"));
        QCOMPARE(TestSupport::readFile(clockFile), QByteArray("no clock"));
    }

    /// The clock is opened as its driver is used: for reading and writing.
    void aClockThatMayOnlyBeReadIsNotOpened()
    {
        TestSupport::writeFile(clockFile, "no clock");
        QVERIFY(QFile::setPermissions(clockFile, QFile::ReadOwner | QFile::ReadGroup | QFile::ReadOther));
        const TestSupport::DebugOutput output;
        RtcTest test(nullptr);
        test.start();
        QCOMPARE(output.texts(), QStringList({openFailed, readFailed}));
    }

    void aFailedReadShowsNoInventedTime()
    {
        RtcTest test(nullptr);
        auto& edit = child<QDateTimeEdit>(test, "dateTimeEdit");
        const QDateTime before(QDate(2011, 3, 7), QTime(15, 4, 5), Qt::UTC);
        edit.setDateTime(before);
        test.start();
        QCOMPARE(edit.dateTime(), before);
    }

    void stopsAndStartsAgain()
    {
        TestSupport::DebugOutput output;
        const TestSupport::TimerProbe probe;
        RtcTest test(nullptr);
        test.start();
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_VERIFY_WITH_TIMEOUT(timer->isActive(), 20'000);

        test.stop();
        QVERIFY(!timer->isActive());
        output.take();
        QVERIFY(QMetaObject::invokeMethod(&test, "updateTime"));
        QCOMPARE(output.texts(), QStringList());
        QVERIFY(!timer->isActive());

        test.start();
        QCOMPARE(output.texts(), QStringList({openFailed, readFailed}));
        QVERIFY(timer->isActive());
    }

    void aFieldThatShowsTheSameIsNotPaintedAgain()
    {
        const Poll poll("updateTime");
        RtcTest test(nullptr);
        poll.comparePaints(test);
    }
};

QTEST_MAIN(RtcTestTest)
#include "RtcTestTest.moc"
