// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

namespace TestSupport
{

/// Keeps what the program writes to Qt's debug output while it lives: the texts of the debug level, whole, and apart
/// from them those of the other levels (Qt's own complaints, for example), of which a test expects none.
///
/// Threads: messages may come from any; the rest is for the test's thread. One at a time.
class DebugOutput
{
public:
    DebugOutput();
    ~DebugOutput();
    DebugOutput(const DebugOutput&) = delete;
    DebugOutput& operator=(const DebugOutput&) = delete;

    [[nodiscard]] QStringList texts() const;
    [[nodiscard]] QStringList complaints() const;
    /// The texts so far, which are forgotten.
    QStringList take();
    [[nodiscard]] int count(const QString& text) const;

private:
    QtMessageHandler previous;
};

} // namespace TestSupport
