// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/RateTimer.h"

#include <algorithm>

namespace VirtualDevice
{

using namespace std::chrono_literals;

RateTimer::RateTimer(QObject* parent) : QObject(parent), timer(this)
{
    timer.setTimerType(Qt::PreciseTimer);
    connect(&timer, &QTimer::timeout, this, &RateTimer::serve);
}

void RateTimer::setRate(qint64 perSecond)
{
    timer.stop();
    if (perSecond <= 0)
        return;
    period = std::chrono::nanoseconds(1s) / perSecond;
    next = Clock::now() + period;
    timer.start(std::max(1ms, std::chrono::floor<std::chrono::milliseconds>(period)));
}

void RateTimer::serve()
{
    const auto now = Clock::now();
    next = std::max(next, now - longestDebt);
    while (timer.isActive() && next <= now) { // whoever is told may change the rate
        next += period;
        emit due();
    }
}

} // namespace VirtualDevice
