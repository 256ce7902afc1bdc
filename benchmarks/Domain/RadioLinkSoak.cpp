// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialPort.h"
#include "Domain/src/DomainLayer/SerialProtocol.h"
#include "tests/Domain/Frames.h"
#include "tests/Domain/Pty.h"

#include <QCoreApplication>
#include <QTimer>

#include <poll.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>

/// Holds a line at its full rate, 11,520 bytes a second, both ways: RadioLinkSoak [SECONDS], 600 by default. The peer
/// is a process of its own. Fails if a frame is lost, damaged or out of order, or if the program's side takes more than
/// 2 % of a processor.
namespace
{

using Clock = std::chrono::steady_clock;
using Seconds = std::chrono::duration<double>;

constexpr double bytesPerSecond = 11520;
constexpr double cpuLimit = 0.02;
constexpr int payloadSize = 100;
constexpr int frameSize = payloadSize + 8;

QByteArray numbered(int number)
{
    return QByteArray::number(number).rightJustified(payloadSize, '.');
}

/// The frames of one direction: how many are due, and whether those that came are the next ones.
class Sequence
{
public:
    [[nodiscard]] bool isDue() const
    {
        return Seconds(Clock::now() - start).count() * bytesPerSecond >= static_cast<double>(sent + 1) * frameSize;
    }
    QByteArray next() { return numbered(sent++); }
    void take(const QByteArray& payload) { wrong += payload != numbered(received++); }

    Clock::time_point start = Clock::now();
    int sent = 0;
    int received = 0;
    int wrong = 0;
};

double processorSeconds()
{
    rusage used{};
    ::getrusage(RUSAGE_SELF, &used);
    const auto seconds = [](const timeval& time) {
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
    };
    return seconds(used.ru_utime) + seconds(used.ru_stime);
}

/// Sends its frames and takes what comes until the line has been quiet for a while. The exit status tells.
[[noreturn]] void runPeer(const TestSupport::Pty& pty, int expectedFrames)
{
    Sequence sequence;
    QByteArray buffer;
    auto lastByte = Clock::now();
    pollfd input{pty.peer(), POLLIN, 0};
    constexpr int stepMs = 5;
    while (Clock::now() - lastByte < std::chrono::seconds(3)) {
        while (sequence.sent < expectedFrames && sequence.isDue())
            pty.write(TestSupport::frameOf(sequence.next()));
        if (::poll(&input, 1, stepMs) <= 0)
            continue;
        buffer += pty.read();
        lastByte = Clock::now();
        for (; buffer.size() >= frameSize; buffer.remove(0, frameSize))
            sequence.take(TestSupport::payloadOf(buffer.first(frameSize)));
    }
    std::printf("peer: %d frames received, %d wrong\n", sequence.received, sequence.wrong);
    std::fflush(stdout);
    std::_Exit(sequence.received == expectedFrames && sequence.wrong == 0 ? 0 : 1);
}

bool runProgram(const TestSupport::Pty& pty, int expectedFrames)
{
    Domain::SerialPort port(pty.name(), Domain::SerialPort::Baud115200);
    Domain::SerialProtocol protocol(port);
    Sequence sequence;
    int refused = 0;
    QObject::connect(&protocol, &Domain::SerialProtocol::messageReceived, &protocol,
                     [&](const QByteArray& payload) { sequence.take(payload); });
    QTimer pace;
    pace.setTimerType(Qt::PreciseTimer);
    QObject::connect(&pace, &QTimer::timeout, &protocol, [&] {
        while (sequence.sent < expectedFrames && sequence.isDue()) {
            // Refused when the peer has taken nothing for half a second.
            refused += protocol.sendMessage(sequence.next()) ? 0 : 1;
        }
        const bool late = Clock::now() - sequence.start > Seconds(expectedFrames * frameSize / bytesPerSecond + 3);
        if (late)
            QCoreApplication::quit();
    });
    constexpr int stepMs = 5;
    pace.start(stepMs);
    const auto before = processorSeconds();
    QCoreApplication::exec();
    const double share = (processorSeconds() - before) / Seconds(Clock::now() - sequence.start).count();
    std::printf("program: %d of %d frames received, %d wrong, %d refused by the line, %.2f %% of a processor\n",
                sequence.received, expectedFrames, sequence.wrong, refused, share * 100);
    return sequence.received == expectedFrames && sequence.wrong == 0 && refused == 0 && share < cpuLimit;
}

} // namespace

int main(int argc, char** argv)
{
    const int seconds = argc > 1 ? std::atoi(argv[1]) : 600;
    const int frames = static_cast<int>(seconds * bytesPerSecond / frameSize);
    const TestSupport::Pty pty;
    const auto peer = ::fork();
    if (peer == 0) {
        // The program opens the line and drops what came before: it needs a moment.
        ::sleep(1);
        runPeer(pty, frames);
    }
    const QCoreApplication application(argc, argv);
    const bool good = runProgram(pty, frames);
    int status = 0;
    ::waitpid(peer, &status, 0);
    const bool peerGood = WIFEXITED(status) && WEXITSTATUS(status) == 0;
    std::printf("%s\n", good && peerGood ? "passed" : "FAILED");
    return good && peerGood ? 0 : 1;
}
