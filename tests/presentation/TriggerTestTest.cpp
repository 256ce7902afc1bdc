// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TriggerTest.h"

#include "tests/presentation/LabelForm.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QTest>
#include <QThread>
#include <QTimer>

#include <functional>

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

/// What the label shows a second after a moment between now and `later`, which is called before any event is handled:
/// the second that begins with `later` is not over then, however long the machine stands still, since timers go off in
/// the order of their times.
QString styleASecondBehindTheMiddle(TriggerTest& test, const std::function<void()>& later)
{
    QString seen;
    QTimer middle;
    middle.setTimerType(Qt::PreciseTimer);
    middle.setSingleShot(true);
    QObject::connect(&middle, &QTimer::timeout, [&] { seen = style(test); });
    QThread::msleep(20);
    middle.start(1000);
    QThread::msleep(20);
    later();
    return QTest::qWaitFor([&] { return !seen.isEmpty(); }, 20'000) ? seen : QStringLiteral("nothing");
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
        QCOMPARE(styleASecondBehindTheMiddle(test, [&] { test.triggerInput(); }), green);
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
        TriggerTest test(nullptr);
        test.start();
        test.triggerInput();
        QCOMPARE(styleASecondBehindTheMiddle(test,
                                             [&] {
                                                 test.stop();
                                                 test.triggerInput();
                                                 QCOMPARE(style(test), green);
                                             }),
                 red);
        test.triggerInput();
        QCOMPARE(style(test), red);
    }

    void aColourThatStaysIsNotPaintedAgain()
    {
        const TestSupport::TimerProbe probe;
        TriggerTest test(nullptr);
        test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&test));
        test.start();
        test.triggerInput();
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QCOMPARE(style(test), red);
        QTRY_VERIFY_WITH_TIMEOUT(probe.firings(timer) >= 2, 20'000); // red has been painted before this one
        const int firings = probe.firings(timer);
        const TestSupport::PaintCounter counter(test);
        QTRY_VERIFY_WITH_TIMEOUT(probe.firings(timer) >= firings + 2, 20'000);
        QCOMPARE(counter.paints, 0);
    }
};

QTEST_MAIN(TriggerTestTest)
#include "TriggerTestTest.moc"
