// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <chrono>
#include <vector>

namespace Benchmarks
{

using Clock = std::chrono::steady_clock;
using Microseconds = std::chrono::duration<double, std::micro>;

/// Of round trips, in microseconds.
struct Percentiles
{
    double median;
    double high; ///< the 99th

    static Percentiles of(std::vector<double> times);
};

/// Of 5000 exchanges, after a few that do not count.
template <typename Exchange> Percentiles measured(Exchange exchange)
{
    constexpr int warmUp = 200;
    constexpr int rounds = 5000;
    for (int round = 0; round < warmUp; ++round)
        exchange();
    std::vector<double> times;
    times.reserve(rounds);
    for (int round = 0; round < rounds; ++round) {
        const auto start = Clock::now();
        exchange();
        times.push_back(Microseconds(Clock::now() - start).count());
    }
    return Percentiles::of(std::move(times));
}

/// The program of such benchmarks: everything on the processor that it starts on.
int runOnOneProcessor(int argc, char** argv);

} // namespace Benchmarks
