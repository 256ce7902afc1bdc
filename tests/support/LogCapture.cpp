// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/LogCapture.h"

#include "utilities/Debug.h"

#include <QDebug>
#include <QTest>

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>

namespace TestSupport
{

namespace
{

constexpr const char* logPath = "/dev/log";
/// More messages than the kernel keeps for a socket: who takes so many has all that had come, however many more come.
constexpr int longestQueue = 1024;

/// "<PRI>Mmm dd hh:mm:ss IDENTITY: TEXT"
LogLine parsed(const QByteArray& datagram)
{
    LogLine line;
    const auto closing = datagram.indexOf('>');
    const int code = datagram.mid(1, closing - 1).toInt();
    line.priority = code & 7;
    line.facility = code >> 3;
    constexpr int timestampLength = 16;
    const QString rest = QString::fromLatin1(datagram.mid(closing + 1 + timestampLength));
    const auto colon = rest.indexOf(QStringLiteral(": "));
    line.identity = rest.left(colon);
    line.text = rest.mid(colon + 2);
    return line;
}

} // namespace

LogCapture::LogCapture()
{
    ::unlink(logPath);
    socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    qstrncpy(address.sun_path, logPath, sizeof address.sun_path);
    if (::bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 || ::pipe(wakeUp) != 0)
        qFatal("No private /dev/log: run the test through tests/sandbox.sh");
    thread = std::thread([this] { receive(); });
    Utilities::Debug::open();
}

LogCapture::~LogCapture()
{
    Utilities::Debug::close();
    ::close(wakeUp[1]);
    thread.join();
    ::close(wakeUp[0]);
    ::close(socket);
    ::unlink(logPath);
}

void LogCapture::receive()
{
    std::array<pollfd, 2> waits{pollfd{socket, POLLIN, 0}, pollfd{wakeUp[0], POLLIN, 0}};
    while (::poll(waits.data(), waits.size(), -1) > 0 && waits[1].revents == 0) {
        const std::lock_guard lock(mutex);
        takeAll();
    }
}

void LogCapture::takeAll() const
{
    std::array<char, 65536> buffer; // NOLINT(cppcoreguidelines-pro-type-member-init): written by recv
    for (int taken = 0; taken < longestQueue; ++taken) {
        const auto length = ::recv(socket, buffer.data(), buffer.size(), MSG_DONTWAIT);
        if (length <= 0)
            return;
        received.push_back(parsed(QByteArray(buffer.data(), length)));
    }
}

std::vector<LogLine> LogCapture::lines() const
{
    const std::lock_guard lock(mutex);
    takeAll();
    return received;
}

QStringList LogCapture::texts() const
{
    QStringList all;
    for (const auto& line : lines())
        all.append(line.text);
    return all;
}

int LogCapture::count(const QString& ending) const
{
    const auto all = lines();
    return static_cast<int>(
        std::count_if(all.begin(), all.end(), [&](const LogLine& line) { return line.text.endsWith(ending); }));
}

bool LogCapture::waitFor(const QString& ending, int expected, std::chrono::milliseconds limit) const
{
    return QTest::qWaitFor([&] { return count(ending) >= expected; }, static_cast<int>(limit.count()));
}

void LogCapture::clear()
{
    const std::lock_guard lock(mutex);
    takeAll();
    received.clear();
}

} // namespace TestSupport
