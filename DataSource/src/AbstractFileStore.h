// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QFileInfo>
#include <QObject>

namespace DataSource
{

/// One directory's files as a list that is addressed by position, for a user who pages through it.
///
/// The positions, counted from 0, are those of the file system's own order: unsorted, files only, no hidden ones, no
/// subdirectories. Listing the whole directory and deleting run in the background and report through the signals.
///
/// Threads: lives in the thread that made it; `deleteProgress` may be emitted from another thread.
class AbstractFileStore : public QObject
{
    Q_OBJECT

public:
    AbstractFileStore() = default;
    ~AbstractFileStore() override = default;
    Q_DISABLE_COPY_MOVE(AbstractFileStore)

    /// Where a file of that name belongs. Creates nothing on disk.
    virtual QFileInfo createFile(const QString& name) = 0;
    /// The file at a position; positions from `count()` on may give an empty record or the last file again.
    virtual QFileInfo fileAt(int index) const = 0;
    /// Number of files as of the last scan; 0 before the first.
    virtual int count() const = 0;
    virtual void deleteFile(unsigned int index) = 0;
    /// Bytes in the files as of the last scan; 0 before the first.
    virtual qint64 bytesUsed() const = 0;
    /// Bytes of the file system that nobody uses, the superuser's reserve included.
    virtual qint64 bytesFree() const = 0;
    virtual qint64 bytesCapacity() const = 0;
    virtual void rescan() = 0;
    virtual bool isScanning() const = 0;
    virtual bool isDeleting() const = 0;

public slots:
    /// The scan ends early and without `scanComplete()`.
    virtual void stopScanning() = 0;

signals:
    void scanComplete();
    /// While a file that is not empty is being deleted: 0 at first, 99 at most. A 100 would say that the file is gone
    /// while there still is some of it, be it less than a hundredth; that it is gone is for `deleteComplete()` to say.
    void deleteProgress(qint32 percent);
    void deleteComplete();
};

} // namespace DataSource
