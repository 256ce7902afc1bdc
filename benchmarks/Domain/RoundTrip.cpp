// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/Domain/RoundTrip.h"

#include <QCoreApplication>

#include <benchmark/benchmark.h>
#include <sched.h>

#include <algorithm>

namespace Benchmarks
{

namespace
{

void pinToOneProcessor()
{
    cpu_set_t one;
    CPU_ZERO(&one);
    CPU_SET(static_cast<std::size_t>(::sched_getcpu()), &one);
    ::sched_setaffinity(0, sizeof one, &one);
}

} // namespace

Percentiles Percentiles::of(std::vector<double> times)
{
    std::sort(times.begin(), times.end());
    return {times.at(times.size() / 2), times.at(times.size() * 99 / 100)};
}

int runOnOneProcessor(int argc, char** argv)
{
    pinToOneProcessor();
    const QCoreApplication application(argc, argv);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}

} // namespace Benchmarks
