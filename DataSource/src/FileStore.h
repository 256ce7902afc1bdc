// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractFileStore.h"

#include <memory>

namespace DataSource
{

/// The files of one directory by position. A scan or a deletion runs on the global thread pool, one of them at a time;
/// a request that meets another one is refused with a warning and changes nothing. `fileAt` is served from a cache of
/// 30 records (see `FileStoreContents`) and lists the directory, on the caller's thread, only when it misses.
///
/// The first listing is taken at construction, for the cache alone: `count()` and `bytesUsed()` are 0 until a scan has
/// ended, and deleting a file never takes them below 0.
///
/// Errors are logged with fixed line numbers; nothing is returned to the caller.
///
/// Threads: lives in the thread that made it. `scanComplete` and `deleteComplete` are emitted there, `deleteProgress`
/// on the pool's thread. The destructor waits for nothing but a `deleteProgress` that is being delivered: a running
/// scan ends at its next entry, a running deletion goes on to its end.
class FileStore : public AbstractFileStore
{
    Q_OBJECT

public:
    /// Creates the directory, with its parents, if it is missing.
    explicit FileStore(const QString& path);
    ~FileStore() override;
    Q_DISABLE_COPY_MOVE(FileStore)

    QFileInfo createFile(const QString& name) override;
    QFileInfo fileAt(int index) const override;
    int count() const override;
    void deleteFile(unsigned int index) override;
    qint64 bytesUsed() const override;
    /// 0 when the directory is gone or, with a warning in the log, when the system does not say.
    qint64 bytesFree() const override;
    qint64 bytesCapacity() const override;
    void rescan() override;
    bool isScanning() const override;
    bool isDeleting() const override;

public slots:
    void stopScanning() override;

private slots:
    void scanningDone();
    void deletingDone();

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace DataSource
