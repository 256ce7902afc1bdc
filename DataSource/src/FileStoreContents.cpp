// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileStoreContents.h"

#include "DataSource/src/FileListing.h"

#include <QFile>
#include <QList>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

namespace DataSource
{

namespace
{

constexpr int cacheCapacity = 30;
constexpr int cacheStep = 15;
constexpr qint64 shrinkStep = 10LL * 1024 * 1024;
constexpr qint64 greatestPercent = 99;

class FileDescriptor
{
public:
    explicit FileDescriptor(int number) : descriptor(number) {}
    ~FileDescriptor()
    {
        if (descriptor >= 0)
            ::close(descriptor);
    }
    Q_DISABLE_COPY_MOVE(FileDescriptor)

    [[nodiscard]] int get() const { return descriptor; }

private:
    int descriptor;
};

/// A descriptor to shrink the file with; none if that could change anything outside the directory.
int openedForShrinking(int directory, const char* name)
{
    const int file = ::openat(directory, name, O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    struct stat status
    {
    };
    if (file >= 0 && ::fstat(file, &status) == 0 && S_ISREG(status.st_mode) && status.st_nlink == 1)
        return file;
    if (file >= 0)
        ::close(file);
    return -1;
}

} // namespace

FileStoreContents::FileStoreContents(const QString& absolutePath, std::function<void(qint32)> progress)
    : path(absolutePath), cache(cacheCapacity), reportProgress(std::move(progress))
{
}

void FileStoreContents::releaseOwner()
{
    const std::lock_guard lock(ownerMutex);
    reportProgress = nullptr;
}

int FileStoreContents::count() const
{
    const std::lock_guard lock(mutex);
    return fileCount;
}

qint64 FileStoreContents::bytesUsed() const
{
    const std::lock_guard lock(mutex);
    return byteCount;
}

QFileInfo FileStoreContents::recordAt(int index)
{
    const std::lock_guard lock(mutex);
    if (index < 0)
        return {};
    checkCache(index);
    return cache.containsIndex(index) ? cache.at(index) : QFileInfo();
}

void FileStoreContents::fillCache()
{
    const std::lock_guard lock(mutex);
    fillCacheLocked();
}

void FileStoreContents::fillCacheLocked()
{
    cache.clear();
    FileListing listing(path);
    listing.step();
    for (int filled = 0; filled < cacheCapacity && !listing.isBeforeFirst(); ++filled) {
        if (listing.hasRecord())
            cache.append(listing.record());
        listing.step();
    }
}

void FileStoreContents::checkCache(int index)
{
    const qsizetype first = cache.firstIndex();
    const qsizetype end = first + cache.count();
    if (index > end || index < first - 1 || end < 1)
        restartCacheAt(index);
    else if (index == end)
        moveCacheForward();
    else if (index == first - 1)
        moveCacheBackTo(index);
}

void FileStoreContents::restartCacheAt(int index)
{
    FileListing listing(path);
    if (listing.step(qint64(index) + 1))
        cache.insert(index, listing.record());
}

void FileStoreContents::moveCacheForward()
{
    FileListing listing(path);
    if (!listing.step(cache.lastIndex() + 1))
        return;
    for (int taken = 0; taken < cacheStep && listing.step(); ++taken)
        cache.append(listing.record());
}

void FileStoreContents::moveCacheBackTo(int index)
{
    if (index < cacheStep - 1) {
        fillCacheLocked();
        return;
    }
    FileListing listing(path);
    QList<QFileInfo> records;
    if (!listing.step(index - cacheStep + 2))
        return;
    do
        records.append(listing.record());
    while (records.size() < cacheStep && listing.step());
    // A directory that has shrunk meanwhile has no record for the position that was asked for.
    if (records.size() == cacheStep)
        std::for_each(records.crbegin(), records.crend(), [this](const QFileInfo& record) { cache.prepend(record); });
}

void FileStoreContents::scanDirectory(const std::atomic<bool>& wanted)
{
    {
        const std::lock_guard lock(mutex);
        fileCount = 0;
        byteCount = 0;
    }
    int files = 0;
    qint64 bytes = 0;
    FileListing listing(path);
    while (wanted && listing.step()) {
        ++files;
        bytes += listing.record().size();
    }
    const std::lock_guard lock(mutex);
    fileCount = files;
    byteCount = bytes;
    fillCacheLocked();
}

void FileStoreContents::deleteFile(const QString& filePath)
{
    const QFileInfo record(filePath);
    const qint64 size = record.size();
    {
        // Before the first scan there is nothing to subtract from.
        const std::lock_guard lock(mutex);
        byteCount = std::max<qint64>(byteCount - size, 0);
        fileCount = std::max(fileCount - 1, 0);
    }
    const FileDescriptor directory(::open(QFile::encodeName(path).constData(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    const QByteArray name = QFile::encodeName(record.fileName());
    shrink(directory.get(), name.constData(), size);
    ::unlinkat(directory.get(), name.constData(), 0);
    fillCache();
}

void FileStoreContents::shrink(int directory, const char* name, qint64 size)
{
    const FileDescriptor file(openedForShrinking(directory, name));
    for (qint64 length = size; length > 0; length -= shrinkStep) {
        // What cannot be shrunk is removed in one go; the reports keep their rhythm.
        [[maybe_unused]] const int ignored = file.get() >= 0 ? ::ftruncate(file.get(), length) : -1;
        report(static_cast<qint32>(std::min(100 - length * 100 / size, greatestPercent)));
    }
}

void FileStoreContents::report(qint32 percent)
{
    const std::lock_guard lock(ownerMutex);
    if (reportProgress)
        reportProgress(percent);
}

} // namespace DataSource
