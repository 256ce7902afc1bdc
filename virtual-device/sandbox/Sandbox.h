// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/sandbox/SandboxPlan.h"

#include <QByteArray>
#include <QObject>
#include <QProcess>
#include <QTimer>

#include <deque>
#include <memory>
#include <optional>

class QSocketNotifier;

namespace VirtualDevice
{

/// The running sandbox: bubblewrap, the program in it and everything that the program starts. It ends as a whole, with
/// the program, with `kill()`, or with the virtual device's own end, however that comes about.
///
/// Threads: lives in the main thread.
class Sandbox : public QObject
{
    Q_OBJECT

public:
    enum class Streams
    {
        Captured,  ///< output and error output are drained, kept and announced; input is empty
        Inherited, ///< the program has ours, as a person's own command needs it
    };

    static constexpr std::size_t outputCapacity = 10'000;        ///< lines
    static constexpr qsizetype largestOutput = 32 * 1024 * 1024; ///< bytes of them together

    explicit Sandbox(QObject* parent = nullptr);
    ~Sandbox() override;

    /// Returns what went wrong. `ended` follows when the program ends.
    [[nodiscard]] std::optional<QString> start(const SandboxPlan& plan, Streams streams);
    [[nodiscard]] bool isRunning() const { return process.state() != QProcess::NotRunning; }

    /// Asks the program to end (SIGTERM) and kills it when it has not done so within four seconds. `ended`
    /// follows.
    void terminate();
    /// Ends everything now; returns when no process of the sandbox is left.
    void kill();

    /// The program's process as the host numbers it; 0 before it has started and after it has ended.
    [[nodiscard]] qint64 programPid() const;
    /// The newest lines that the program wrote to its output and error output.
    [[nodiscard]] QList<QByteArray> output() const;

signals:
    void outputReceived(const QByteArray& line);
    /// The program's exit status, 128 + the signal's number when one ended it.
    void ended(int status);

private:
    void readStatus();
    void readOutput();
    void keep(const QByteArray& line);
    void finish(int exitCode, QProcess::ExitStatus how);
    void awaitLastProcess();

    QProcess process;
    QTimer grace;
    int statusPipe = -1;
    std::unique_ptr<QSocketNotifier> statusNotifier;
    QByteArray statusText;
    qint64 firstPid = 0;   ///< the first process inside, whose end is the end of all others
    int firstProcess = -1; ///< a descriptor for it
    QByteArray unfinishedLine;
    std::deque<QByteArray> kept;
    qsizetype keptBytes = 0;
};

} // namespace VirtualDevice
