// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileStore.h"

#include "DataSource/src/FileListing.h"
#include "DataSource/src/FileStoreContents.h"
#include "DataSource/src/FileSystemSpace.h"
#include "utilities/SourceWarnings.h"

#include <QDir>
#include <QFutureWatcher>
#include <QPromise>
#include <QRunnable>
#include <QThreadPool>

#include <atomic>
#include <functional>
#include <optional>

namespace DataSource
{

namespace
{

/// Line numbers that monitoring matches in the log.
constexpr int deleteWhileDeletingLine = 309;
constexpr int deleteWhileScanningLine = 314;
constexpr int deleteBeyondEndLine = 333;
constexpr int deleteNothingLine = 347;
constexpr int unknownFreeSpaceLine = 429;
constexpr int unknownCapacityLine = 457;
constexpr int scanWhileScanningLine = 474;
constexpr int scanWhileDeletingLine = 479;

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

/// Work for the global thread pool, whose end its future reports. It is no `QtConcurrent::run`, whose task is read on
/// the pool's thread before it comes to the work, and so before `handedOver` could show a sanitizer the threads' order.
class PoolTask : public QRunnable
{
public:
    explicit PoolTask(std::function<void()> task) : work(std::move(task)) {}

    static QFuture<void> start(std::function<void()> work)
    {
        auto* const task = new PoolTask(std::move(work));
        auto future = task->promise.future();
        handedOver.fetch_add(1, std::memory_order_release);
        QThreadPool::globalInstance()->start(task);
        return future;
    }

    void run() override
    {
        // The pool's own lock orders the two threads already, but inside Qt, where no sanitizer sees it.
        static_cast<void>(handedOver.load(std::memory_order_acquire));
        promise.start();
        work();
        promise.finish();
    }

private:
    static inline std::atomic<unsigned int> handedOver = 0;

    std::function<void()> work;
    QPromise<void> promise;
};

} // namespace

class FileStore::PrivateData
{
public:
    PrivateData(FileStore* store, const QString& path)
        : directory(path),
          contents(std::make_shared<FileStoreContents>(
              directory.absolutePath(), [store](qint32 percent) { emit store->deleteProgress(percent); }))
    {
    }

    [[nodiscard]] std::optional<QFileInfo> fileToDelete(unsigned int index) const;

    const QDir directory;
    const std::shared_ptr<FileStoreContents> contents;
    std::atomic<bool> scanning = false;
    std::atomic<bool> deleting = false;
    /// Of the latest scan: a stopped one must stay stopped when the next one starts.
    std::shared_ptr<std::atomic<bool>> scanWanted = std::make_shared<std::atomic<bool>>(false);
    QFuture<void> scanFuture;
    QFutureWatcher<void> scanWatcher;
    QFuture<void> deleteFuture;
    QFutureWatcher<void> deleteWatcher;
};

std::optional<QFileInfo> FileStore::PrivateData::fileToDelete(unsigned int index) const
{
    FileListing listing(directory.absolutePath());
    listing.step();
    if (!listing.step(index)) {
        warn(deleteBeyondEndLine, QStringLiteral("Attempting to delete a file index larger than the number of files in "
                                                 "the directory"));
        return std::nullopt;
    }
    if (!listing.hasRecord()) {
        warn(deleteNothingLine, QStringLiteral("Attempting to delete a file that does not exist"));
        return std::nullopt;
    }
    return listing.record();
}

FileStore::FileStore(const QString& path) : d(std::make_unique<PrivateData>(this, path))
{
    if (!d->directory.exists())
        d->directory.mkpath(d->directory.absolutePath());
    d->contents->fillCache();
    connect(&d->scanWatcher, &QFutureWatcherBase::finished, this, &FileStore::scanningDone);
    connect(&d->deleteWatcher, &QFutureWatcherBase::finished, this, &FileStore::deletingDone);
}

FileStore::~FileStore()
{
    FileStore::stopScanning();
    d->contents->releaseOwner();
}

QFileInfo FileStore::createFile(const QString& name)
{
    return QFileInfo(d->directory.absoluteFilePath(name));
}

QFileInfo FileStore::fileAt(int index) const
{
    return d->contents->recordAt(index);
}

int FileStore::count() const
{
    return d->contents->count();
}

qint64 FileStore::bytesUsed() const
{
    return d->contents->bytesUsed();
}

qint64 FileStore::bytesFree() const
{
    return FileSystemSpace::of(d->directory, __FILE__, unknownFreeSpaceLine).free;
}

qint64 FileStore::bytesCapacity() const
{
    return FileSystemSpace::of(d->directory, __FILE__, unknownCapacityLine).capacity;
}

bool FileStore::isScanning() const
{
    return d->scanning;
}

bool FileStore::isDeleting() const
{
    return d->deleting;
}

void FileStore::rescan()
{
    if (d->scanning) {
        warn(scanWhileScanningLine, QStringLiteral("Attempting to start a new scan while a scan is in progress."));
        return;
    }
    if (d->deleting) {
        warn(scanWhileDeletingLine, QStringLiteral("Attempting to start a scan while a deletion is in progress."));
        return;
    }
    d->scanning = true;
    d->scanWanted = std::make_shared<std::atomic<bool>>(true);
    // A stopped scan may still be on its way to the end of its entry; tasks never overlap.
    d->scanFuture =
        PoolTask::start([contents = d->contents, wanted = d->scanWanted, previous = d->scanFuture]() mutable {
            previous.waitForFinished();
            contents->scanDirectory(*wanted);
        });
    d->scanWatcher.setFuture(d->scanFuture);
}

void FileStore::stopScanning()
{
    d->scanning = false;
    *d->scanWanted = false;
}

/// The report of a stopped scan may arrive when the next one runs already; that one is not done before its future is.
void FileStore::scanningDone()
{
    if (d->scanFuture.isFinished() && d->scanning.exchange(false))
        emit scanComplete();
}

void FileStore::deleteFile(unsigned int index)
{
    if (d->deleting) {
        warn(deleteWhileDeletingLine, QStringLiteral("Attempting to delete a file while a deletion is in progress."));
        return;
    }
    if (d->scanning) {
        warn(deleteWhileScanningLine, QStringLiteral("Attempting to delete a file while a scan is in progress."));
        return;
    }
    const auto file = d->fileToDelete(index);
    if (!file)
        return;
    d->deleting = true;
    d->deleteFuture = PoolTask::start(
        [contents = d->contents, filePath = file->absoluteFilePath(), stoppedScan = d->scanFuture]() mutable {
            stoppedScan.waitForFinished();
            contents->deleteFile(filePath);
        });
    d->deleteWatcher.setFuture(d->deleteFuture);
}

void FileStore::deletingDone()
{
    if (d->deleting.exchange(false))
        emit deleteComplete();
}

} // namespace DataSource
