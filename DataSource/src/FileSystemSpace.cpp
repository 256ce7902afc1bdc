// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileSystemSpace.h"

#include "utilities/Debug.h"

#include <QFile>

#include <sys/statvfs.h>

namespace DataSource
{

FileSystemSpace FileSystemSpace::of(const QDir& directory, const char* file, int line)
{
    if (!directory.exists())
        return {};
    struct statvfs status
    {
    };
    if (::statvfs(QFile::encodeName(directory.absolutePath()).constData(), &status) != 0) {
        Utilities::Debug::warningMessage(file, line, QStringLiteral("Unable to obtain file system information"));
        return {};
    }
    // Widened first: on the device the factors have 32 bits.
    const auto blockSize = static_cast<qint64>(status.f_bsize);
    return FileSystemSpace{blockSize * static_cast<qint64>(status.f_blocks),
                           blockSize * static_cast<qint64>(status.f_bfree)};
}

} // namespace DataSource
