// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <atomic>
#include <memory>

class QThread;

namespace TestSupport
{

/// Whether a thread waits with its end for those who still wake it: posting to a thread is putting an event into its
/// queue, which it may serve at once, and then waking its event dispatcher, which it destroys when it ends. Here that
/// second step takes a second, or until it is too late.
///
/// Threads: any.
class WakeUpWatch
{
public:
    /// For the next run of `thread`, which does not run now.
    explicit WakeUpWatch(QThread& thread);

    /// Somebody was at that second step, and was done before the thread's end, every time.
    [[nodiscard]] bool sawOnlyLivingThreadsWoken() const;

private:
    class Dispatcher;
    struct Sightings
    {
        std::atomic<int> wakeUps = 0;
        std::atomic<bool> destroyed = false;
        std::atomic<bool> tooLate = false;
    };

    std::shared_ptr<Sightings> seen = std::make_shared<Sightings>();
};

} // namespace TestSupport
