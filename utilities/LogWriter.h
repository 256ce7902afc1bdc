// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>

namespace Utilities
{

/// Carries log messages to `syslog`, and other lines to standard error, on a thread of its own, so that a reader which
/// takes nothing blocks that thread and nobody else. As long as the machine has no thread left for it, each caller
/// carries its own requests out, however long that takes.
///
/// Threads: every operation may be called from any thread. Each waits until its request has been carried out, but all
/// callers together wait at most `patience` for a service that hangs, or that is slow (`quick` or longer for each of
/// many requests in a row). From then on nobody waits, until the service is quick again and what is still queued is a
/// matter of a moment.
/// The queue holds `capacity` requests; a request that finds it full is dropped.
/// At the end of the process the writer waits `patience` for what is still queued; what is logged after that, by
/// objects with static storage duration, is dropped: `syslog` itself might block the exit. A service that hangs even
/// then is left behind with its thread: the exit of the process ends both.
class LogWriter
{
public:
    static constexpr std::size_t capacity = 1000;
    static constexpr std::chrono::milliseconds patience{250};
    static constexpr std::chrono::milliseconds quick{10};

    static LogWriter& instance();

    LogWriter(const LogWriter&) = delete;
    LogWriter& operator=(const LogWriter&) = delete;

    /// `identity` must outlive the writer: `openlog` keeps the pointer.
    void open(const char* identity, int options, int facility);
    void close();
    /// `format` is the format of the `syslog` call; `%m` shows the caller's `errno`.
    void write(int priority, const QByteArray& format);
    /// Writes the bytes to standard error as they are. Without a reader they are lost.
    void writeError(const QByteArray& bytes);

private:
    using Request = std::function<void()>;

    LogWriter();
    ~LogWriter() = default;

    void submit(Request request);
    /// Starts the thread if there is none; false on a machine that has none to give. Under the mutex.
    [[nodiscard]] bool hasThread();
    void run();
    void finish();
    void judgeBy(std::chrono::nanoseconds lastRequest);
    [[nodiscard]] bool waitFor(std::unique_lock<std::mutex>& lock, std::uint64_t ticket);

    std::mutex mutex;
    std::condition_variable changed;
    std::deque<Request> queue;
    std::uint64_t submitted = 0;
    std::uint64_t completed = 0;
    std::chrono::nanoseconds slowness{0}; ///< what the last requests took, as far as they were slow one after another
    bool hanging = false;
    bool finishing = false;
    std::thread thread;
};

} // namespace Utilities
