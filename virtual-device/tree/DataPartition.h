// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/tree/FuseMount.h"

#include <QString>

#include <dirent.h>

#include <set>

namespace VirtualDevice
{

class Registry;

/// The SD card's data partition as the program sees it: what lies in an ordinary folder of the host, served so that the
/// card can turn read-only (`sd.readonly`: EROFS), run full (`sd.full`: ENOSPC) or fail (`sd.fault`) while it is in
/// use.
///
/// Not supported: `fstat` of a file that was removed while it is open (ENOENT; reading, writing and truncating it
/// work), owners, and extended attributes.
///
/// Threads: as FuseMount.
class DataPartition
{
public:
    explicit DataPartition(const Registry& values) : registry(values) {}
    ~DataPartition();
    DataPartition(const DataPartition&) = delete;
    DataPartition& operator=(const DataPartition&) = delete;

    /// Serves `folder` at `mountPoint`. Returns what went wrong.
    [[nodiscard]] std::optional<QString> mount(const QString& folder, const QString& mountPoint);
    void unmount();

private:
    friend struct PartitionOperations;

    [[nodiscard]] int failure() const;
    [[nodiscard]] int refusalOfChange() const;
    [[nodiscard]] int refusalOfGrowth() const;

    const Registry& registry;
    int root = -1;
    /// For the mount's thread. What is still open when the mount goes, is closed with it.
    std::set<int> openFiles;
    std::set<DIR*> openFolders;
    FuseMount fileSystem;
};

} // namespace VirtualDevice
