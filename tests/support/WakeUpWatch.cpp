// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/WakeUpWatch.h"

#include <QAbstractEventDispatcher>
#include <QCoreApplication>
#include <QDeadlineTimer>
#include <QSemaphore>
#include <QThread>

#include <chrono>
#include <thread>

namespace TestSupport
{

using namespace std::chrono_literals;

/// Serves posted events alone: no timers, no sockets.
class WakeUpWatch::Dispatcher : public QAbstractEventDispatcher
{
public:
    explicit Dispatcher(std::shared_ptr<Sightings> sightings) : seen(std::move(sightings)) {}
    ~Dispatcher() override { seen->destroyed = true; }
    Dispatcher(const Dispatcher&) = delete;
    Dispatcher& operator=(const Dispatcher&) = delete;

    bool processEvents(QEventLoop::ProcessEventsFlags /*flags*/) override
    {
        QCoreApplication::sendPostedEvents();
        woken.tryAcquire(1, 10);
        return true;
    }

    void wakeUp() override
    {
        if (QThread::currentThread() == thread())
            return;
        // Nothing of this object is touched after the event may have been served.
        const std::shared_ptr<Sightings> held = seen;
        ++held->wakeUps;
        const QDeadlineTimer done(1s);
        while (!held->destroyed && !done.hasExpired())
            std::this_thread::sleep_for(1ms);
        if (held->destroyed)
            held->tooLate = true;
    }

    void interrupt() override { woken.release(); }
    void registerSocketNotifier(QSocketNotifier* /*notifier*/) override {}
    void unregisterSocketNotifier(QSocketNotifier* /*notifier*/) override {}
    void registerTimer(int /*id*/, qint64 /*interval*/, Qt::TimerType /*type*/, QObject* /*object*/) override {}
    bool unregisterTimer(int /*id*/) override { return false; }
    bool unregisterTimers(QObject* /*object*/) override { return false; }
    QList<TimerInfo> registeredTimers(QObject* /*object*/) const override { return {}; }
    int remainingTime(int /*id*/) override { return -1; }

private:
    const std::shared_ptr<Sightings> seen;
    QSemaphore woken;
};

WakeUpWatch::WakeUpWatch(QThread& thread)
{
    thread.setEventDispatcher(std::make_unique<Dispatcher>(seen).release());
}

bool WakeUpWatch::sawOnlyLivingThreadsWoken() const
{
    return seen->wakeUps > 0 && !seen->tooLate;
}

} // namespace TestSupport
