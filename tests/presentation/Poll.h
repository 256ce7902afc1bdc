// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/presentation/WidgetProbe.h"

#include <QCoreApplication>
#include <QTest>

#include <functional>

namespace TestSupport
{

/// The poll that nearly every region has: once a second while it is started, by a timer that it starts anew each time.
class Poll
{
public:
    /// `slot` is the poll itself. To be made before the region is.
    explicit Poll(const char* slot) : slotName(slot) {}

    /// The region has been started.
    void compareTimer() const
    {
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QCOMPARE(timer->interval(), 1000);
        QVERIFY(timer->isSingleShot());
        QTRY_VERIFY_WITH_TIMEOUT(timer->isActive(), patienceMs);
    }

    /// A stopped region does not see a change that a started one sees at once. `shown` is what the region says.
    template <typename Region>
    void compareStopAndStart(Region& region, const std::function<void()>& change,
                             const std::function<QString()>& shown) const
    {
        region.start();
        const auto* const timer = probe.waitForTimer();
        QVERIFY(timer != nullptr);
        QTRY_VERIFY_WITH_TIMEOUT(timer->isActive(), patienceMs);
        region.stop();
        QVERIFY(!timer->isActive());
        const QString before = shown();
        change();
        QVERIFY(QMetaObject::invokeMethod(&region, slotName));
        QCOMPARE(shown(), before);
        QVERIFY(!timer->isActive());
        region.start();
        QVERIFY(shown() != before);
        QVERIFY(timer->isActive());
    }

    /// What stays as it is costs no repaint; a change, where there is one, does.
    template <typename Region> void comparePaints(Region& region, const std::function<void()>& change = nullptr) const
    {
        region.show();
        QVERIFY(QTest::qWaitForWindowExposed(&region));
        region.start();
        const auto* const timer = probe.waitForTimer(); // the first paints are done by then
        QVERIFY(timer != nullptr);
        const int firings = probe.firings(timer);
        const PaintCounter counter(region);
        QTRY_VERIFY_WITH_TIMEOUT(probe.firings(timer) >= firings + 2, patienceMs);
        QCOMPARE(counter.paints, 0);
        if (!change)
            return;
        change();
        QTRY_VERIFY_WITH_TIMEOUT(counter.paints > 0, patienceMs);
    }

    TimerProbe probe;

private:
    static constexpr int patienceMs = 20'000;

    const char* slotName;
};

} // namespace TestSupport
