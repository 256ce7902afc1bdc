// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QFileInfo>
#include <QString>

namespace DataSource
{

/// One directory's files, addressed by name. Every operation works directly on the directory.
///
/// Threads: one at a time.
class AbstractKeyedFileStore
{
public:
    AbstractKeyedFileStore() = default;
    virtual ~AbstractKeyedFileStore() = default;
    Q_DISABLE_COPY_MOVE(AbstractKeyedFileStore)

    /// The file of that name, whether or not it exists.
    virtual QFileInfo file(const QString& name) const = 0;
    /// Where a file of that name belongs. Creates nothing on disk.
    virtual QFileInfo createFile(const QString& name) = 0;
    /// Whether the file was there and is gone now.
    virtual bool deleteFile(const QString& name) = 0;
    /// Bytes in the files that lie directly in the directory, hidden ones not counted.
    virtual qint64 bytesUsed() const = 0;
    /// Bytes of the file system that nobody uses, the superuser's reserve included.
    virtual qint64 bytesFree() const = 0;
};

} // namespace DataSource
