// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "benchmarks/Domain/RoundTrip.h"
#include "tests/support/AssertionLine.h"

#include <QFile>
#include <QMutex>
#include <QWaitCondition>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <thread>

#ifdef BENCHMARK_OVER_SOCKET
#include "tests/support/DspPeer.h"
#endif

/// Round trip of a command, from the call to its return with the acknowledgement, beside a bare hand-over to a second
/// thread and back with QMutex and QWaitCondition; everything on one processor. Times in microseconds; "of_bare" is the
/// ratio of the medians. The program exists twice: with the DSP's interface in the process, which shows what the
/// program costs, and over the host library and a peer behind the socket (run that one through tests/sandbox.sh). The
/// last row is a command that nobody answers.
namespace
{

using Benchmarks::measured;

/// Hands a turn to a second thread and waits to get it back.
class BareHandOver
{
public:
    BareHandOver() : partner([this] { answer(); }) {}
    ~BareHandOver()
    {
        pass(Turn::Ended);
        partner.join();
    }
    BareHandOver(const BareHandOver&) = delete;
    BareHandOver& operator=(const BareHandOver&) = delete;

    void exchange()
    {
        pass(Turn::Theirs);
        const QMutexLocker locker(&mutex);
        while (turn != Turn::Ours)
            changed.wait(&mutex);
    }

private:
    enum class Turn
    {
        Ours,
        Theirs,
        Ended
    };

    void pass(Turn to)
    {
        const QMutexLocker locker(&mutex);
        turn = to;
        changed.wakeAll();
    }

    void answer()
    {
        const QMutexLocker locker(&mutex);
        while (turn != Turn::Ended) {
            if (turn == Turn::Theirs) {
                turn = Turn::Ours;
                changed.wakeAll();
            }
            changed.wait(&mutex);
        }
    }

    QMutex mutex;
    QWaitCondition changed;
    Turn turn = Turn::Ours;
    std::thread partner;
};

/// The DSP that acknowledges everything at once.
struct Bench
{
#ifdef BENCHMARK_OVER_SOCKET
    TestSupport::DspPeer peer;
    Bench()
    {
        QFile image(QStringLiteral("/dsp.out"));
        if (!image.open(QIODevice::WriteOnly))
            qFatal("run this through tests/sandbox.sh");
        peer.acknowledgeAll();
    }
#endif
    TestSupport::AssertionLine buttons;
    Domain::DspPort port{QStringLiteral("/dsp.out")};
};

void commandRoundTrip(benchmark::State& state)
{
    for ([[maybe_unused]] auto iteration : state) {
        BareHandOver bare;
        const auto raw = measured([&] { bare.exchange(); });
        Bench bench;
        Domain::Dsp dsp(bench.port, bench.buttons);
        const auto ours = measured([&] {
            if (!dsp.runHardwareTest(1))
                std::abort();
        });
        state.counters["bare_median"] = raw.median;
        state.counters["bare_p99"] = raw.high;
        state.counters["median"] = ours.median;
        state.counters["p99"] = ours.high;
        state.counters["of_bare"] = ours.median / raw.median;
    }
}

BENCHMARK(commandRoundTrip)->Name("command round trip, one processor")->Iterations(1)->Repetitions(3)->UseRealTime();

#ifdef BENCHMARK_OVER_SOCKET
void timeOut(benchmark::State& state)
{
    Bench bench;
    Domain::Dsp dsp(bench.port, bench.buttons);
    bench.peer.onMessage({});
    double longest = 0;
    double shortest = 1e9;
    for ([[maybe_unused]] auto iteration : state) {
        const auto start = Benchmarks::Clock::now();
        if (dsp.requestVersion())
            std::abort();
        const double milliseconds = Benchmarks::Microseconds(Benchmarks::Clock::now() - start).count() / 1000;
        longest = std::max(longest, milliseconds);
        shortest = std::min(shortest, milliseconds);
    }
    state.counters["shortest_ms"] = shortest;
    state.counters["longest_ms"] = longest;
}

BENCHMARK(timeOut)->Name("command without an answer")->Iterations(10)->UseRealTime();
#endif

} // namespace

int main(int argc, char** argv)
{
    return Benchmarks::runOnOneProcessor(argc, argv);
}
