// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

#include <optional>

namespace VirtualDevice
{

/// The folder of one running device below `root()`: its sockets, mount points and, unless the operator keeps it
/// elsewhere, its state. Whoever holds the folder's lock owns the device of that name; the kernel drops the lock with
/// the process, so that a folder whose lock is free was left by a device that was killed.
///
/// Threads: one owner, any thread.
class DeviceFolder
{
public:
    DeviceFolder() = default;
    ~DeviceFolder();
    DeviceFolder(const DeviceFolder&) = delete;
    DeviceFolder& operator=(const DeviceFolder&) = delete;

    /// `$XDG_RUNTIME_DIR/virtual-device`, or `/tmp/virtual-device-UID` where that variable is not set to a folder of
    /// ours; without links, as the mount table has it.
    [[nodiscard]] static QString root();
    /// The names of the devices that run now.
    [[nodiscard]] static QStringList running();
    /// The path of the control socket of the device `name`, whether it runs or not.
    [[nodiscard]] static QString controlSocket(const QString& name);
    /// Letters, digits, "-" and "_", at most 24 of them.
    [[nodiscard]] static bool isName(const QString& name);
    /// What is wrong with a name that somebody chose.
    [[nodiscard]] static std::optional<QString> nameProblem(const QString& name);

    /// Unmounts and removes what devices left that were killed; returns the names of those of which nothing is left.
    static QStringList cleanUp();

    /// Takes the name, or the first free one of "device-1", "device-2", ... when it is empty, and makes the folder.
    /// Returns what went wrong.
    [[nodiscard]] std::optional<QString> claim(const QString& name);
    /// Removes the folder and gives the name back. The file systems in it must be unmounted before.
    void release();

    [[nodiscard]] QString name() const { return deviceName; }
    /// `relative` below the device's folder.
    [[nodiscard]] QString path(const QString& relative = {}) const;

private:
    [[nodiscard]] std::optional<QString> takeName(const QString& name);

    QString deviceName;
    int lock = -1;
};

} // namespace VirtualDevice
