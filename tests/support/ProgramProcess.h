// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QList>
#include <QString>

#include <chrono>
#include <optional>

namespace TestSupport
{

/// A process as a test signals it and waits for its end: held by a descriptor, so that a number that the kernel has
/// given to somebody else is never meant.
class ProgramProcess
{
public:
    /// The process of that name among the descendants of `ancestor`, in whatever sandbox.
    [[nodiscard]] static std::optional<ProgramProcess> below(qint64 ancestor, const QByteArray& name);
    /// Children, their children and so on.
    [[nodiscard]] static QList<qint64> descendants(qint64 ancestor);
    /// One that nobody has collected yet runs no more.
    [[nodiscard]] static bool isRunning(qint64 pid);

    ~ProgramProcess();
    ProgramProcess(ProgramProcess&& other) noexcept;
    ProgramProcess& operator=(ProgramProcess&& other) = delete;
    ProgramProcess(const ProgramProcess&) = delete;
    ProgramProcess& operator=(const ProgramProcess&) = delete;

    [[nodiscard]] bool signal(int number) const;
    /// Whether it is set to handle the signal itself.
    [[nodiscard]] bool catches(int number) const;
    /// Blocks until it has ended, and at most so long.
    [[nodiscard]] bool endsWithin(std::chrono::milliseconds limit) const;

private:
    ProgramProcess(qint64 pid, int handle) : number(pid), descriptor(handle) {}

    qint64 number;
    int descriptor;
};

} // namespace TestSupport
