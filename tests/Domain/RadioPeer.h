// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/Domain/Pty.h"

#include <QByteArray>
#include <QList>

#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace TestSupport
{

/// The microcontroller at the other end of the line: takes commands on a thread of its own and answers as it is told.
///
/// Threads: the operations are for the test's thread; answers are made on the peer's.
class RadioPeer
{
public:
    /// From a command to the bytes that go on the line.
    using Answer = std::function<QByteArray(const QByteArray& command)>;

    /// Takes every command and says nothing, at first.
    explicit RadioPeer(Pty& line);
    ~RadioPeer();
    RadioPeer(const RadioPeer&) = delete;
    RadioPeer& operator=(const RadioPeer&) = delete;

    void answerWith(Answer answer);
    [[nodiscard]] QList<QByteArray> commands() const;

    /// Acknowledges every command, and answers those that have a reply.
    [[nodiscard]] static QByteArray wellBehaved(const QByteArray& command);
    [[nodiscard]] static QByteArray ack();
    [[nodiscard]] static QByteArray nak(char reason);

private:
    void run();
    void take(QByteArray& buffer);

    Pty& line;
    int stopPipe[2] = {-1, -1};
    mutable std::mutex mutex;
    std::vector<QByteArray> taken; ///< not shared with the copies that the test gets
    Answer answer = [](const QByteArray&) { return QByteArray(); };
    std::thread thread;
};

} // namespace TestSupport
