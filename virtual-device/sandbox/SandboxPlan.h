// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QList>
#include <QMap>
#include <QString>
#include <QStringList>

namespace VirtualDevice
{

/// One path of the host that the sandbox sees.
struct SandboxBind
{
    enum class Kind
    {
        ReadOnly,
        Writable,
        Device, ///< writable, and character devices (a pty's slave) can be opened
    };

    QString source; ///< on the host
    QString target; ///< in the sandbox; binds are made in the plan's order, so a folder comes before what lies in it
    Kind kind = Kind::ReadOnly;
    bool mayBeMissing = false; ///< a source that does not exist is left out in silence
};

/// What the program's surroundings consist of beyond the fixed ones (private /dev, /sys, /tmp, /mnt, the system's
/// libraries and fonts read-only, no network). Each part of the device adds its own to it before the start.
///
/// Threads: a value; one owner, any thread.
struct SandboxPlan
{
    QList<SandboxBind> binds;
    QMap<QString, QString> environment; ///< set; wins over what is inherited
    bool inheritsEnvironment = false;   ///< for a person's own command; the program gets a clean one
    /// Relays, inside the sandbox, this Unix socket (a path in the sandbox) to the program's VNC port. Empty: none.
    QString vncSocket;
    QStringList command; ///< program and arguments, as paths in the sandbox

    void add(const QString& source, const QString& target, SandboxBind::Kind kind);
};

/// The command line of `bwrap` for the plan; `statusDescriptor` is where bwrap reports the sandbox's process.
[[nodiscard]] QStringList bubblewrapArguments(const SandboxPlan& plan, int statusDescriptor);

} // namespace VirtualDevice
