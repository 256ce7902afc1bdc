// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>

#include <optional>

namespace DataSource
{

/// Size of the file system that a directory lies on, in bytes.
struct FileSystemSpace
{
    qint64 capacity = 0;
    qint64 free = 0; ///< the superuser's reserve included

    /// Nothing when the system does not say.
    [[nodiscard]] static std::optional<FileSystemSpace> of(const QString& directory);
};

} // namespace DataSource
