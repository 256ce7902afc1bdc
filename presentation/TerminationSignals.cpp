// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TerminationSignals.h"

#include <QCoreApplication>

#include <fcntl.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>

namespace Presentation
{

namespace
{

std::atomic<int> pipeInput{-1};
std::atomic<bool> endRequested{false};
static_assert(std::atomic<int>::is_always_lock_free && std::atomic<bool>::is_always_lock_free,
              "the signal handler uses them");

void setAction(void (*handler)(int))
{
    struct sigaction action
    {
    };
    action.sa_handler = handler;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
}

/// Calls nothing but what a signal handler may call. The second signal comes here only where somebody has put this
/// handler back meanwhile, and kills all the same: its own turn comes when this call has returned.
void requestEnd(int signal)
{
    const int savedErrno = errno;
    setAction(SIG_DFL);
    if (endRequested.exchange(true)) {
        ::raise(signal);
        errno = savedErrno;
        return;
    }
    const char byte = 1;
    [[maybe_unused]] const auto written = ::write(pipeInput.load(), &byte, 1);
    errno = savedErrno;
}

} // namespace

TerminationSignals::Pipe::Pipe()
{
    if (::pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0)
        qWarning("Termination signals end the program at once: no pipe");
}

TerminationSignals::Pipe::~Pipe()
{
    ::close(ends[0]);
    ::close(ends[1]);
}

TerminationSignals::TerminationSignals() : notifier(QSocketNotifier::Read)
{
    endRequested = false;
    if (pipe.ends[0] < 0)
        return;
    notifier.setSocket(pipe.ends[0]);
    notifier.setEnabled(true);
    connect(&notifier, &QSocketNotifier::activated, this, [this] {
        notifier.setEnabled(false);
        QCoreApplication::quit();
    });
    pipeInput = pipe.ends[1];
    setAction(requestEnd);
}

TerminationSignals::~TerminationSignals()
{
    setAction(SIG_DFL);
    pipeInput = -1;
}

bool TerminationSignals::isEndRequested()
{
    return endRequested;
}

} // namespace Presentation
