// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/registry/Registry.h"
#include "virtual-device/tree/Mounts.h"

#include <QJsonValue>
#include <QObject>
#include <QTemporaryDir>
#include <QTest>

#include <cerrno>
#include <memory>
#include <optional>

namespace TestSupport
{

/// The errnos that a file can be made to fail with, by their names in the controls: columns "fault" and "error".
inline void addErrnoRows()
{
    QTest::addColumn<QString>("fault");
    QTest::addColumn<int>("error");
    QTest::addRow("EIO") << "EIO" << EIO;
    QTest::addRow("ENODATA") << "ENODATA" << ENODATA;
    QTest::addRow("ENOENT") << "ENOENT" << ENOENT;
    QTest::addRow("EACCES") << "EACCES" << EACCES;
}

/// For tests of a mounted tree that follows the registry.
class MountFixture : public QObject
{
protected:
    void makeMountPoint()
    {
        mountPoint = std::make_unique<QTemporaryDir>();
        registry = std::make_unique<VirtualDevice::Registry>();
    }
    /// After the tree has gone.
    void removeMountPoint()
    {
        if (mountPoint)
            QVERIFY(VirtualDevice::mountedBelow(mountPoint->path()).isEmpty());
        registry.reset();
        mountPoint.reset();
    }

    [[nodiscard]] QString at(const QString& path) const { return mountPoint->filePath(path); }
    void set(const QString& control, const QJsonValue& value) { QCOMPARE(registry->set(control, value), std::nullopt); }

    std::unique_ptr<QTemporaryDir> mountPoint;
    std::unique_ptr<VirtualDevice::Registry> registry;
};

} // namespace TestSupport
