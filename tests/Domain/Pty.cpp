// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/Pty.h"

#include <QFile>
#include <QTest>

#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <utility>

namespace TestSupport
{

Pty::Pty() : master(::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK))
{
    std::array<char, 64> buffer{};
    if (master < 0 || ::grantpt(master) != 0 || ::unlockpt(master) != 0 ||
        ::ptsname_r(master, buffer.data(), buffer.size()) != 0)
        qFatal("No pseudo-terminal");
    slaveName = QFile::decodeName(buffer.data());
    slave = ::open(buffer.data(), O_RDWR | O_NOCTTY | O_CLOEXEC);
    termios settings{};
    ::tcgetattr(slave, &settings);
    ::cfmakeraw(&settings);
    ::tcsetattr(slave, TCSANOW, &settings);
}

Pty::~Pty()
{
    hangUp();
    if (slave >= 0)
        ::close(slave);
}

void Pty::write(const QByteArray& bytes) const
{
    qsizetype done = 0;
    while (done < bytes.size()) {
        const auto written = ::write(master, bytes.constData() + done, static_cast<std::size_t>(bytes.size() - done));
        if (written > 0) {
            done += written;
            continue;
        }
        pollfd room{master, POLLOUT, 0};
        constexpr int limitMs = 20000;
        if (::poll(&room, 1, limitMs) <= 0)
            qFatal("The line takes nothing");
    }
}

QByteArray Pty::read() const
{
    QByteArray bytes;
    std::array<char, 4096> buffer{};
    for (;;) {
        const auto count = ::read(master, buffer.data(), buffer.size());
        if (count <= 0)
            return bytes;
        bytes.append(buffer.data(), count);
    }
}

QByteArray Pty::read(qsizetype count, std::chrono::milliseconds limit) const
{
    QByteArray bytes;
    (void)QTest::qWaitFor(
        [&] {
            bytes += read();
            return bytes.size() >= count;
        },
        static_cast<int>(limit.count()));
    return bytes;
}

int Pty::waiting() const
{
    int count = 0;
    ::ioctl(slave, FIONREAD, &count);
    return count;
}

void Pty::hangUp()
{
    if (master >= 0)
        ::close(std::exchange(master, -1));
}

} // namespace TestSupport
