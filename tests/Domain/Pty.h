// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QString>

#include <chrono>

namespace TestSupport
{

/// A real terminal line: the program opens `name()`, the test is the peer at the other end. Raw from the start, so that
/// nothing is echoed before the program has configured it.
///
/// Threads: one at a time.
class Pty
{
public:
    Pty();
    ~Pty();
    Pty(const Pty&) = delete;
    Pty& operator=(const Pty&) = delete;

    [[nodiscard]] QString name() const { return slaveName; }
    /// The peer's end, non-blocking, and one of the program's end, which keeps the line up while the program is away.
    [[nodiscard]] int peer() const { return master; }
    [[nodiscard]] int line() const { return slave; }

    /// Writes all bytes; waits while the line is full.
    void write(const QByteArray& bytes) const;
    /// What has arrived at the peer so far, and the same after waiting for at least `count` bytes.
    [[nodiscard]] QByteArray read() const;
    [[nodiscard]] QByteArray read(qsizetype count, std::chrono::milliseconds limit = std::chrono::seconds(20)) const;
    /// Bytes that wait in the driver for the program.
    [[nodiscard]] int waiting() const;
    /// The other end goes away: the program's reads and writes fail from now on.
    void hangUp();

private:
    int master = -1;
    int slave = -1;
    QString slaveName;
};

} // namespace TestSupport
