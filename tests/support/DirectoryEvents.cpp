// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DirectoryEvents.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <array>

namespace TestSupport
{

DirectoryEvents::DirectoryEvents(const QStringList& directories, std::uint32_t mask)
    : descriptor(::inotify_init1(IN_NONBLOCK | IN_CLOEXEC))
{
    for (const auto& directory : directories)
        watched.insert(::inotify_add_watch(descriptor, qPrintable(directory), mask | IN_ONLYDIR), directory);
}

DirectoryEvents::~DirectoryEvents()
{
    ::close(descriptor);
}

QList<DirectoryEvents::Event> DirectoryEvents::take()
{
    QList<Event> events;
    alignas(inotify_event) std::array<char, 4096> buffer{};
    for (ssize_t length = 0; (length = ::read(descriptor, buffer.data(), buffer.size())) > 0;)
        for (ssize_t offset = 0; offset < length;) {
            const auto* const event = reinterpret_cast<const inotify_event*>(buffer.data() + offset);
            const QString directory = watched.value(event->wd);
            events.append(
                {event->mask, event->len == 0 ? directory : directory + u'/' + QString::fromLocal8Bit(event->name)});
            offset += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
        }
    return events;
}

} // namespace TestSupport
