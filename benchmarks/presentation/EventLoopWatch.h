// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <sys/types.h>

#include <chrono>
#include <fstream>
#include <optional>
#include <vector>

namespace Benchmarks
{

/// How long a program's first thread stays away from its event loop, watched from outside: the kernel tells in which
/// call a thread is, and in its event loop it waits in `poll`. Everything else counts as away: running, being ready to
/// run while others do, waiting for a file or a lock.
///
/// A stretch lasts from the first sample that found the thread away to the next one that found it waiting. Samples that
/// come late make stretches longer, never shorter; stretches between two samples are not seen, which leaves the long
/// ones for the percentile.
class EventLoopWatch
{
public:
    using Milliseconds = std::chrono::duration<double, std::milli>;

    explicit EventLoopWatch(pid_t process);

    void sample();

    [[nodiscard]] std::size_t stretches() const { return away.size(); }
    [[nodiscard]] Milliseconds longest() const { return quantile(1); }
    /// Of the stretches seen, the length that so many of them do not exceed; 0 when there were none.
    [[nodiscard]] Milliseconds quantile(double share) const;

private:
    using Clock = std::chrono::steady_clock;

    [[nodiscard]] bool isWaiting();

    std::ifstream call;
    std::optional<Clock::time_point> left;
    std::vector<Milliseconds> away;
};

} // namespace Benchmarks
