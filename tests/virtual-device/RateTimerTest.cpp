// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/RateTimer.h"

#include <QElapsedTimer>
#include <QSignalSpy>
#include <QTest>
#include <QThread>

using namespace VirtualDevice;

class RateTimerTest : public QObject
{
    Q_OBJECT

private slots:
    void itIsNeverFasterThanItsRateAndKeepsItWhereThatIsNoWholeNumberOfMilliseconds()
    {
        RateTimer timer;
        const QSignalSpy turns(&timer, &RateTimer::due);
        QElapsedTimer clock;
        clock.start();
        timer.setRate(300);
        QTRY_VERIFY(turns.size() >= 150);
        QVERIFY2(turns.size() <= clock.nsecsElapsed() * 300 / 1'000'000'000, qPrintable(QString::number(turns.size())));
    }

    void whatAShortStallMissedIsMadeUpFor()
    {
        RateTimer timer;
        const QSignalSpy turns(&timer, &RateTimer::due);
        timer.setRate(1000);
        QThread::msleep(50);
        QCoreApplication::processEvents();
        QVERIFY2(turns.size() >= 50, qPrintable(QString::number(turns.size())));
    }

    void whatALongStallMissedIsLost()
    {
        RateTimer timer;
        const QSignalSpy turns(&timer, &RateTimer::due);
        timer.setRate(1000);
        QThread::msleep(400);
        QCoreApplication::processEvents();
        QVERIFY2(turns.size() >= 100 && turns.size() <= 101, qPrintable(QString::number(turns.size())));
    }

    void zeroStopsAlsoFromATurn()
    {
        RateTimer timer;
        const QSignalSpy turns(&timer, &RateTimer::due);
        connect(&timer, &RateTimer::due, &timer, [&timer] { timer.setRate(0); });
        timer.setRate(1000);
        QThread::msleep(20);
        QTRY_COMPARE(turns.size(), 1);
        QTest::qWait(20);
        QCOMPARE(turns.size(), 1);
    }
};

QTEST_GUILESS_MAIN(RateTimerTest)
#include "RateTimerTest.moc"
