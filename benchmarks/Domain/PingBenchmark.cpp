// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "benchmarks/Domain/RoundTrip.h"
#include "tests/Domain/Frames.h"
#include "tests/Domain/Pty.h"

#include <QEventLoop>

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <thread>

/// Round trip of a ping over a pty, from `sendPing()` to `pingResponse()` on the caller's thread, beside a raw
/// write/poll/read loop against the same peer; everything on one processor. Times in microseconds; "of_raw" is the
/// ratio of the medians.
namespace
{

using Benchmarks::measured;
using Benchmarks::Percentiles;
using TestSupport::frameOf;
using TestSupport::Pty;

const QByteArray ping = frameOf("\x7E");
const QByteArray answer = frameOf("\xFE") + frameOf("\x7F");

/// Answers a whole ping at once.
class Peer
{
public:
    explicit Peer(const Pty& pty) : line(pty), thread([this] { run(); }) {}
    ~Peer()
    {
        stopping = true;
        thread.join();
    }
    Peer(const Peer&) = delete;
    Peer& operator=(const Peer&) = delete;

private:
    void run()
    {
        qsizetype received = 0;
        pollfd input{line.peer(), POLLIN, 0};
        constexpr int stepMs = 100;
        while (!stopping) {
            if (::poll(&input, 1, stepMs) <= 0)
                continue;
            char buffer[256];
            received += std::max<ssize_t>(0, ::read(line.peer(), buffer, sizeof buffer));
            for (; received >= ping.size(); received -= ping.size())
                line.write(answer);
        }
    }

    const Pty& line;
    std::atomic<bool> stopping = false;
    std::thread thread;
};

Percentiles rawExchange()
{
    const Pty pty;
    const Peer peer(pty);
    pollfd input{pty.line(), POLLIN, 0};
    return measured([&] {
        if (::write(pty.line(), ping.constData(), static_cast<std::size_t>(ping.size())) != ping.size())
            std::abort();
        qsizetype received = 0;
        while (received < answer.size()) {
            char buffer[256];
            ::poll(&input, 1, -1);
            received += std::max<ssize_t>(0, ::read(pty.line(), buffer, sizeof buffer));
        }
    });
}

Percentiles processorExchange()
{
    const Pty pty;
    const Peer peer(pty);
    Domain::SerialPort port(pty.name(), Domain::SerialPort::Baud115200);
    Domain::BeaconProcessor processor(port);
    QEventLoop loop;
    bool answered = false;
    QObject::connect(&processor, &Domain::BeaconProcessor::pingResponse, &loop, [&] { answered = true; });
    return measured([&] {
        answered = false;
        if (!processor.sendPing())
            std::abort();
        // Not by leaving the loop, which costs a wake-up that a program in its event loop does not pay.
        while (!answered)
            loop.processEvents(QEventLoop::WaitForMoreEvents);
    });
}

void pingRoundTrip(benchmark::State& state)
{
    for ([[maybe_unused]] auto iteration : state) {
        const auto raw = rawExchange();
        const auto ours = processorExchange();
        state.counters["raw_median"] = raw.median;
        state.counters["raw_p99"] = raw.high;
        state.counters["median"] = ours.median;
        state.counters["p99"] = ours.high;
        state.counters["of_raw"] = ours.median / raw.median;
    }
}

BENCHMARK(pingRoundTrip)->Name("ping round trip, one processor")->Iterations(1)->Repetitions(3)->UseRealTime();

} // namespace

int main(int argc, char** argv)
{
    return Benchmarks::runOnOneProcessor(argc, argv);
}
