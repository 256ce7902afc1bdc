// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/ProgramProcess.h"

#include <QDir>
#include <QFile>
#include <QMultiHash>

#include <poll.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <utility>

namespace TestSupport
{

namespace
{

/// What stands behind "NAME:\t" in the status of the process; empty when there is no such process any more.
QByteArray statusField(qint64 pid, const QByteArray& name)
{
    QFile file(QStringLiteral("/proc/%1/status").arg(pid));
    if (!file.open(QIODevice::ReadOnly))
        return {};
    const auto lines = file.readAll().split('\n');
    for (const auto& line : lines)
        if (line.startsWith(name + ':'))
            return line.mid(name.size() + 1).trimmed();
    return {};
}

} // namespace

QList<qint64> ProgramProcess::descendants(qint64 ancestor)
{
    QMultiHash<qint64, qint64> children;
    const auto entries = QDir(QStringLiteral("/proc")).entryList(QDir::Dirs | QDir::NoDotAndDotDot);
    for (const auto& entry : entries)
        if (const qint64 pid = entry.toLongLong())
            children.insert(statusField(pid, "PPid").toLongLong(), pid);
    QList<qint64> found = children.values(ancestor);
    for (qsizetype next = 0; next < found.size(); ++next)
        found += children.values(found.at(next));
    return found;
}

bool ProgramProcess::isRunning(qint64 pid)
{
    const QByteArray state = statusField(pid, "State");
    return !state.isEmpty() && !state.startsWith('Z') && !state.startsWith('X');
}

std::optional<ProgramProcess> ProgramProcess::below(qint64 ancestor, const QByteArray& name)
{
    for (const qint64 pid : descendants(ancestor)) {
        if (statusField(pid, "Name") != name)
            continue;
        const auto descriptor = static_cast<int>(::syscall(SYS_pidfd_open, static_cast<pid_t>(pid), 0));
        if (descriptor >= 0)
            return ProgramProcess(pid, descriptor);
    }
    return std::nullopt;
}

ProgramProcess::ProgramProcess(ProgramProcess&& other) noexcept
    : number(other.number), descriptor(std::exchange(other.descriptor, -1))
{
}

ProgramProcess::~ProgramProcess()
{
    if (descriptor >= 0)
        ::close(descriptor);
}

bool ProgramProcess::signal(int signalNumber) const
{
    return ::syscall(SYS_pidfd_send_signal, descriptor, signalNumber, nullptr, 0) == 0;
}

bool ProgramProcess::catches(int signalNumber) const
{
    return ((statusField(number, "SigCgt").toULongLong(nullptr, 16) >> (signalNumber - 1)) & 1U) != 0;
}

bool ProgramProcess::endsWithin(std::chrono::milliseconds limit) const
{
    pollfd end{descriptor, POLLIN, 0};
    return ::poll(&end, 1, static_cast<int>(limit.count())) == 1;
}

} // namespace TestSupport
