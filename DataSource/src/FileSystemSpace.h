// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QDir>

namespace DataSource
{

/// Size of the file system that a directory lies on, in bytes.
struct FileSystemSpace
{
    qint64 capacity = 0;
    qint64 free = 0; ///< the superuser's reserve included

    /// 0 when the directory is gone or, with a warning in the log from that file and line, when the system does not
    /// say.
    [[nodiscard]] static FileSystemSpace of(const QDir& directory, const char* file, int line);
};

} // namespace DataSource
