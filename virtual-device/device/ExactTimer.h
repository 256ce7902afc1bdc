// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QSocketNotifier>

#include <chrono>

namespace VirtualDevice
{

/// A single-shot timer in nanoseconds: on a line at 115200 baud a frame takes a fraction of the millisecond that QTimer
/// counts in. Never early; late by what the kernel and the event loop need.
///
/// Lives in the thread of its owner, which must run an event loop. Without a descriptor for it (logged) it never
/// times out.
class ExactTimer : public QObject
{
    Q_OBJECT

public:
    explicit ExactTimer(QObject* parent = nullptr);
    ~ExactTimer() override;

    /// Starts anew; a time of zero or less is over at once, in the event loop.
    void start(std::chrono::nanoseconds time);
    void stop();
    [[nodiscard]] bool isActive() const { return active; }

signals:
    void timeout();

private:
    void serve();

    int descriptor;
    bool active = false;
    QSocketNotifier notifier;
};

} // namespace VirtualDevice
