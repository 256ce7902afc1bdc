// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/UnixSocket.h"

#include <QByteArray>

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace VirtualDevice
{

BoundSocket boundUnixSocket(const QString& path, int type)
{
    const QByteArray name = path.toLocal8Bit();
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (static_cast<std::size_t>(name.size()) >= sizeof address.sun_path)
        return {-1, QStringLiteral("%1: too long for a socket's path").arg(path)};
    std::memcpy(address.sun_path, name.constData(), static_cast<std::size_t>(name.size()));
    ::unlink(name.constData());
    const int descriptor = ::socket(AF_UNIX, type | SOCK_CLOEXEC, 0);
    if (descriptor >= 0 && ::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
        ::chmod(name.constData(), 0600) == 0)
        return {descriptor, {}};
    const int reason = errno;
    if (descriptor >= 0)
        ::close(descriptor);
    return {-1, QStringLiteral("%1: %2").arg(path, qt_error_string(reason))};
}

} // namespace VirtualDevice
