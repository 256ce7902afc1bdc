// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/WorkerThread.h"

#include <QtCore/qtsan_impl.h>

namespace Domain
{

// Qt is not built for the thread sanitizer, which does not see into QThread::wait() and takes what comes after it for a
// race: said here in Qt's own words. Nothing in an ordinary build.

WorkerThread::WorkerThread()
{
    connect(
        this, &QThread::finished, this, [this] { QtTsan::futexRelease(this); }, Qt::DirectConnection);
}

void WorkerThread::end()
{
    quit();
    wait();
    QtTsan::futexAcquire(this);
}

} // namespace Domain
