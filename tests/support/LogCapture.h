// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

#include <chrono>
#include <mutex>
#include <thread>
#include <vector>

namespace TestSupport
{

/// One message as it arrived at the log service.
struct LogLine
{
    int priority = 0; ///< 0 (emergency) to 7 (debug)
    int facility = 0; ///< 1 = user
    QString identity; ///< before the colon
    QString text;     ///< after the colon and its blank
};

/// The log service of a test: owns the datagram socket `/dev/log`, as the system's own service does, and keeps every
/// message. Needs the private /dev of tests/sandbox.sh. Opens the facade's log connection when it is made.
///
/// Threads: all operations are for the test's thread; messages may come from any.
class LogCapture
{
public:
    LogCapture();
    ~LogCapture();
    LogCapture(const LogCapture&) = delete;
    LogCapture& operator=(const LogCapture&) = delete;

    /// All messages that have been handed over so far, or those whose text ends in `ending` ("FILE, LINE, TEXT" lines
    /// included).
    [[nodiscard]] std::vector<LogLine> lines() const;
    [[nodiscard]] QStringList texts() const;
    [[nodiscard]] int count(const QString& ending) const;

    /// Waits for `expected` messages whose text ends in `ending`.
    [[nodiscard]] bool waitFor(const QString& ending, int expected = 1,
                               std::chrono::milliseconds limit = std::chrono::seconds(20)) const;
    void clear();

private:
    void receive();
    /// What waits in the socket; under the mutex.
    void takeAll() const;

    int socket = -1;
    int wakeUp[2] = {-1, -1};
    mutable std::mutex mutex;
    mutable std::vector<LogLine> received;
    std::thread thread;
};

} // namespace TestSupport
