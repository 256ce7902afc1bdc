// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/ExactTimer.h"

#include <QDeadlineTimer>
#include <QSignalSpy>
#include <QTest>

#include <algorithm>
#include <chrono>

using namespace VirtualDevice;
using namespace std::chrono_literals;

class ExactTimerTest : public QObject
{
    Q_OBJECT

private slots:
    void itEndsOnceAndNeverEarly_data()
    {
        QTest::addColumn<qint64>("nanoseconds");
        for (const std::chrono::nanoseconds time : {0ns, 1ns, 868'000ns, 1'000'000'001ns})
            QTest::addRow("%lld ns", static_cast<long long>(time.count())) << qint64{time.count()};
    }

    void itEndsOnceAndNeverEarly()
    {
        QFETCH(const qint64, nanoseconds);
        ExactTimer timer;
        const QSignalSpy ends(&timer, &ExactTimer::timeout);
        const auto start = std::chrono::steady_clock::now();
        timer.start(std::chrono::nanoseconds(nanoseconds));
        QVERIFY(timer.isActive());
        QTRY_COMPARE(ends.size(), 1);
        QVERIFY((std::chrono::steady_clock::now() - start).count() >= nanoseconds);
        QVERIFY(!timer.isActive());
        QTest::qWait(20);
        QCOMPARE(ends.size(), 1);
    }

    /// The quickest of many: a busy machine may hold up any one of them.
    void itDoesNotWaitForTheMillisecond()
    {
        ExactTimer timer;
        auto quickest = std::chrono::nanoseconds::max();
        for (int round = 0; round < 200; ++round) {
            const QSignalSpy ends(&timer, &ExactTimer::timeout);
            const auto start = std::chrono::steady_clock::now();
            timer.start(100us);
            for (const QDeadlineTimer patience(5000); ends.isEmpty() && !patience.hasExpired();)
                QCoreApplication::processEvents(QEventLoop::WaitForMoreEvents);
            quickest = std::min<std::chrono::nanoseconds>(quickest, std::chrono::steady_clock::now() - start);
        }
        QVERIFY2(quickest < 1ms, qPrintable(QString::number(quickest.count())));
    }

    void stoppedOrStartedAnewItForgetsTheTimeBefore()
    {
        ExactTimer timer;
        const QSignalSpy ends(&timer, &ExactTimer::timeout);
        timer.start(1ns);
        QTest::qSleep(5);
        timer.stop();
        QVERIFY(!timer.isActive());
        QTest::qWait(20);
        QCOMPARE(ends.size(), 0);
        timer.start(1ns);
        QTest::qSleep(5);
        timer.start(1h);
        QTest::qWait(20);
        QCOMPARE(ends.size(), 0);
        QVERIFY(timer.isActive());
        timer.start(-1s);
        QTRY_COMPARE(ends.size(), 1);
    }
};

QTEST_GUILESS_MAIN(ExactTimerTest)
#include "ExactTimerTest.moc"
