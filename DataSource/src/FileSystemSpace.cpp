// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileSystemSpace.h"

#include <QFile>

#include <sys/statvfs.h>

namespace DataSource
{

std::optional<FileSystemSpace> FileSystemSpace::of(const QString& directory)
{
    struct statvfs status
    {
    };
    if (::statvfs(QFile::encodeName(directory).constData(), &status) != 0)
        return std::nullopt;
    // Widened first: on the device the factors have 32 bits.
    const auto blockSize = static_cast<qint64>(status.f_bsize);
    return FileSystemSpace{blockSize * static_cast<qint64>(status.f_blocks),
                           blockSize * static_cast<qint64>(status.f_bfree)};
}

} // namespace DataSource
