// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractKeyedFileStore.h"

#include <memory>

namespace DataSource
{

/// The files of one directory by name, straight from the directory: no listing, no cache, no thread.
///
/// A name is the bare name of a file. `deleteFile` refuses everything else ("../x", "sub/x", "."), so that no name can
/// reach a file outside the directory; a symbolic link is removed itself, never what it points to.
///
/// Threads: one at a time.
class KeyedFileStore : public AbstractKeyedFileStore
{
public:
    /// Creates the directory, with its parents, if it is missing; that this failed shows in the operations.
    explicit KeyedFileStore(const QString& path);
    ~KeyedFileStore() override;
    Q_DISABLE_COPY_MOVE(KeyedFileStore)

    QFileInfo file(const QString& name) const override;
    QFileInfo createFile(const QString& name) override;
    bool deleteFile(const QString& name) override;
    qint64 bytesUsed() const override;
    /// 0 when the directory is gone or, with a warning in the log, when the system does not say.
    qint64 bytesFree() const override;
    qint64 bytesCapacity() const;

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace DataSource
