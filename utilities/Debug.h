// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>

namespace Utilities
{

/// The one logging facade: hands every message to the system log (`syslog`, identity "VQK", facility user), which
/// echoes it on standard error. No log file, no filter of its own.
///
/// Threads: every operation may be called from any thread. A message is with the log service when the call returns,
/// in the order of the calls, as long as the service takes messages. A service that takes none (nobody reads
/// `/dev/log`, or standard error is a pipe that is full), or takes them slowly, holds the callers up for at most a
/// quarter of a second in all: after that messages wait in a bounded queue, and the ones that find it full are lost. A
/// disturbed log must not stop the bench. Only on a machine that has no thread left for the log does it hold up whoever
/// logs.
///
/// Format: the text itself is the `syslog` format, so `%m` and `%%` expand and any other conversion is an error of
/// the caller. Text that comes from outside (a peer, a file, a file name) goes through `literal()` first.
///
/// The three-argument operations log "FILE, LINE, TEXT"; callers pass `__FILE__` (the path from the project's root) and
/// `__LINE__`, or the fixed number that monitoring matches. Characters beyond Latin-1 become "?".
class Debug
{
public:
    Debug() = delete;

    static void open();
    static void close();

    static void info(const QString& text);
    static void debugBrief(const QString& text);

    static void debugMessage(const QString& file, int line, const QString& text);
    static void warningMessage(const QString& file, int line, const QString& text);
    static void criticalMessage(const QString& file, int line, const QString& text);
    /// Logs, then asks the event loop to end with -1 and returns; without a running loop nothing ends.
    static void fatalMessage(const QString& file, int line, const QString& text);

    /// Foreign text made safe for a message: every percent sign doubled, so that the log shows it as received.
    [[nodiscard]] static QString literal(QString foreignText);
};

} // namespace Utilities
