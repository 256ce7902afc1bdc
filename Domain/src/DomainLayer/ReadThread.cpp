// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/ReadThread.h"

namespace Domain
{

// Whoever posts an event wakes the receiver's event dispatcher when the event is in the queue already. A thread that
// ends by that very event would destroy the dispatcher under the hands that wake it: it waits here until they are off.
ReadThread::ReadThread()
{
    moveToThread(this);
    connect(
        this, &QThread::finished, this,
        [this] {
            const std::lock_guard guard(mutex);
            accepting = false;
        },
        Qt::DirectConnection);
}

bool ReadThread::begin()
{
    const std::lock_guard guard(mutex);
    start(QThread::HighPriority);
    accepting = isRunning();
    return accepting;
}

bool ReadThread::queueQuit()
{
    const std::lock_guard guard(mutex);
    return !accepting || QMetaObject::invokeMethod(this, "quit", Qt::QueuedConnection);
}

} // namespace Domain
