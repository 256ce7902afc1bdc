// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>

namespace VirtualDevice
{

/// A descriptor, or what went wrong.
struct BoundSocket
{
    int descriptor = -1;
    QString error;
};

/// A Unix socket of `type` (SOCK_DGRAM, SOCK_STREAM, SOCK_SEQPACKET) bound at `path` with mode 0600, closed on exec,
/// replacing a socket left there. Not listening yet.
///
/// Threads: any.
[[nodiscard]] BoundSocket boundUnixSocket(const QString& path, int type);

} // namespace VirtualDevice
