// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/LogWriter.h"

#include <poll.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <system_error>
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

/// As a blocking write would, where the descriptor itself does not block (`StandardError`).
void awaitStandardError()
{
    pollfd descriptor{STDERR_FILENO, POLLOUT, 0};
    ::poll(&descriptor, 1, -1);
}

void writeToStandardError(const QByteArray& bytes)
{
    for (qsizetype done = 0; done < bytes.size();) {
        awaitStandardError();
        const auto written = ::write(STDERR_FILENO, bytes.constData() + done, static_cast<size_t>(bytes.size() - done));
        if (written < 0 && errno != EINTR && errno != EAGAIN)
            return;
        done += written < 0 ? 0 : written;
    }
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
    std::atexit([] { instance().finish(); });
}

bool LogWriter::hasThread()
{
    if (thread.joinable())
        return true;
    const SignalsBlocked guard;
    try {
        thread = std::thread([this] { run(); });
        return true;
    } catch (const std::system_error&) {
        return false;
    }
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
        awaitStandardError(); // for the echo
        errno = error;
        callSyslog(priority, format.constData());
    });
}

void LogWriter::writeError(const QByteArray& bytes)
{
    submit([bytes] { writeToStandardError(bytes); });
}

void LogWriter::submit(Request request)
{
    std::unique_lock lock(mutex);
    if (queue.size() >= capacity || finishing)
        return;
    if (!hasThread()) {
        lock.unlock();
        request();
        return;
    }
    queue.push_back(std::move(request));
    const auto ticket = ++submitted;
    changed.notify_all();
    if (hanging || waitFor(lock, ticket))
        return;
    hanging = true;
    changed.notify_all(); // Whoever else waits need not find out for himself.
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
        const auto begin = std::chrono::steady_clock::now();
        request();
        const auto end = std::chrono::steady_clock::now();
        lock.lock();
        ++completed;
        judgeBy(end - begin);
        changed.notify_all();
    }
}

/// A service that moves, but slowly, costs the callers as much as one that hangs: those of a noisy line, with a message
/// for every byte, and with them everybody who queues up behind them.
void LogWriter::judgeBy(std::chrono::nanoseconds lastRequest)
{
    slowness = lastRequest < quick ? std::chrono::nanoseconds(0) : slowness + lastRequest;
    if (slowness >= patience)
        hanging = true;
    else if (slowness.count() == 0 && lastRequest * queue.size() < patience / 4)
        hanging = false;
}

void LogWriter::finish()
{
    std::unique_lock lock(mutex);
    finishing = true;
    changed.notify_all();
    const bool drained = changed.wait_for(lock, patience, [this] { return completed == submitted; });
    lock.unlock();
    if (!thread.joinable())
        return;
    if (drained)
        thread.join();
    else
        thread.detach();
}

} // namespace Utilities
