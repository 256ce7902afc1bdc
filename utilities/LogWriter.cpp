// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/LogWriter.h"

#include <syslog.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <utility>

namespace Utilities
{

namespace
{

/// The message text is the format by the facade's contract, which is what the compiler warns of.
void callSyslog(int priority, const char* format)
{
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-security"
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    syslog(priority, format); // NOLINT(cppcoreguidelines-pro-type-vararg)
#pragma GCC diagnostic pop
}

/// Signals are the business of the threads that expect them: the writer's thread takes none.
class SignalsBlocked
{
public:
    SignalsBlocked()
    {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &previous);
    }
    ~SignalsBlocked() { pthread_sigmask(SIG_SETMASK, &previous, nullptr); }
    SignalsBlocked(const SignalsBlocked&) = delete;
    SignalsBlocked& operator=(const SignalsBlocked&) = delete;

private:
    sigset_t previous{};
};

} // namespace

LogWriter& LogWriter::instance()
{
    // Never destroyed: objects with static storage duration may still call it while the process ends.
    static auto* const writer = new LogWriter;
    return *writer;
}

LogWriter::LogWriter()
{
    const SignalsBlocked guard;
    thread = std::thread([this] { run(); });
    std::atexit([] { instance().finish(); });
}

void LogWriter::open(const char* identity, int options, int facility)
{
    submit([=] { openlog(identity, options, facility); });
}

void LogWriter::close()
{
    submit([] { closelog(); });
}

void LogWriter::write(int priority, const QByteArray& format)
{
    submit([priority, format, error = errno] {
        errno = error;
        callSyslog(priority, format.constData());
    });
}

void LogWriter::submit(Request request)
{
    std::unique_lock lock(mutex);
    if (queue.size() >= capacity || finishing)
        return;
    queue.push_back(std::move(request));
    const auto ticket = ++submitted;
    changed.notify_all();
    if (!hanging && !waitFor(lock, ticket))
        hanging = true;
}

bool LogWriter::waitFor(std::unique_lock<std::mutex>& lock, std::uint64_t ticket)
{
    return changed.wait_for(lock, patience, [&] { return completed >= ticket || hanging; });
}

void LogWriter::run()
{
    std::unique_lock lock(mutex);
    for (;;) {
        changed.wait(lock, [this] { return !queue.empty() || finishing; });
        if (queue.empty())
            return;
        const Request request = std::move(queue.front());
        queue.pop_front();
        lock.unlock();
        request();
        lock.lock();
        ++completed;
        hanging = false;
        changed.notify_all();
    }
}

void LogWriter::finish()
{
    std::unique_lock lock(mutex);
    finishing = true;
    changed.notify_all();
    const bool drained = changed.wait_for(lock, patience, [this] { return completed == submitted; });
    lock.unlock();
    if (drained)
        thread.join();
    else
        thread.detach();
}

} // namespace Utilities
