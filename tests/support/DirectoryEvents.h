// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QHash>
#include <QList>
#include <QStringList>

#include <cstdint>

namespace TestSupport
{

/// What happens in directories, in the order in which it happens, as the kernel sees it. The kernel merges equal events
/// that follow each other unread.
class DirectoryEvents
{
public:
    struct Event
    {
        std::uint32_t mask; ///< of inotify
        QString path;       ///< of the entry; of the directory itself without a slash at its end
    };

    /// `mask` is inotify's, of what to report.
    DirectoryEvents(const QStringList& directories, std::uint32_t mask);
    ~DirectoryEvents();
    DirectoryEvents(const DirectoryEvents&) = delete;
    DirectoryEvents& operator=(const DirectoryEvents&) = delete;

    /// Since the last call.
    QList<Event> take();

private:
    int descriptor;
    QHash<int, QString> watched;
};

} // namespace TestSupport
