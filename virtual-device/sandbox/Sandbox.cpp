// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/Sandbox.h"

#include <QDeadlineTimer>
#include <QDir>
#include <QFile>
#include <QJsonDocument>
#include <QJsonObject>
#include <QSocketNotifier>

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>

namespace VirtualDevice
{

namespace
{

using namespace std::chrono_literals;

/// The program promises to be gone three seconds after it was asked.
constexpr auto graceTime = 4s;
constexpr int lastProcessLimit = 5000; ///< ms
constexpr qsizetype longestLine = 64 * 1024;

/// bwrap's first process is number 1 of its namespace and makes the program as the next one.
constexpr qint64 programNumberInside = 2;

/// The fields of a line such as "NSpid:\t4711\t2" of a process's status.
QList<qint64> statusNumbers(const QByteArray& status, const QByteArray& name)
{
    QList<qint64> numbers;
    const auto start = status.indexOf("\n" + name + ":");
    if (start < 0)
        return numbers;
    const auto end = status.indexOf('\n', start + 1);
    const auto fields = status.mid(start, end - start).simplified().split(' ').mid(1);
    for (const auto& field : fields)
        numbers.append(field.toLongLong());
    return numbers;
}

QByteArray statusOf(const QString& pid)
{
    QFile file(QStringLiteral("/proc/%1/status").arg(pid));
    return file.open(QIODevice::ReadOnly) ? '\n' + file.readAll() : QByteArray();
}

/// In the child, between fork and exec: only calls that are safe there.
void prepareChild(int statusDescriptor, pid_t parent, bool ownGroup)
{
    ::fcntl(statusDescriptor, F_SETFD, 0);
    // Before bwrap asks for the same: it dies with us from its first instruction on.
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent)
        ::_exit(1);
    // A terminal's Ctrl-C is for the virtual device, which then ends the program in order.
    if (ownGroup)
        ::setpgid(0, 0);
}

} // namespace

Sandbox::Sandbox(QObject* parent) : QObject(parent)
{
    grace.setSingleShot(true);
    connect(&grace, &QTimer::timeout, &process, &QProcess::kill);
    connect(&process, &QProcess::readyReadStandardOutput, this, &Sandbox::readOutput);
    connect(&process, &QProcess::finished, this, &Sandbox::finish);
}

Sandbox::~Sandbox()
{
    process.disconnect(this);
    kill();
}

std::optional<QString> Sandbox::start(const SandboxPlan& plan, Streams streams)
{
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC | O_NONBLOCK) != 0)
        return qt_error_string(errno);
    statusPipe = ends[0];
    statusNotifier = std::make_unique<QSocketNotifier>(statusPipe, QSocketNotifier::Read);
    connect(statusNotifier.get(), &QSocketNotifier::activated, this, &Sandbox::readStatus);

    const bool isCaptured = streams == Streams::Captured;
    process.setProcessChannelMode(isCaptured ? QProcess::MergedChannels : QProcess::ForwardedChannels);
    process.setInputChannelMode(isCaptured ? QProcess::ManagedInputChannel : QProcess::ForwardedInputChannel);
    const pid_t self = ::getpid();
    process.setChildProcessModifier([=] { prepareChild(ends[1], self, isCaptured); });
    process.start(QStringLiteral("bwrap"), bubblewrapArguments(plan, ends[1]));
    const bool isStarted = process.waitForStarted();
    ::close(ends[1]);
    if (!isStarted)
        return QStringLiteral("bwrap: %1").arg(process.errorString());
    if (isCaptured)
        process.closeWriteChannel();
    return std::nullopt;
}

void Sandbox::readStatus()
{
    std::array<char, 4096> buffer{};
    const auto length = ::read(statusPipe, buffer.data(), buffer.size());
    if (length <= 0) {
        statusNotifier->setEnabled(false);
        return;
    }
    statusText.append(buffer.data(), length);
    const auto end = statusText.indexOf('\n');
    if (end < 0 || firstPid != 0)
        return;
    firstPid = QJsonDocument::fromJson(statusText.left(end)).object().value(QStringLiteral("child-pid")).toInteger();
    firstProcess = static_cast<int>(::syscall(SYS_pidfd_open, static_cast<pid_t>(firstPid), 0));
}

void Sandbox::readOutput()
{
    unfinishedLine.append(process.readAllStandardOutput());
    qsizetype start = 0;
    for (auto end = unfinishedLine.indexOf('\n'); end >= 0; end = unfinishedLine.indexOf('\n', start)) {
        keep(unfinishedLine.mid(start, end - start));
        start = end + 1;
    }
    unfinishedLine.remove(0, start);
    if (unfinishedLine.size() > longestLine) {
        keep(unfinishedLine);
        unfinishedLine.clear();
    }
}

void Sandbox::keep(const QByteArray& line)
{
    kept.push_back(line);
    keptBytes += line.size();
    while (kept.size() > outputCapacity || keptBytes > largestOutput) {
        keptBytes -= kept.front().size();
        kept.pop_front();
    }
    emit outputReceived(line);
}

void Sandbox::terminate()
{
    if (!isRunning())
        return;
    const qint64 program = programPid();
    if (program == 0 || ::kill(static_cast<pid_t>(program), SIGTERM) != 0)
        process.kill();
    else
        grace.start(graceTime);
}

void Sandbox::kill()
{
    if (isRunning()) {
        process.kill();
        process.waitForFinished();
    }
    awaitLastProcess();
}

void Sandbox::finish(int exitCode, QProcess::ExitStatus how)
{
    grace.stop();
    readOutput();
    if (!unfinishedLine.isEmpty())
        keep(unfinishedLine);
    unfinishedLine.clear();
    awaitLastProcess();
    emit ended(how == QProcess::CrashExit ? 128 + exitCode : exitCode);
}

/// bwrap leaves first; the kernel then ends what it had inside, and only after that nobody uses the device's files.
void Sandbox::awaitLastProcess()
{
    if (statusPipe >= 0 && firstPid == 0)
        readStatus();
    if (firstProcess >= 0) {
        pollfd wait{firstProcess, POLLIN, 0};
        const QDeadlineTimer limit(lastProcessLimit);
        // A signal, such as a second Ctrl-C, cuts a poll short.
        while (::poll(&wait, 1, static_cast<int>(limit.remainingTime())) < 0 && errno == EINTR) {
        }
        ::close(firstProcess);
    }
    statusNotifier.reset();
    if (statusPipe >= 0)
        ::close(statusPipe);
    firstProcess = statusPipe = -1;
    firstPid = 0;
    statusText.clear();
}

qint64 Sandbox::programPid() const
{
    if (firstPid == 0)
        return 0;
    const auto processes = QDir(QStringLiteral("/proc")).entryList(QDir::Dirs | QDir::NoDotAndDotDot);
    for (const auto& pid : processes) {
        if (pid.toLongLong() == 0)
            continue;
        const QByteArray status = statusOf(pid);
        if (statusNumbers(status, "PPid").value(0) == firstPid &&
            statusNumbers(status, "NSpid").value(1) == programNumberInside)
            return pid.toLongLong();
    }
    return 0;
}

QList<QByteArray> Sandbox::output() const
{
    return {kept.begin(), kept.end()};
}

} // namespace VirtualDevice
