// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/KeyedFileStore.h"

#include "DataSource/src/FileSystemSpace.h"
#include "utilities/Debug.h"

#include <QDir>
#include <QDirIterator>

namespace DataSource
{

namespace
{

/// Line numbers that monitoring matches in the log.
constexpr int unknownFreeSpaceLine = 159;
constexpr int unknownCapacityLine = 186;

bool isBareName(const QString& name)
{
    return !name.isEmpty() && !name.contains(u'/') && name != u"." && name != u"..";
}

} // namespace

class KeyedFileStore::PrivateData
{
public:
    explicit PrivateData(const QString& path) : directory(path) {}

    [[nodiscard]] FileSystemSpace space(int warningLine) const;

    QDir directory;
};

FileSystemSpace KeyedFileStore::PrivateData::space(int warningLine) const
{
    if (!directory.exists())
        return {};
    const auto space = FileSystemSpace::of(directory.absolutePath());
    if (!space)
        Utilities::Debug::warningMessage(__FILE__, warningLine,
                                         QStringLiteral("Unable to obtain file system information"));
    return space.value_or(FileSystemSpace());
}

KeyedFileStore::KeyedFileStore(const QString& path) : d(std::make_unique<PrivateData>(path))
{
    if (!d->directory.exists())
        d->directory.mkpath(d->directory.absolutePath());
}

KeyedFileStore::~KeyedFileStore() = default;

QFileInfo KeyedFileStore::file(const QString& name) const
{
    return QFileInfo(d->directory.absoluteFilePath(name));
}

QFileInfo KeyedFileStore::createFile(const QString& name)
{
    return file(name);
}

bool KeyedFileStore::deleteFile(const QString& name)
{
    return isBareName(name) && d->directory.remove(name);
}

qint64 KeyedFileStore::bytesUsed() const
{
    qint64 total = 0;
    QDirIterator listing(d->directory.absolutePath(), QDir::Files);
    while (listing.hasNext()) {
        listing.next();
        total += listing.fileInfo().size();
    }
    return total;
}

qint64 KeyedFileStore::bytesFree() const
{
    return d->space(unknownFreeSpaceLine).free;
}

qint64 KeyedFileStore::bytesCapacity() const
{
    return d->space(unknownCapacityLine).capacity;
}

} // namespace DataSource
