// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QThread>

#include <mutex>

namespace Domain
{

/// The thread of a port's read loop: the loop runs where `started()` is emitted, and the event loop behind it serves
/// what is left until "quit" comes.
///
/// Threads: made, started and destroyed on the port's; `queueQuit` by whoever closes the port, one at a time. The
/// object itself belongs to the thread that it is, so that a queued call is served there.
class ReadThread : public QThread
{
    Q_OBJECT

public:
    ReadThread();

    /// Starts the thread, which has ended if it ran before, at high priority. False where the machine has none left.
    [[nodiscard]] bool begin();

    /// Invokes "quit" behind all that the thread has been given to do; on a thread that does not run that is nothing.
    /// False if it cannot be invoked.
    [[nodiscard]] bool queueQuit();

private:
    std::mutex mutex;
    bool accepting = false; ///< events are served and the thread does not end, as long as the mutex is held
};

} // namespace Domain
