// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TriggerTest.h"

#include "tests/presentation/LabelForm.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QTest>

using Presentation::TriggerTest;
using TestSupport::child;
using TestSupport::green;
using TestSupport::red;

namespace
{

QString style(TriggerTest& test)
{
    return child<QLabel>(test, "connectedLabel").styleSheet();
}

} // namespace

class TriggerTestTest : public QObject
{
    Q_OBJECT

private slots:
    void theFormIsOneLabelThatIsRedAtFirst()
    {
        TriggerTest test(nullptr);
        auto& label = child<QLabel>(test, "connectedLabel");
        TestSupport::compareLabelForm(test, QStringLiteral("TriggerTest"), label, QRect(0, 0, 120, 18),
                                      QStringLiteral("Trigger"), QString());
        QCOMPARE(label.styleSheet(), QStringLiteral("background-color: red"));
        QCOMPARE(TestSupport::paintedColour(label), QColor(255, 0, 0));
    }

    void triggersBeforeStartAreIgnored()
    {
        TriggerTest test(nullptr);
        test.triggerInput();
        QCOMPARE(style(test), QStringLiteral("background-color: red"));
    }

    void startAloneChangesNothing()
    {
        TriggerTest test(nullptr);
        test.start();
        QCOMPARE(style(test), QStringLiteral("background-color: red"));
    }

    void aTriggerIsGreenUntilASecondHasPassed()
    {
        TriggerTest test(nullptr);
        test.start();
        QElapsedTimer sinceTrigger;
        sinceTrigger.start();
        test.triggerInput();
        QCOMPARE(style(test), green);
        QCOMPARE(TestSupport::paintedColour(child<QLabel>(test, "connectedLabel")), QColor(0, 128, 0));
        QTRY_COMPARE_WITH_TIMEOUT(style(test), red, 20'000);
        QVERIFY(sinceTrigger.elapsed() >= 1000);
    }

    /// So that triggers which come just within their second never show red.
    void theSecondIsExactAndBeginsAnewWithEveryTrigger()
    {
        const TestSupport::TimerProbe probe;
        TriggerTest test(nullptr);
        test.start();
        test.triggerInput();
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QCOMPARE(timer->interval(), 1000);
        QCOMPARE(timer->timerType(), Qt::PreciseTimer);
        test.triggerInput();
        QTRY_VERIFY_WITH_TIMEOUT(timer->remainingTime() < 500, 20'000);
        test.triggerInput();
        QVERIFY(timer->remainingTime() > 500);
    }

    void redIsSetAgainEverySecondUntilTheNextTrigger()
    {
        TriggerTest test(nullptr);
        test.start();
        test.triggerInput();
        for (int round = 0; round < 2; ++round) {
            QTRY_COMPARE_WITH_TIMEOUT(style(test), red, 20'000);
            child<QLabel>(test, "connectedLabel").setStyleSheet(green);
        }
        test.triggerInput();
        QCOMPARE(style(test), green);
    }

    void aTriggerAfterStopIsIgnoredButTheRunningSecondStillEndsInRed()
    {
        const TestSupport::TimerProbe probe;
        TriggerTest test(nullptr);
        test.start();
        test.triggerInput();
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        test.triggerInput();
        QTRY_VERIFY_WITH_TIMEOUT(timer->remainingTime() < 700, 20'000);
        test.stop();
        test.triggerInput();
        QVERIFY(timer->remainingTime() <= 700);
        QCOMPARE(style(test), green);
        QTRY_COMPARE_WITH_TIMEOUT(style(test), red, 20'000);
    }

    void aColourThatStaysIsNotPaintedAgain()
    {
        const TestSupport::TimerProbe probe;
        TriggerTest test(nullptr);
        test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&test));
        test.start();
        test.triggerInput();
        QTRY_COMPARE_WITH_TIMEOUT(style(test), red, 20'000);
        QTest::qWait(100);
        const TestSupport::PaintCounter counter(test);
        QTRY_VERIFY_WITH_TIMEOUT(probe.firings(probe.waitForTimer()) >= 2, 20'000);
        QCOMPARE(counter.paints, 0);
    }
};

QTEST_MAIN(TriggerTestTest)
#include "TriggerTestTest.moc"
