// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/support/AssertionLine.h"
#include "tests/support/DspPeer.h"

#include <QCommandLineParser>
#include <QCoreApplication>
#include <QFile>
#include <QTextStream>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <thread>

/// Largest messages at a steady rate, with a command every tenth of a second: nothing may be lost, nothing change its
/// order, and no command wait behind the data. For a while in every five thousand messages the receiver needs twice the
/// time in which they come, so that they pile up: a command that had to wait for its turn then would wait far longer
/// than is allowed. Run through tests/sandbox.sh; the result is the exit code.
namespace
{

using Clock = std::chrono::steady_clock;
using TestSupport::DspPeer;

/// A pairing packet carries its number as source address and fills the message.
constexpr quint32 packetType = 0x11003;
constexpr qsizetype payloadSize = 2020;

constexpr int slowEvery = 5000; ///< messages
constexpr int slowFor = 1000;
constexpr int leastBacklog = 200;      ///< messages; with fewer the run would show nothing
constexpr double slowestAllowed = 400; ///< ms, half of what is left when no answer comes

QByteArray packetOf(int number)
{
    QByteArray payload(payloadSize, 'x');
    payload[0] = static_cast<char>(number >> 16);
    payload[1] = static_cast<char>(number >> 8);
    payload[2] = static_cast<char>(number);
    return payload;
}

struct Tally
{
    std::atomic<int> sent = 0;
    std::atomic<int> received = 0;
    std::atomic<int> outOfOrder = 0;
    std::atomic<int> backlog = 0; ///< the largest
    int commands = 0;
    int unanswered = 0;
    double slowest = 0; ///< ms

    [[nodiscard]] bool isGood(int count) const
    {
        return received == count && outOfOrder == 0 && unanswered == 0 && backlog >= leastBacklog &&
               slowest <= slowestAllowed;
    }
};

void sendSteadily(DspPeer& peer, int count, std::chrono::nanoseconds period, Tally& tally)
{
    const auto start = Clock::now();
    for (int number = 0; number < count; ++number) {
        std::this_thread::sleep_until(start + number * period);
        if (!peer.sendDsp(packetType, packetOf(number)))
            return;
        ++tally.sent;
    }
}

/// On the receiver's thread.
void receive(int number, std::chrono::nanoseconds period, Tally& tally)
{
    tally.outOfOrder += number == tally.received++ ? 0 : 1;
    tally.backlog = std::max(tally.backlog.load(), tally.sent - tally.received);
    if (number % slowEvery < slowFor)
        std::this_thread::sleep_for(2 * period);
}

void command(Domain::Dsp& dsp, Tally& tally)
{
    const auto start = Clock::now();
    ++tally.commands;
    tally.unanswered += dsp.runHardwareTest(1) ? 0 : 1;
    tally.slowest = std::max(tally.slowest, std::chrono::duration<double, std::milli>(Clock::now() - start).count());
}

void run(int count, int rate, Tally& tally)
{
    using namespace std::chrono_literals;
    const auto period = std::chrono::nanoseconds(1s) / rate;
    DspPeer peer;
    peer.acknowledgeAll();
    TestSupport::AssertionLine buttons;
    Domain::DspPort port(QStringLiteral("/dsp.out"));
    Domain::Dsp dsp(port, buttons);
    QObject::connect(
        &dsp, &Domain::Dsp::pairingUpgradeDataReceived, &dsp,
        [&tally, period](const Domain::PairingUpgradeData& packet) { receive(packet.sourceAddress(), period, tally); },
        Qt::DirectConnection);
    std::thread sender([&] { sendSteadily(peer, count, period, tally); });
    const auto limit = Clock::now() + std::chrono::seconds(count / rate + 20);
    while (tally.received < count && Clock::now() < limit) {
        command(dsp, tally);
        std::this_thread::sleep_for(100ms);
    }
    sender.join();
}

} // namespace

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    QCommandLineParser parser;
    const QCommandLineOption rate(QStringLiteral("rate"), QStringLiteral("messages a second"), QStringLiteral("n"),
                                  QStringLiteral("1000"));
    parser.addOption(rate);
    parser.addPositionalArgument(QStringLiteral("seconds"), QStringLiteral("how long; 60 unless given"),
                                 QStringLiteral("[seconds]"));
    parser.addHelpOption();
    parser.process(application);
    const int perSecond = parser.value(rate).toInt();
    const int seconds = parser.positionalArguments().value(0, QStringLiteral("60")).toInt();
    if (perSecond < 1 || seconds < 1)
        parser.showHelp(2);
    QFile image(QStringLiteral("/dsp.out"));
    if (!image.open(QIODevice::WriteOnly))
        qFatal("run this through tests/sandbox.sh");

    const int count = perSecond * seconds;
    Tally tally;
    run(count, perSecond, tally);
    QTextStream(stdout) << "messages " << tally.received << " of " << count << ", out of order " << tally.outOfOrder
                        << ", largest backlog " << tally.backlog << ", commands " << tally.commands << ", unanswered "
                        << tally.unanswered << ", slowest command " << tally.slowest << " ms\n";
    return tally.isGood(count) ? 0 : 1;
}
