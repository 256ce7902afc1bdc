// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/ExactTimer.h"

#include "utilities/Debug.h"

#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>

namespace VirtualDevice
{

using namespace std::chrono_literals;

ExactTimer::ExactTimer(QObject* parent)
    : QObject(parent),
      descriptor(::timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC)),
      notifier(QSocketNotifier::Read, this)
{
    if (descriptor < 0) {
        Utilities::Debug::warningMessage(QStringLiteral(__FILE__), __LINE__, QStringLiteral("Cannot make a timer: %m"));
        return;
    }
    notifier.setSocket(descriptor);
    notifier.setEnabled(true);
    connect(&notifier, &QSocketNotifier::activated, this, &ExactTimer::serve);
}

ExactTimer::~ExactTimer()
{
    notifier.setEnabled(false);
    if (descriptor >= 0)
        ::close(descriptor);
}

void ExactTimer::start(std::chrono::nanoseconds time)
{
    // The kernel takes zero for "stop".
    const auto ahead = std::max<std::chrono::nanoseconds>(time, 1ns);
    const auto seconds = std::chrono::floor<std::chrono::seconds>(ahead);
    itimerspec setting{};
    setting.it_value = {static_cast<time_t>(seconds.count()), static_cast<long>((ahead - seconds).count())};
    active = ::timerfd_settime(descriptor, 0, &setting, nullptr) == 0;
}

void ExactTimer::stop()
{
    const itimerspec never{};
    ::timerfd_settime(descriptor, 0, &never, nullptr);
    active = false;
}

void ExactTimer::serve()
{
    // Stopped or started anew since the event loop saw it end, there is nothing to read.
    std::uint64_t ends = 0;
    if (::read(descriptor, &ends, sizeof ends) != sizeof ends)
        return;
    active = false;
    emit timeout();
}

} // namespace VirtualDevice
