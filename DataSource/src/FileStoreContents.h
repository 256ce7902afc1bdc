// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QContiguousCache>
#include <QFileInfo>

#include <atomic>
#include <functional>
#include <mutex>

namespace DataSource
{

/// What a file store and its tasks on the thread pool share: the directory's path, the result of the last scan and the
/// cache of file records. Tasks own a share of it, so they never outlive what they use, whenever the store goes.
///
/// The cache holds at most 30 records, whose positions in it are positions of the listing, and slides along the
/// listing by 15 when a reader steps over one of its ends: a user who pages causes at most one partial listing in 15
/// entries, and memory does not grow with the directory. After a fill, a directory of fewer than 30 files leaves copies
/// of its last record up to position 29.
///
/// Threads: every operation may be called from any thread.
class FileStoreContents
{
public:
    /// `progress` gets the percentages of a removal on the thread that removes.
    FileStoreContents(const QString& absolutePath, std::function<void(qint32)> progress);

    /// The store is about to go: after this `progress` is not called, and no call of it is under way.
    void releaseOwner();

    [[nodiscard]] int count() const;
    [[nodiscard]] qint64 bytesUsed() const;
    /// The record at a position of the listing; an empty one for negative positions and beyond the listing's end.
    [[nodiscard]] QFileInfo recordAt(int index);

    void fillCache();
    /// Walks the whole listing as long as `wanted` is set; stores what it has counted either way.
    void scanDirectory(const std::atomic<bool>& wanted);
    /// Removes one of the directory's files. A large file is shrunk from its end first, in steps of 10 MiB: freeing it
    /// at once would keep a slow flash busy for long. Only the entry in the directory is touched: a symbolic link is
    /// not followed, and a file that has another name elsewhere is not shrunk. Both report progress all the same, by
    /// the size that they count with: a link by its target's.
    void deleteFile(const QString& filePath);

private:
    void fillCacheLocked();
    void checkCache(int index);
    void restartCacheAt(int index);
    void moveCacheForward();
    void moveCacheBackTo(int index);
    void report(qint32 percent);
    void shrink(int directory, const char* name, qint64 size);

    const QString path;

    mutable std::mutex mutex; ///< guards the three below
    int fileCount = 0;
    qint64 byteCount = 0;
    QContiguousCache<QFileInfo> cache;

    std::mutex ownerMutex; ///< guards `reportProgress`, held while it is called
    std::function<void(qint32)> reportProgress;
};

} // namespace DataSource
