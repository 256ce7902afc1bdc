// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QTimer>

#include <chrono>

namespace VirtualDevice
{

/// Something that happens so many times a second, on the average exactly, also where that is no whole number of
/// milliseconds. What a thread that was held up has missed is made up for up to `longestDebt`; older turns are lost.
/// Lives in the thread of its owner, which must run an event loop.
class RateTimer : public QObject
{
    Q_OBJECT

public:
    static constexpr std::chrono::milliseconds longestDebt{100};

    explicit RateTimer(QObject* parent = nullptr);

    /// Starts anew with the first turn one period from now; 0 stops.
    void setRate(qint64 perSecond);

signals:
    void due();

private:
    using Clock = std::chrono::steady_clock;

    void serve();

    QTimer timer;
    std::chrono::nanoseconds period{};
    Clock::time_point next;
};

} // namespace VirtualDevice
