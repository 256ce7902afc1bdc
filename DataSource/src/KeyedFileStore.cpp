// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/KeyedFileStore.h"

#include "DataSource/src/FileListing.h"
#include "DataSource/src/FileSystemSpace.h"

#include <QDir>

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

    QDir directory;
};

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
    FileListing listing(d->directory.absolutePath());
    while (listing.step())
        total += listing.record().size();
    return total;
}

qint64 KeyedFileStore::bytesFree() const
{
    return FileSystemSpace::of(d->directory, __FILE__, unknownFreeSpaceLine).free;
}

qint64 KeyedFileStore::bytesCapacity() const
{
    return FileSystemSpace::of(d->directory, __FILE__, unknownCapacityLine).capacity;
}

} // namespace DataSource
