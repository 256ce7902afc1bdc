// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/presentation/EventLoopWatch.h"

#include <sys/syscall.h>

#include <algorithm>
#include <cmath>
#include <stdexcept>
#include <string>

namespace Benchmarks
{

EventLoopWatch::EventLoopWatch(pid_t process) : call("/proc/" + std::to_string(process) + "/syscall")
{
    if (!call)
        throw std::runtime_error("cannot see what the program waits for");
}

/// The file holds the number of the call that the thread waits in, or "running".
bool EventLoopWatch::isWaiting()
{
    call.clear();
    call.seekg(0);
    long number = -1;
    if (!(call >> number))
        return false;
#ifdef SYS_poll
    if (number == SYS_poll)
        return true;
#endif
    return number == SYS_ppoll;
}

void EventLoopWatch::sample()
{
    const bool waiting = isWaiting();
    const auto now = Clock::now();
    if (!waiting && !left) {
        left = now;
    } else if (waiting && left) {
        away.emplace_back(now - *left);
        left.reset();
    }
}

EventLoopWatch::Milliseconds EventLoopWatch::quantile(double share) const
{
    if (away.empty())
        return {};
    auto sorted = away;
    std::sort(sorted.begin(), sorted.end());
    const auto rank = std::ceil(share * static_cast<double>(sorted.size()));
    return sorted[static_cast<std::size_t>(rank) - 1];
}

} // namespace Benchmarks
