// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/ControlBench.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>

namespace TestSupport
{

bool sendLog(const QString& socketPath, const QByteArray& datagram)
{
    const QByteArray path = socketPath.toLocal8Bit();
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= qsizetype(sizeof address.sun_path))
        return false;
    std::memcpy(address.sun_path, path.constData(), static_cast<size_t>(path.size()));
    const int descriptor = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    const auto sent = ::sendto(descriptor, datagram.constData(), static_cast<size_t>(datagram.size()), 0,
                               reinterpret_cast<const sockaddr*>(&address), sizeof address);
    ::close(descriptor);
    return sent == datagram.size();
}

} // namespace TestSupport
