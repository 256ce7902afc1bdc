// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/tree/FuseMount.h"
#include "virtual-device/tree/RealTimeClock.h"
#include "virtual-device/tree/TreeTable.h"

#include <QByteArray>
#include <QDateTime>
#include <QObject>
#include <QString>

#include <cstdint>
#include <map>

namespace VirtualDevice
{

class Registry;

/// The device's `/sys` and `/dev/rtc` as a mounted file system: "sys/..." and "rtc" below the mount point. Every value,
/// presence and failure is taken from the registry at the moment at which the program asks.
///
/// An attribute behaves as the kernel's: it is computed when it is read from its start, a reading that goes on
/// continues in the same value, an entry that vanished while it is open answers ENODEV, and a value that the driver
/// does not take is refused with EINVAL. Nothing can be made or removed.
///
/// Threads: lives in the main thread. The signals are emitted on the mount's thread, after the registry shows the
/// write; connect with the automatic or a queued connection.
class DeviceTree : public QObject
{
    Q_OBJECT

public:
    explicit DeviceTree(Registry& values, QObject* parent = nullptr);
    ~DeviceTree() override;

    /// Returns what went wrong.
    [[nodiscard]] std::optional<QString> mount(const QString& mountPoint);
    void unmount();

signals:
    void powerLatchWritten(int brightness, const QDateTime& time);
    /// The radio's reset line was pulsed.
    void resetLineWritten();

private:
    friend struct TreeOperations;

    /// What the kernel keeps for an open attribute: the value as it was when it was read from its start.
    struct OpenFile
    {
        const TreeEntry* entry = nullptr;
        QByteArray content;
        bool isFilled = false;
    };

    [[nodiscard]] int fault(const TreeEntry& entry) const;
    [[nodiscard]] bool isThere(const TreeEntry& entry) const;
    [[nodiscard]] int lookUp(const TreeEntry& entry) const;
    [[nodiscard]] int open(const TreeEntry& entry, int flags) const;
    [[nodiscard]] int refresh(OpenFile& file) const;
    [[nodiscard]] QByteArray contentOf(const TreeEntry& entry) const;
    [[nodiscard]] int write(const TreeEntry& entry, const QByteArray& bytes);
    [[nodiscard]] int writePowerLatch(const QByteArray& bytes);
    [[nodiscard]] int writeResetLine(const QByteArray& bytes);

    Registry& registry;
    RealTimeClock clock;
    /// By handle; for the mount's thread. What is still open when the mount goes, goes with it.
    std::map<std::uint64_t, OpenFile> openFiles;
    std::uint64_t lastHandle = 0;
    FuseMount fileSystem;
};

} // namespace VirtualDevice
