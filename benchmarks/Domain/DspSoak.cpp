// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/AbstractButtons.h"
#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
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
/// order, and no command wait behind the data. Run through tests/sandbox.sh; the result is the exit code.
namespace
{

using Clock = std::chrono::steady_clock;
using TestSupport::DspPeer;

/// A pairing packet carries its number as source address and fills the message.
constexpr quint32 packetType = 0x11003;
constexpr qsizetype payloadSize = 2020;

class NoButtons : public Domain::AbstractButtons
{
public:
    bool buttonsLocked() override { return false; }
    void setButtonLock(bool /*locked*/) override {}
};

QByteArray packetOf(int number)
{
    QByteArray payload(payloadSize, 'x');
    payload[0] = static_cast<char>(number >> 16);
    payload[1] = static_cast<char>(number >> 8);
    payload[2] = static_cast<char>(number);
    return payload;
}

void sendSteadily(DspPeer& peer, int count, std::chrono::nanoseconds period)
{
    const auto start = Clock::now();
    for (int number = 0; number < count; ++number) {
        std::this_thread::sleep_until(start + number * period);
        if (!peer.sendDsp(packetType, packetOf(number)))
            return;
    }
}

struct Tally
{
    std::atomic<int> received = 0;
    std::atomic<int> outOfOrder = 0;
    int commands = 0;
    int unanswered = 0;
    double slowest = 0; ///< ms
};

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
    DspPeer peer;
    peer.acknowledgeAll();
    NoButtons buttons;
    Domain::DspPort port(QStringLiteral("/dsp.out"));
    Domain::Dsp dsp(port, buttons);
    QObject::connect(
        &dsp, &Domain::Dsp::pairingUpgradeDataReceived, &dsp,
        [&tally](const Domain::PairingUpgradeData& packet) {
            tally.outOfOrder += packet.sourceAddress() == tally.received++ ? 0 : 1;
        },
        Qt::DirectConnection);
    std::thread sender([&] { sendSteadily(peer, count, std::chrono::nanoseconds(1s) / rate); });
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
    const QCommandLineOption seconds(QStringLiteral("seconds"), QStringLiteral("how long"), QStringLiteral("n"),
                                     QStringLiteral("60"));
    const QCommandLineOption rate(QStringLiteral("rate"), QStringLiteral("messages a second"), QStringLiteral("n"),
                                  QStringLiteral("1000"));
    parser.addOptions({seconds, rate});
    parser.addHelpOption();
    parser.process(application);
    QFile image(QStringLiteral("/dsp.out"));
    if (!image.open(QIODevice::WriteOnly))
        qFatal("run this through tests/sandbox.sh");

    const int perSecond = std::max(parser.value(rate).toInt(), 1);
    const int count = perSecond * parser.value(seconds).toInt();
    Tally tally;
    run(count, perSecond, tally);
    QTextStream(stdout) << "messages " << tally.received << " of " << count << ", out of order " << tally.outOfOrder
                        << ", commands " << tally.commands << ", unanswered " << tally.unanswered
                        << ", slowest command " << tally.slowest << " ms\n";
    return tally.received == count && tally.outOfOrder == 0 && tally.unanswered == 0 ? 0 : 1;
}
