// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QSocketNotifier>

namespace Presentation
{

/// Ends the event loop on SIGTERM and SIGINT, so that everything is destroyed in its order; the second of them ends
/// the process at once. The handlers only set a flag and write to a pipe, whose other end the event loop watches: a
/// signal that comes before the loop runs ends it as soon as it does. What keeps the loop waiting for seconds looks at
/// the flag. Without a pipe (no descriptor left, which the log tells) the first signal ends the process.
///
/// Lives in the GUI thread, one at a time; the signals get their default action back when it is destroyed.
class TerminationSignals : public QObject
{
    Q_OBJECT

public:
    TerminationSignals();
    ~TerminationSignals() override;

    /// Whether a signal has come since the object was made. For any thread.
    [[nodiscard]] static bool isEndRequested();

private:
    class Pipe
    {
    public:
        Pipe();
        ~Pipe();
        Pipe(const Pipe&) = delete;
        Pipe& operator=(const Pipe&) = delete;

        int ends[2] = {-1, -1};
    };

    Pipe pipe;
    QSocketNotifier notifier;
};

} // namespace Presentation
