// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QThread>

namespace Domain
{

/// The thread, with an event loop, of an object that lives on a thread of its own.
///
/// Threads: made, ended and destroyed on its owner's. Where the machine has no thread left, `start` leaves it idle.
class WorkerThread : public QThread
{
    Q_OBJECT

public:
    WorkerThread();

    /// Returns when the thread has ended: what it has done is done, and nobody uses any more what it used. What its
    /// event loop has not begun is dropped.
    void end();
};

} // namespace Domain
