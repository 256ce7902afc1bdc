// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/EndSignals.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>

namespace VirtualDevice
{

namespace
{

constexpr std::array endSignals{SIGINT, SIGTERM, SIGHUP};

volatile std::sig_atomic_t wakeUp = -1;

void wake(int)
{
    const int before = errno;
    const std::uint64_t one = 1;
    [[maybe_unused]] const auto written = ::write(wakeUp, &one, sizeof one);
    errno = before;
}

void setHandler(void (*handler)(int))
{
    struct sigaction action
    {
    };
    action.sa_handler = handler;
    action.sa_flags = SA_RESTART;
    for (const int number : endSignals)
        ::sigaction(number, &action, nullptr);
}

} // namespace

EndSignals::EndSignals(QObject* parent) : QObject(parent)
{
    wakeUp = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    // Without it nobody would hear of the signals: they end the process themselves then.
    if (wakeUp < 0)
        return;
    notifier = std::make_unique<QSocketNotifier>(wakeUp, QSocketNotifier::Read);
    connect(notifier.get(), &QSocketNotifier::activated, this, [this] {
        std::uint64_t count = 0;
        if (::read(wakeUp, &count, sizeof count) > 0)
            emit requested();
    });
    setHandler(wake);
}

EndSignals::~EndSignals()
{
    setHandler(SIG_DFL);
    notifier.reset();
    if (wakeUp >= 0)
        ::close(wakeUp);
    wakeUp = -1;
}

} // namespace VirtualDevice
