// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QDirIterator>
#include <QFileInfo>

namespace DataSource
{

/// One pass over a directory's files in the file system's own order: unsorted, files only, no hidden ones, no
/// subdirectories. Every position, count and size of the stores comes from such a pass, so that they always agree.
///
/// It begins before the first entry. A directory that is missing or cannot be read has no entries. At the end of the
/// listing the last entry stays current.
///
/// Threads: one at a time.
class FileListing
{
public:
    explicit FileListing(const QString& directory);

    /// To the next entry; false, and nowhere, when there is none.
    bool step();
    /// So many entries further; false, and at the last entry, when there are not that many.
    bool step(qint64 times);

    /// No entry is current: none has been stepped to yet, or there is none.
    [[nodiscard]] bool isBeforeFirst() const { return !started; }
    /// The current entry; an empty record before the first.
    [[nodiscard]] QFileInfo record() const { return iterator.fileInfo(); }
    /// Whether there is a current entry and it has not vanished.
    [[nodiscard]] bool hasRecord() const { return started && record().exists(); }

private:
    QDirIterator iterator;
    bool started = false;
};

} // namespace DataSource
