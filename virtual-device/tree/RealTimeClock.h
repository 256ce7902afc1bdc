// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QTimer>

#include <linux/rtc.h>

#include <atomic>

namespace VirtualDevice
{

class Registry;

/// The device's real-time clock: runs on from whatever `rtc.time` was last set to, stands still while `rtc.running` is
/// off, and shows itself in `rtc.time` once a second.
///
/// Threads: lives in the main thread; `seconds()` and `read()` may be called from any.
class RealTimeClock : public QObject
{
    Q_OBJECT

public:
    explicit RealTimeClock(Registry& values, QObject* parent = nullptr);

    /// Seconds since 1970-01-01 UTC.
    [[nodiscard]] qint64 seconds() const;
    /// What the read-time request answers now. All fields are nonsense under the fault "garbage".
    [[nodiscard]] rtc_time read() const;

private:
    void adopt(const QString& name, const QJsonValue& value);
    void show();

    Registry& registry;
    QTimer timer;
    std::atomic<qint64> offset = 0;     ///< milliseconds ahead of the host's clock, while it runs
    std::atomic<qint64> standstill = 0; ///< the time that it shows while it does not
    std::atomic<bool> running = true;
};

} // namespace VirtualDevice
