// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/RadioPeer.h"

#include "tests/Domain/Frames.h"

#include <poll.h>
#include <unistd.h>

#include <array>
#include <utility>

namespace TestSupport
{

RadioPeer::RadioPeer(Pty& pty) : line(pty)
{
    if (::pipe(stopPipe) != 0)
        qFatal("No pipe");
    thread = std::thread([this] { run(); });
}

RadioPeer::~RadioPeer()
{
    ::close(stopPipe[1]);
    thread.join();
    ::close(stopPipe[0]);
}

void RadioPeer::answerWith(Answer next)
{
    const std::lock_guard guard(mutex);
    answer = std::move(next);
}

QList<QByteArray> RadioPeer::commands() const
{
    const std::lock_guard guard(mutex);
    return {taken.begin(), taken.end()};
}

QByteArray RadioPeer::ack()
{
    return frameOf("\xFE");
}

QByteArray RadioPeer::nak(char reason)
{
    return frameOf(QByteArray("\xFF") + reason);
}

QByteArray RadioPeer::wellBehaved(const QByteArray& command)
{
    switch (command.front()) {
    case 0x62:
        return ack() + frameOf(QByteArray("\x63\x02", 2));
    case 0x70:
        return ack() + frameOf(QByteArray("\x71\x01\x17", 3));
    case 0x7E:
        return ack() + frameOf("\x7F");
    default:
        return ack();
    }
}

void RadioPeer::run()
{
    QByteArray buffer;
    std::array<pollfd, 2> waits{pollfd{line.peer(), POLLIN, 0}, pollfd{stopPipe[0], POLLIN, 0}};
    while (::poll(waits.data(), waits.size(), -1) > 0 && waits[1].revents == 0) {
        buffer += line.read();
        take(buffer);
    }
}

/// The program sends nothing but whole frames: `payloadOf` aborts at the first byte that is wrong.
void RadioPeer::take(QByteArray& buffer)
{
    const auto byteAt = [&](qsizetype index) { return static_cast<unsigned char>(buffer.at(index)); };
    while (buffer.size() >= 8 && buffer.size() >= byteAt(1) * 256 + byteAt(2) + 8) {
        const auto size = byteAt(1) * 256 + byteAt(2) + 8;
        const QByteArray command = payloadOf(buffer.first(size));
        buffer.remove(0, size);
        QByteArray bytes;
        {
            const std::lock_guard guard(mutex);
            taken.push_back(command);
            bytes = answer(command);
        }
        line.write(bytes);
    }
}

} // namespace TestSupport
